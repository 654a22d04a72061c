# shellcheck shell=sh
# The command and the programs of examples/, run.

#@ demo   Build, then watch the command and tools at work on the simulated host
#
# Usage: ./dev demo [--python PATH] [--debug-python] [--no-fast-paths]
#        ./dev demo frames
#        ./dev demo fabric
#
# Runs the command and the programs of examples/, each on a host of its own: tools to copy from, the
# first steps underneath, records that a tool builds, and a tour through the whole host. The command
# is for Debian's interpreter, whose packages it needs. With LD_LIBRARY_PATH set to the folder of
# another host's libraries, only those run there that need no switch of the simulated host.
#
# With frames, real ones go between clients in network namespaces: a VLAN cuts and joins them, an
# uplink fails while pings go on, and a mirror shows what another one sends. It takes root's rights
# or user namespaces, and leaves nothing.
#
# With fabric, three hosts share a switch over a cluster of three databases: a private VLAN spans
# them, an uplink is pulled, a port moves, a host dies and comes back, and then the databases do. It
# takes and leaves the same.
cmd_demo() {
  case ${1-} in
  frames | fabric)
    what=$1
    shift
    demo_frames "$@"
    return
    ;;
  esac
  only_build_options "$@"
  [ -z "$sanitizers" ] || die "demo: --sanitize is for build and test"
  # shellcheck disable=SC2086 # a list of words
  need $command_packages
  build
  unset SIMHOST_STATE SIMHOST_SCENARIO
  PATH=$root/$folder/bin:$root/$folder/simhost:$PATH
  export PATH PYTHONPATH="$root/$folder/python"
  [ "$folder" != build ] || shown vswitch list
  example inventory
  [ -n "${LD_LIBRARY_PATH-}" ] || {
    example compliance --fix
    example apply tests/examples/document.json
    example find_mac 02:00:00:00:01:02
    example mirror vswitch0 web-1 web-2 --for 0
    example failover_drill vswitch0
  }
  example first_steps
  example records
  [ -n "${LD_LIBRARY_PATH-}" ] || example tour
}

# What $what says: frames or fabric.
demo_frames() {
  [ $# -eq 0 ] || die "demo: $what takes no options"
  # shellcheck disable=SC2086 # a list of words
  need $frame_packages $command_packages
  build
  BUILD_DIR=$root/$folder PYTHONPATH=$root/$folder/python:$root/tests/simhostd \
    "$python" "tests/simhostd/${what}_demo.py"
}

# example NAME ARGUMENTS...: runs a program of examples/.
example() {
  name=examples/$1.py
  shift
  step "$name${*:+ $*}"
  "$python" "$name" "$@"
}

shown() {
  step "$*"
  "$@"
}
