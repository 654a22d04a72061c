# shellcheck shell=sh
# The way back to the sources.

#@ clean  Remove everything that was built
#
# Usage: ./dev clean
#
# Removes all build folders and the caches of the Python tools.
cmd_clean() {
  [ $# -eq 0 ] || die "clean takes no options"
  rm -rf build build-* .pytest_cache .mypy_cache
  find . -path ./.git -prune -o -type d -name __pycache__ -exec rm -rf {} +
}
