# shellcheck shell=sh
# The short loop: what was changed, and what that touches.

#@ check  Build and test what was changed since the last check that passed
#
# Usage: ./dev check [-k EXPRESSION]
#
#   -k EXPRESSION   instead all tests whose names match, C++ and Python alike, whatever was changed
#
# Compares the tree with the one that passed last, or with the last commit; builds; checks the
# format and style of the changed files; runs the C++ tests of the programs that a change makes
# anew, and the Python tests of what it touches. chores/select_tests.py says which those are.
# It leaves to ./dev test what takes long or is tried at random, and clang-tidy to ./dev lint.
cmd_check() {
  expression=
  if [ "${1-}" = -k ]; then
    [ $# -ge 2 ] || die "-k: which tests?"
    expression=$2
    shift 2
  fi
  [ $# -eq 0 ] || die "check: unknown option '$1'; see ./dev check --help"
  checked=$folder/check
  mkdir -p "$checked"
  current=$(tree_of_files) ||
    die "check: this compares with git's trees, and there is no repository"
  git diff-tree -r --no-renames --name-only "$(last_checked)" "$current" >"$checked/changed"
  if [ -z "$expression" ] && [ ! -s "$checked/changed" ]; then
    say "Nothing has changed since the last check that passed."
    return
  fi

  unset LD_LIBRARY_PATH SIMHOST_STATE SIMHOST_SCENARIO PYTHONHOME
  testing=yes passed=0 failed=0 summary=''
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $test_packages $lint_packages $check_packages
  if ! build_again; then
    tally build 0 1
    report
  fi
  selected=$checked/tests
  if [ -n "$expression" ]; then
    select_tests named "$expression"
    say 'python tests' >>"$selected"
  else
    lint_changed
    select_tests changed <"$checked/changed"
  fi
  python_tests
  [ -n "$expression" ] || [ "$failed" -ne 0 ] || say "$current" >"$checked/passed"
  report
}

# The name of the tree that the files make, all but those that git ignores. It has an index of its
# own, so what somebody has staged stays as it is.
tree_of_files() {
  export GIT_INDEX_FILE="$root/$checked/index"
  [ -e "$GIT_INDEX_FILE" ] || git read-tree HEAD
  git add --all . && git write-tree
  status=$?
  unset GIT_INDEX_FILE
  return "$status"
}

# git drops trees that nothing refers to after a while.
last_checked() {
  tree=$(cat "$checked/passed" 2>/dev/null) || tree=none
  git rev-parse --verify --quiet "$tree^{tree}" || git rev-parse 'HEAD^{tree}'
}

# Ninja configures again when it has to.
build_again() {
  if grep -qs '^BUILD_TESTING:BOOL=ON' "$folder/CMakeCache.txt" &&
    [ -e "$folder/build.ninja" ]; then
    step "Building in $folder/"
    flock "$folder/.lock" nice cmake --build "$folder"
  else
    build
  fi
}

lint_changed() {
  only=$root/$checked/only
  sed 's|^|./|' "$checked/changed" >"$only"
  step "Style of what was changed"
  check clang-format check_format
  check shellcheck check_shell
  check black check_black
  check flake8 check_flake8
  check mypy check_mypy
  check words check_words
  only=
}

# The selected Python tests; ./dev test --help says why not all can be run in one process.
python_tests() {
  export BUILD_DIR="$root/$folder" PYTHONPATH="$root/$folder/python:$root/$folder/tests/python"
  for group in docs classes vswitch recordings command fabric contract others; do
    # shellcheck disable=SC2046 # none of our file names has a space
    set -- $(sed -n 's/^python //p' "$selected" | of_group "$group" || :)
    [ $# -eq 0 ] || case $group in
    contract) contract_tests "$@" ;;
    others) other_tests "$@" ;;
    *) pytest "Tests of $group" "$group.xml" '' "$@" ;;
    esac
  done
}

# of_group GROUP: those of the given tests that are run together.
of_group() {
  case $1 in
  others) not_apart ;;
  *) sed -n "s:^tests\$:tests/$1:p; \\:^tests/$1:p" ;;
  esac
}
