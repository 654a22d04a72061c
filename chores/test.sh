# shellcheck shell=sh
# Which suites there are, and which of them are for which build.

#@ test   Check everything: build, lint, and every test
#
# Usage: ./dev test [--python PATH] [--debug-python] [--sanitize] [--no-fast-paths] [--no-frames]
#                   [-k EXPRESSION] [-- ARGUMENTS]
#        ./dev test --all-pythons [-k EXPRESSION] [-- ARGUMENTS]
#        ./dev test --packages [ARGUMENTS]
#
#   --all-pythons   with each CPython from 3.8 to 3.13 that is in PATH or was put there by pyenv,
#                   the newest of each version, one after the other in build folders of their own
#   --packages      instead of all else what ./dev package makes, installed into empty systems and
#                   removed again; it takes root's rights. ARGUMENTS are pytest's
#   --no-frames     without the tests that move real frames, where network namespaces cannot be made
#   -k EXPRESSION   only the tests that match, C++ and Python alike: no lint, fuzzers or peers
#   -- ARGUMENTS    given to each run of pytest as they are
#
# The other options are those of ./dev build; with them lint, which they do not change, is left out.
# Without them clang-tidy reads the module, its helpers, and of the simulated host what all of it
# stands on: the rest takes long, and ./dev lint has it. The fuzzers that link a whole host are left
# to ./dev stress.
# The summary names what is not for this build, and its last line sums all suites; a skipped test
# counts as failed, for what was not checked is not known to work.
#
# The Python tests find the module, and those that exist for the tests alone, through PYTHONPATH,
# and the build folder through BUILD_DIR. Those of tests/contract run in a process of their own,
# where LD_LIBRARY_PATH puts the recording host in place of the simulated one; so do those of
# tests/classes, tests/vswitch and tests/recordings, for once the classes are loaded the flat functions
# return instances of them. Those of tests/command and tests/fabric run the command, which is plain
# Python, too: the plain interpreter stands for all. By hand:
#   export BUILD_DIR=$PWD/build PYTHONPATH=$PWD/build/python:$PWD/build/tests/python
#   /usr/bin/python3 -m pytest tests --ignore=tests/contract --ignore=tests/classes \
#     --ignore=tests/vswitch --ignore=tests/recordings --ignore=tests/command \
#     --ignore=tests/fabric --ignore=tests/docs --ignore=tests/fuzz --ignore=tests/packages
#   /usr/bin/python3 -m pytest tests/classes
#   /usr/bin/python3 -m pytest tests/vswitch
#   /usr/bin/python3 -m pytest tests/recordings
#   /usr/bin/python3 -m pytest tests/command
#   /usr/bin/python3 -m pytest tests/fabric
#   /usr/bin/python3 -m pytest tests/docs
#   LD_LIBRARY_PATH=$BUILD_DIR/tests/recording_host /usr/bin/python3 -m pytest tests/contract
cmd_test() {
  if [ "${1-}" = --all-pythons ]; then
    shift
    test_all_pythons "$@"
  fi
  expression='' frames=yes
  if [ "${1-}" = --packages ]; then
    shift
    test_packages "$@"
  fi
  while [ $# -gt 0 ]; do
    if build_option "$@"; then
      shift "$taken"
      continue
    fi
    case $1 in
    --no-frames) frames= ;;
    -k)
      [ $# -ge 2 ] || die "-k: which tests?"
      expression=$2
      shift
      ;;
    --)
      shift
      break
      ;;
    --all-pythons | --packages) die "test: $1 goes before all other options" ;;
    *) die "test: unknown option '$1'; see ./dev test --help" ;;
    esac
    shift
  done

  [ -z "$frames" ] || may_make_namespaces ||
    die "test: neither root nor user namespaces make a network namespace here; see --no-frames"
  # A host or a state that the caller's shell points at is not the one under test.
  unset LD_LIBRARY_PATH SIMHOST_STATE SIMHOST_SCENARIO PYTHONHOME
  testing=yes benching=yes
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $test_packages $lint_packages $bench_packages
  passed=0 failed=0 summary='' deselected='' cxx_left_out=
  [ -n "$frames" ] || leave_out_frames
  if ! build; then
    tally build 0 1
    report
  fi
  # The slower part of all sources, which ./dev lint has clang-tidy read.
  untidied='^\./\(tests\|recordings\)/'
  untidied=$untidied'\|^\./simhost/\(abi\|cli\|daemon\|fabric\|model\|planes\|scenario\|storage\)/'
  [ -n "$expression" ] || [ "$folder" != build ] || {
    lint
    summarize "Left to ./dev lint: what clang-tidy passes over here"
  }
  export BUILD_DIR="$root/$folder" PYTHONPATH="$root/$folder/python:$root/$folder/tests/python"
  "$python" -m pytest --version >/dev/null 2>&1 || lend_pytest

  if [ -n "$expression" ]; then
    selected=$folder/selected
    select_tests named "$expression"
  else
    cxx_tests
  fi
  leave_out_tests
  # First the files that take longest, or one processor would end with them alone.
  # shellcheck disable=SC2086 # a list of words
  other_tests tests/robustness tests/simhostd tests $deselected "$@"
  # shellcheck disable=SC2086 # a list of words
  pytest "Class tests" classes.xml '' tests/classes $deselected "$@"
  pytest "Object tests" objects.xml '' tests/vswitch "$@"
  pytest "Tests of recordings" recordings.xml '' tests/recordings "$@"
  contract_tests tests/contract "$@"
  # What follows is for the plain interpreter: fuzzers embed it, peers bind it, and the pages are
  # the same whatever the module is built for.
  if [ "$folder" != build ]; then
    not_for_this_build "lint, no fast paths, contract recorded, command, fabric, docs, fuzzers, bench"
  else
    test_no_fast_paths "$@"
    pytest "Command tests" command.xml '' tests/command "$@"
    [ -z "$frames" ] || pytest "Fabric tests" fabric.xml '' tests/fabric "$@"
    pytest "Docs tests" docs.xml '' tests/docs "$@"
    [ -n "$expression" ] || {
      test_recorded
      test_fuzzers "$@"
      test_peers "$@"
    }
  fi
  report
}

