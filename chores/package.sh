# shellcheck shell=sh
# What is shipped.

#@ package Make Debian packages and a wheel, in build/packages
#
# Usage: ./dev package
#
# packaging/README.md says what they hold. ./dev test --packages makes and tests them.
cmd_package() {
  [ $# -eq 0 ] || die "package takes no options"
  make_packages
}

make_packages() {
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $package_packages
  packages=$root/$folder/packages
  mkdir -p "$packages"
  rm -f "$packages"/*.deb "$packages"/*.whl
  # The date of what is packaged, so that the same source makes the same packages.
  SOURCE_DATE_EPOCH=${SOURCE_DATE_EPOCH:-$(git log -1 --format=%ct 2>/dev/null || date +%s)}
  export SOURCE_DATE_EPOCH
  step "Debian packages"
  logged "$packages/debian.log" packaging/debian_packages.sh "$packages"
  step "Wheel"
  logged "$packages/wheel.log" nice "$python" -m pip wheel -v . --no-build-isolation --no-deps \
    --wheel-dir "$packages"
  step "Packages in $folder/packages/"
  (cd "$packages" && du -h --apparent-size -- *.deb *.whl)
}

# logged LOG COMMAND...: the log gets all that the command says, the reader how far it is.
logged() {
  log=$1 status=0
  shift
  rm -f "$log.pipe"
  mkfifo "$log.pipe"
  tee "$log" <"$log.pipe" | sed -un 's/^ *\(\[[0-9]*\/[0-9]*\] .*\)/\1/p' &
  "$@" >"$log.pipe" 2>&1 || status=$?
  wait $!
  rm "$log.pipe"
  [ "$status" -eq 0 ] || {
    tail -n 40 "$log" >&2
    die "$1: failed with status $status; all that it said is in $log"
  }
}
