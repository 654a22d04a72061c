# shellcheck shell=sh
# The long run.

#@ stress Look for crashes, hangs and leaks for as long as you have time
#
# Usage: ./dev stress [--minutes N] [--seed N] [--no-frames]
#                     [--python PATH] [--debug-python] [--no-fast-paths]
#
#   --minutes N   how long; 20 by default. The sweep of wrong values runs once, with a million calls
#                 of every kind in the same memory, or fewer if there is less time; fuzzers,
#                 frames of any content at random switches, sequences of calls, replays of such,
#                 without frames and with them, clones of random hosts, killed processes, hosts that
#                 share a switch while everything fails, and random pairs of values share what is left
#   --seed N      what chance chose in an earlier run, which printed its seed
#   --no-frames   without replays over real frames, hosts that share and their demo, where network
#                 namespaces cannot be made
#
# A line for each part says how much it did and what was wrong; the status is 1 if anything was.
# What a fuzzer learns stays in build-fuzzers/corpus, and the next run goes on from there.
# tests/README.md says how to run a part by itself.
cmd_stress() {
  options='' frames=yes
  while [ $# -gt 0 ]; do
    case $1 in
    --minutes | --seed)
      [ $# -ge 2 ] || die "stress: $1: which number?"
      case $2 in
      '' | *[!0-9]*) die "stress: $1: '$2' is no whole number" ;;
      esac
      [ "$1 $2" != "--minutes 0" ] || die "stress: --minutes: 0 is no time at all"
      options="$options $1 $2"
      shift 2
      ;;
    --no-frames)
      options="$options $1" frames=
      shift
      ;;
    *)
      build_option "$@" || die "stress: unknown option '$1'; see ./dev stress --help"
      shift "$taken"
      ;;
    esac
  done
  [ -z "$sanitizers" ] || die "stress: --sanitize is for build and test"
  [ -z "$frames" ] || may_make_namespaces ||
    die "stress: neither root nor user namespaces make a network namespace here; see --no-frames"
  testing=yes
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $test_packages
  build
  # They embed the plain interpreter, whichever the module is built for.
  build_fuzzers fuzzers
  unset LD_LIBRARY_PATH SIMHOST_STATE SIMHOST_SCENARIO PYTHONHOME
  export BUILD_DIR="$root/$folder"
  PYTHONPATH=$BUILD_DIR/python:$BUILD_DIR/tests/python
  for suite in surface support fuzz sequences; do PYTHONPATH=$PYTHONPATH:$root/tests/$suite; done
  export PYTHONPATH
  "$python" -c 'import hypothesis' 2>/dev/null || lend_pytest
  step "Stress"
  # shellcheck disable=SC2086 # a list of words
  "$python" tests/robustness/stress.py $options
}