# Some tests are not for every build, which the summary says.
leave_out_tests() {
  # The programs of the frames' tests run beside Open vSwitch, which is nobody's to instrument.
  if [ -n "$frames" ] && [ -n "$sanitizers" ]; then leave_out tests/simhostd; fi
  if [ -n "$sanitizers" ]; then
    # Valgrind and AddressSanitizer cannot both watch over memory.
    not_for_this_build "valgrind.helpers, valgrind.finds_what_is_planted"
    selection=tests/chores/test_selected_tests.py
    leave_out $selection::test_a_change_of_a_helper_touches_what_valgrind_looks_at
    # The canary looks for a lost block in the allocator, which is the sanitizers' own here.
    leave_out tests/classes/test_records.py::test_a_record_that_is_never_freed_would_be_noticed
  fi
  if [ -n "$lent" ]; then
    # The checker of stubs is for Debian's interpreter.
    leave_out tests/classes/test_stubs.py::test_stubs_and_modules_have_no_difference
    leave_out tests/classes/test_stubs.py::test_a_difference_would_be_found
  fi
}

leave_out_frames() {
  cxx_left_out='^TheNetworkDevices\.|^TheWires\.|^WhatASwitchLeavesBehind\.'
  cxx_left_out=$cxx_left_out'|^AProcessWithManySockets\.|^StateFileAsRoot\.'
  deselected="$deselected --deselect tests/simhostd"
  summarize "Left out by --no-frames: tests/simhostd, tests/fabric, bench/test_fabric_costs.py"
  summarize "Left out by --no-frames: C++ tests that make namespaces: $cxx_left_out"
}

may_make_namespaces() {
  unshare --net true 2>/dev/null || unshare --user --map-root-user --net true 2>/dev/null
}

leave_out() {
  deselected="$deselected --deselect $1"
  not_for_this_build "$1"
}

not_for_this_build() { summarize "Not for this build: $1"; }

summarize() {
  summary="$summary$1
"
}

