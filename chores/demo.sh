# shellcheck shell=sh
# The programs of examples/, run.

#@ demo   Build, then run the first programs of a tool's author against the simulated host
#
# Usage: ./dev demo [--python PATH] [--debug-python] [--no-fast-paths]
#
# Runs the programs of examples/, each on a host of its own: tools to copy from, the first steps
# underneath, records that a tool builds, and a tour through the whole host. With LD_LIBRARY_PATH
# set to the folder of another host's libraries, only those run there that need no switch of the
# simulated host.
cmd_demo() {
  only_build_options "$@"
  [ -z "$sanitizers" ] || die "demo: --sanitize is for build and test"
  build
  unset SIMHOST_STATE SIMHOST_SCENARIO
  example inventory
  example records
  example first_steps
  [ -z "${LD_LIBRARY_PATH-}" ] || return 0
  example compliance --fix
  example apply tests/examples/document.json
  example find_mac 02:00:00:00:01:02
  example mirror vswitch0 web-1 web-2 --for 0
  example failover_drill vswitch0
  example tour
}

# example NAME ARGUMENTS...: runs a program of examples/.
example() {
  name=examples/$1.py
  shift
  step "$name${*:+ $*}"
  PATH=$root/$folder/simhost:$PATH PYTHONPATH=$root/$folder/python "$python" "$name" "$@"
}
