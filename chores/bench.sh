# shellcheck shell=sh
# The comparison with other ways to bind the same calls.

#@ bench  Compare the module's cost with other ways to bind the same calls
#
# Usage: ./dev bench [--quick]
#        ./dev bench --fabric [--quick] [OPTION...]
#
#   --quick   a short run, to see that all works: its figures are rough, and it leaves out what is
#             measured of whole modules
#   --fabric  what many hosts cost that share a switch, and nothing else: 16 hosts, 10,000 ports and
#             some minutes, as far as the machine bears it. bench/fabric.py --help has its options;
#             fabric.json and fabric.svg are left in build/bench/
#
# Prints tables of ratios, of checked calls to checks by hand and of objects to flat calls too, what
# the recorder adds to a call, what real frames cost, and what the simulated host does in a second;
# leaves results.json, calls.svg, host.json and host_curve.svg in build/bench/. bench/README.md says
# how it measures and how to read it. On a machine with other work to do it takes longer, and ratios
# stay ratios.
cmd_bench() {
  if [ "${1-}" = --fabric ]; then
    shift
    bench_fabric "$@"
    return
  fi
  quick='' full=surfaces
  case ${1-} in
  --quick)
    quick=--quick full=
    shift
    ;;
  esac
  [ $# -eq 0 ] || die "bench: unknown option '$1'; see ./dev bench --help"
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $bench_packages $frame_packages
  asked_python='' benching=yes
  build_peers objects recordings_vswitch recordings_nebPublic simhostd simhostctl ${full:+"$full"}
  # A target that is missed ends nothing: what remains is measured, and the chore fails at its end.
  missed=''
  step "Measuring the module and its peers"
  "$python" bench/run.py ${quick:+"$quick"} "$folder" || missed=1
  step "Measuring the checked calls"
  PYTHONPATH=$root/$folder/python "$python" bench/checked.py ${quick:+"$quick"} || missed=1
  step "Measuring the objects"
  PYTHONPATH=$root/$folder/python "$python" bench/objects.py ${quick:+"$quick"} || missed=1
  step "Measuring the recorder"
  LD_LIBRARY_PATH=$root/$folder/bench/null_host PYTHONPATH=$root/$folder/python \
    "$python" bench/recorder.py ${quick:+"$quick"} || missed=1
  step "Measuring real frames"
  BUILD_DIR=$root/$folder PYTHONPATH=$root/$folder/python:$root/tests/simhostd \
    "$python" bench/frames.py ${quick:+"$quick"} || missed=1
  step "Measuring the simulated host"
  "$python" bench/host_curve.py ${quick:+"$quick"} "$folder" || missed=1
  [ -z "$missed" ] || {
    say "dev: a target is missed, or a comparison failed; its table above says which" >&2
    return 1
  }
}

bench_fabric() {
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $frame_packages
  build
  step "Measuring hosts that share a switch"
  BUILD_DIR=$root/$folder PYTHONPATH=$root/$folder/python:$root/tests/simhostd \
    "$python" bench/fabric.py "$@"
}
