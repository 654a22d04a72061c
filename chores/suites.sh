# shellcheck shell=sh
# How a suite is run, and what is counted of it.

# pytest TITLE XML HOST ARGUMENTS...: HOST is the folder of the host's libraries, empty for the
# simulated one. The files of tests are spread over the processors.
pytest() {
  title=$1 xml=$2 host=$3
  shift 3
  set -- "$python" -m pytest -q -n "$jobs" --dist loadfile ${expression:+-k "$expression"} \
    --junitxml "$folder/$xml" "$@"
  [ -z "$host" ] || set -- "LD_LIBRARY_PATH=$host" "$@"
  if [ -n "$sanitizers" ]; then
    # The interpreter is not instrumented, so the runtime must come first, and with it the C++
    # library whose throw it intercepts. Every leak has a frame of the interpreter in its stack, so
    # its own could not be told from ours.
    set -- "LD_PRELOAD=$(g++ -print-file-name=libasan.so) $(g++ -print-file-name=libstdc++.so)" \
      ASAN_OPTIONS=detect_leaks=0:allocator_may_return_null=1 PYTHONMALLOC=malloc "$@" \
      --capture=sys
  fi
  junit "$title" "$xml" env "$@"
}

# Folders of tests/ that are suites of their own; ./dev test --help says why.
apart='contract classes vswitch recordings command fabric docs fuzz packages'

# not_apart: of the given tests, those of all other folders.
not_apart() {
  # shellcheck disable=SC2046,SC2086 # lists of words
  grep -v $(printf -- '-e ^tests/%s ' $apart)
}

# other_tests ARGUMENTS...: those, together, by one process more than there are processors: tests of
# frames wait for much of their time.
other_tests() {
  # shellcheck disable=SC2046,SC2086 # lists of words
  pytest "Python tests" module.xml '' -n $((jobs + 1)) $(printf -- '--ignore=tests/%s ' $apart) \
    "$@"
}

# They run in one process, which sums up what they have proven of each call.
contract_tests() {
  pytest "Contract tests" contract.xml "$root/$folder/tests/recording_host" -n 0 "$@"
}

# junit TITLE XML COMMAND...: runs a suite and counts its tests in the report that it leaves. A
# suite that fails without saying in which test, or leaves no report, is one failure.
junit() {
  title=$1 xml=$folder/$2
  shift 2
  step "$title"
  rm -f "$xml"
  status=0
  # Interrupted, a suite first ends what it has begun. One whose runner is ended is told so.
  trap 'exit 130' INT
  setpriv --pdeathsig TERM "$@" || status=$?
  counts='0 1'
  if [ -e "$xml" ]; then
    counts=$(/usr/bin/python3 tests/count_junit.py "$xml") || counts='0 1'
  else
    say "$title: ended without a report, status $status"
  fi
  # With -k one of pytest's runs may well match nothing, which it reports as status 5.
  [ -z "$expression" ] || [ "$status" -ne 5 ] || status=0
  if [ "$status" -ne 0 ] && [ "${counts#* }" -eq 0 ]; then counts="${counts% *} 1"; fi
  # shellcheck disable=SC2086 # two words
  tally "$title" $counts
}

# cxx_tests [NUMBERS]: all C++ tests, or those with these numbers of ctest, a comma before each, but
# what $cxx_left_out matches.
cxx_tests() {
  [ $# -eq 0 ] || set -- -I "0,0,0$1"
  [ -z "${cxx_left_out-}" ] || set -- "$@" -E "$cxx_left_out"
  junit "C++ tests" ctest.xml ctest --test-dir "$folder" --output-on-failure --no-tests=error \
    -j "$jobs" "$@" --output-junit "$root/$folder/ctest.xml"
}

# select_tests WHICH...: what chores/select_tests.py chooses, in the file that $selected names; then
# the C++ tests of it are run.
select_tests() {
  /usr/bin/python3 chores/select_tests.py "$folder" "$@" >"$selected" || die "no tests are chosen"
  numbers=$(sed -n 's/^ctest /,/p' "$selected" | tr -d '\n')
  [ -z "$numbers" ] || cxx_tests "$numbers"
}

# tally TITLE PASSED FAILED: what has been run since $started.
tally() {
  passed=$((passed + $2)) failed=$((failed + $3))
  took=$(($(date +%s) - started))
  summary="$summary$(printf '%-16s %5d passed %5d failed %5d s' "$1" "$2" "$3" "$took")
"
}

report() {
  step "Summary"
  printf '%s' "$summary"
  say "$passed passed, $failed failed"
  [ "$failed" -eq 0 ] && [ "$passed" -gt 0 ]
  exit
}