# The module's rules once more, for the module that reads nothing by itself.
test_no_fast_paths() {
  with_fast_paths=$PYTHONPATH
  PYTHONPATH=$root/$folder/tests/no_fast_paths:$PYTHONPATH
  pytest "No fast paths" no-fast-paths.xml '' tests/module \
    --ignore=tests/module/test_host_libraries.py "$@"
  PYTHONPATH=$with_fast_paths
}

# A tool cannot tell that it is recorded: every call as it reaches the host, returns and traps.
test_recorded() {
  junit "Contract recorded" recorded.xml env "LD_LIBRARY_PATH=$root/$folder/tests/recording_host" \
    "$folder/bin/vswitch" record -o "$folder/recorded.jsonl" -- \
    "$python" -m pytest -q -n 0 --junitxml "$folder/recorded.xml" \
    tests/contract/test_arguments.py::test_an_argument_passes_unchanged \
    tests/contract/test_particular_calls.py tests/contract/test_results.py \
    tests/contract/test_traps_of_calls.py
}

test_fuzzers() {
  summarize "Left to ./dev stress: the fuzzers that link a whole host"
  if build_fuzzers brief_fuzzers; then
    pytest "Fuzzers" fuzz.xml '' tests/fuzz -k 'not of_the_host' "$@"
  else
    tally "Fuzzers" 0 1
  fi
}

# The peers of the comparison, without its figures.
test_peers() {
  if build_peers; then
    [ -n "$frames" ] || set -- --deselect bench/test_fabric_costs.py "$@"
    pytest "Bench tests" bench.xml '' bench "$@"
  else
    tally "Bench tests" 0 1
  fi
}

# Interpreters from elsewhere have no pytest: Debian's, which is plain Python, serves them all. Only
# what it needs is lent; the rest of Debian's modules are for its own interpreter.
lend_pytest() {
  need python3-exceptiongroup python3-sortedcontainers python3-tomli
  lent=$root/$folder/pytest
  mkdir -p "$lent"
  for module in pytest _pytest pluggy iniconfig packaging attr attrs py py.py exceptiongroup tomli \
    xdist execnet hypothesis sortedcontainers; do
    ln -sfn "/usr/lib/python3/dist-packages/$module" "$lent/$module"
  done
  for metadata in /usr/lib/python3/dist-packages/pytest[-_]*; do ln -sfn "$metadata" "$lent/"; done
  export PYTHONPATH="$PYTHONPATH:$lent" PYTHONDONTWRITEBYTECODE=1
  "$python" -m pytest --version >/dev/null 2>&1 || die "$python has no pytest"
}

# The newest interpreter of each version; pyenv has folders, and in PATH mere pointers to them.
all_pythons() {
  for minor in 8 9 10 11 12 13; do
    for candidate in "$HOME/.pyenv/versions/3.$minor."*/bin/python \
      "$(command -v "python3.$minor")"; do
      version=$("$candidate" -c 'import sys; print("%d.%d.%d" % sys.version_info[:3])' 2>/dev/null) ||
        continue
      case $version in "3.$minor."*) say "$version $candidate" ;; esac
    done | sort -V | tail -n 1 | cut -d ' ' -f 2-
  done
}

test_all_pythons() {
  for option; do
    case $option in
    --) break ;;
    --python | --debug-python) die "test: $option names one interpreter, --all-pythons all" ;;
    esac
  done
  summary='' failed=0
  for candidate in $(all_pythons); do
    step "$candidate"
    verdict=passed
    "$root/dev" test --python "$candidate" "$@" || verdict=FAILED failed=1
    summary="$summary$verdict  $candidate
"
  done
  [ -n "$summary" ] || die "test: no CPython from 3.8 to 3.13 found"
  step "All interpreters"
  printf '%s' "$summary"
  exit "$failed"
}

test_packages() {
  [ "$(id -u)" -eq 0 ] || die "test: --packages takes root's rights"
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $package_packages $package_test_packages
  unset LD_LIBRARY_PATH SIMHOST_STATE SIMHOST_SCENARIO PYTHONHOME PYTHONPATH
  passed=0 failed=0 summary=
  make_packages
  export BUILD_DIR="$root/$folder"
  # They install into the same empty systems.
  pytest "Package tests" packages.xml '' -n 0 tests/packages "$@"
  report
}
