# shellcheck shell=sh
# Which Debian packages what needs, and how they come.

build_packages='cmake ninja-build g++ swig python3-dev libsqlitecpp-dev libsqlite3-dev libfmt-dev
  nlohmann-json3-dev libcli11-dev libssl-dev'
command_packages='python3-typer python3-rich python3-yaml'
docs_packages='python3-sphinx python3-myst-parser furo'
frame_packages='openvswitch-switch python3-openvswitch iproute2 ethtool iputils-ping'
test_packages="libgtest-dev libgmock-dev python3-pytest python3-pytest-xdist python3-hypothesis
  python3-pexpect valgrind nodejs uidmap groff-base openssl
  $frame_packages $command_packages $docs_packages"
check_packages=git
fuzz_packages='clang libclang-rt-14-dev'
lint_packages='clang-format clang-tidy shellcheck black flake8 mypy'
bench_packages='pybind11-dev python3-cffi cython3'
package_packages="build-essential debhelper dh-python python3-pip python3-setuptools python3-wheel
  python3-openvswitch $command_packages"
package_test_packages='lintian mmdebstrap python3-pytest python3-pytest-xdist'

# need PACKAGE...: installs those that are missing. One query, so that a repeat costs nothing.
need() {
  command -v dpkg-query >/dev/null || die "this needs Debian's package tools; not found: dpkg-query"
  # shellcheck disable=SC2016 # the format is dpkg-query's, not the shell's
  present=$(dpkg-query -W -f '${Package}=${db:Status-Status} ' "$@" 2>/dev/null) || :
  missing=
  for package; do
    case " $present" in
    *" $package=installed "*) ;;
    *) missing="$missing $package" ;;
    esac
  done
  [ -n "$missing" ] || return 0

  as_root='env DEBIAN_FRONTEND=noninteractive'
  if [ "$(id -u)" -ne 0 ]; then
    command -v sudo >/dev/null ||
      die "missing packages; run this as root: apt-get install --no-install-recommends$missing"
    as_root="sudo $as_root"
  fi
  say "Installing Debian packages:$missing"
  # shellcheck disable=SC2086 # both are lists of words
  if ! { $as_root apt-get -qq -o DPkg::Lock::Timeout=300 update &&
    $as_root apt-get -qq -o DPkg::Lock::Timeout=300 -o Dpkg::Use-Pty=0 \
      install -y --no-install-recommends $missing; } </dev/null; then
    die "could not install; run this as root: apt-get install --no-install-recommends$missing"
  fi
}
