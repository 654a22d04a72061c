# shellcheck shell=sh
# The build tree in somebody's shell.

#@ env    Print the environment that finds what was built: eval "$(./dev env)"
#
# Usage: ./dev env [--python PATH] [--debug-python] [--sanitize] [--no-fast-paths]
#
# PATH finds vswitch and simhostctl, PYTHONPATH the modules and the pytest plug-in, MYPYPATH their
# stubs. What these variables hold stays after it. The options are those of ./dev build and choose
# the folder.
cmd_env() {
  # Only what the caller's shell is to evaluate goes to standard output.
  only_build_options "$@" >&2
  choose_python
  [ -d "$folder/python" ] || say "dev: nothing is built in $folder/ yet: ./dev build" >&2
  prepend PATH "$root/$folder/simhost"
  prepend PATH "$root/$folder/bin"
  prepend PYTHONPATH "$root/$folder/python"
  prepend MYPYPATH "$root/$folder/python"
}

# prepend VARIABLE PATH: a line for a shell, in which PATH is quoted, that puts PATH first.
prepend() {
  quoted=$(say "$2" | sed "s/'/'\\\\''/g; s/^/'/; s/\$/'/")
  say "export $1=$quoted\"\${$1:+:\$$1}\""
}
