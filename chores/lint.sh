# shellcheck shell=sh
# The checks of sources.

#@ lint   Check format and style of all sources; a warning is an error
#
# Usage: ./dev lint
#
# clang-format, clang-tidy, shellcheck, black, flake8, mypy --strict, and chores/check_words.py for
# the words of the glossary. clang-tidy leaves out files that were clean before and have not changed
# since, nor any header that they include.
# To put the format right: clang-format -i FILE..., black FILE...
cmd_lint() {
  [ $# -eq 0 ] || die "lint takes no options"
  passed=0 failed=0 summary=
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $test_packages $lint_packages $bench_packages
  testing=yes benching=yes
  # Some sources include what the build generates.
  build
  configure_fuzzers
  lint
  report
}

lint() {
  step "Lint"
  check clang-format check_format
  check clang-tidy check_tidy
  check shellcheck check_shell
  check black check_black
  check flake8 check_flake8
  check mypy check_mypy
  check words check_words
}

check() {
  started=$(date +%s)
  if "$2"; then
    say "$1: clean"
    tally "$1" 1 0
  else
    say "$1: FAILED"
    tally "$1" 0 1
  fi
}

# sources PATTERN...: our own files with such names, a line each; of those that the file $only
# lists, if it is set.
sources() {
  for pattern; do
    find . -path './build*' -prune -o -path './.*/*' -prune -o -type f -name "$pattern" -print
  done | if [ -n "${only-}" ]; then grep -xF -f "$only" || :; else cat; fi
}

check_format() { sources '*.h' '*.c' '*.cpp' | xargs -r clang-format --dry-run -Werror; }

check_shell() {
  # The chores are checked where dev takes them in.
  # shellcheck disable=SC2046 # none of our file names has a space
  shellcheck -x dev .ci/run $(sources '*.sh' | grep -v '^\./chores/')
}

check_black() { sources '*.py' | xargs -r black --check --quiet --diff; }

check_flake8() { sources '*.py' | xargs -r flake8; }

# A folder at a time: several folders have a conftest, which as modules are one name. Those that are
# looked at side by side keep what they found apart.
check_mypy() {
  sources '*.py' | xargs -r -n 1 dirname | sort -u |
    xargs -r -n 1 -P "$jobs" --process-slot-var=slot sh -c '
      MYPYPATH=$1 exec mypy --no-error-summary --cache-dir "build/mypy/$slot" "$1"/*.py' sh
}

check_words() { "$python" chores/check_words.py; }

# What clang-tidy says of a file depends on what tidy_inputs.py hashes; the hash names a stamp that
# is left when it had nothing to say. Sources that $untidied matches are passed over.
check_tidy() {
  export folder ours="^$root/(include|helpers|recordings|simhost|tests|bench)/"
  stamps=$folder/tidy
  for built in "$folder" ${FUZZERS_DIR:+"$FUZZERS_DIR"}; do
    mkdir -p "$built/tidy"
    "$python" chores/compile_commands.py "$built" "$built/tidy/compile_commands.json" || return
  done
  # shellcheck disable=SC2046 # none of our file names has a space
  inputs=$("$python" chores/tidy_inputs.py "$folder" ${FUZZERS_DIR:+"$FUZZERS_DIR"} -- \
    $(sources '*.c' '*.cpp' | grep -v "${untidied:-^$}")) || return
  say "$inputs" | while read -r file hash; do
    [ -e "$stamps/$hash" ] || say "$file $stamps/$hash"
  done | nice xargs -r -n 2 -P "$jobs" sh -c '
    echo "clang-tidy $1"
    case $1 in ./tests/fuzz/*) folder=$FUZZERS_DIR ;; esac
    if ! grep -qF "\"file\": \"$PWD/${1#./}\"" "$folder/tidy/compile_commands.json"; then
      echo "$1: no target builds it, so nothing checks it"
      exit 1
    fi
    findings=$(clang-tidy --quiet -p "$folder/tidy" --header-filter "$ours" "$1" 2>&1) &&
      : >"$2" && exit
    printf "%s\n" "$findings" | grep -v " generated\.$" | head -n 40
    exit 1' sh
}
