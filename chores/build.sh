# shellcheck shell=sh
# What is built for whom, and in which folder.

#@ build  Build the modules (build/python), the command (build/bin), the simulated host (build/simhost)
#
# Usage: ./dev build [--python PATH] [--debug-python] [--sanitize] [--no-fast-paths]
#
#   --python PATH    build for this interpreter instead of /usr/bin/python3, in a build folder
#                    named after its binary interface; PYTHON=PATH in the environment does the same
#   --debug-python   build for Debian's debug interpreter, in build-debug-python/
#   --sanitize       build with AddressSanitizer and UndefinedBehaviorSanitizer, in build-sanitize/
#   --no-fast-paths  build as for an interpreter whose objects the module cannot read by itself, in
#                    build-no-fast-paths/
cmd_build() {
  only_build_options "$@"
  # shellcheck disable=SC2086 # a list of words
  need $command_packages
  build
}

# Takes one of the options that choose what is built; $taken is the number of words it was.
build_option() {
  case ${1-} in
  --python)
    [ -n "${2-}" ] || die "--python: which one?"
    asked_python=$2 taken=2
    ;;
  --debug-python)
    need python3-dbg
    asked_python=/usr/bin/python3-dbg taken=1
    ;;
  --sanitize)
    sanitizers=address,undefined build_type=Debug folder=$folder-sanitize taken=1
    ;;
  --no-fast-paths) fast_paths=OFF folder=$folder-no-fast-paths taken=1 ;;
  *) return 1 ;;
  esac
}

only_build_options() {
  while build_option "$@"; do shift "$taken"; done
  [ $# -eq 0 ] || die "$command: unknown option '$1'; see ./dev $command --help"
}

# Each other interpreter gets a build folder of its own, named after its binary interface.
choose_python() {
  [ -n "$asked_python" ] && [ "$asked_python" != "$python" ] || return 0
  command -v "$asked_python" >/dev/null || die "there is no interpreter '$asked_python'"
  python=$asked_python
  interface=$("$python" -c 'import sysconfig; print(sysconfig.get_config_var("SOABI"))') ||
    die "cannot run the interpreter '$python'"
  case $python in
  /usr/bin/python3-dbg)
    folder=$folder-debug-python
    # Its headers are links to the plain interpreter's, all but the one that turns debugging on;
    # followed, they would find the plain one beside them.
    export CFLAGS="${CFLAGS-} -fno-canonical-system-headers"
    export CXXFLAGS="${CXXFLAGS-} -fno-canonical-system-headers"
    ;;
  *) folder=$folder-$interface ;;
  esac
}

configure() {
  # shellcheck disable=SC2086 # a list of words
  need $build_packages
  choose_python
  # The peers are bindings for the plain interpreter.
  [ "$folder" = build ] || benching=
  mkdir -p "$folder"
  flock "$folder/.lock" cmake -S . -B "$folder" -G Ninja --log-level=WARNING \
    -DCMAKE_BUILD_TYPE="$build_type" -DPython3_EXECUTABLE="$python" -DSANITIZE="$sanitizers" \
    -DFAST_PATHS="$fast_paths" -DSOURCES_TOGETHER=ON \
    ${testing:+-DBUILD_TESTING=ON} ${benching:+-DBUILD_BENCH=ON} >/dev/null
}

build() {
  configure || return
  step "Building in $folder/"
  # Two builds in one folder would trip over each other; the second waits.
  flock "$folder/.lock" nice cmake --build "$folder"
}

# The fuzzers are clang's, with all that they link, and so have a build folder of their own.
configure_fuzzers() {
  # shellcheck disable=SC2086 # lists of words
  need $build_packages $fuzz_packages
  export FUZZERS_DIR="$root/build-fuzzers"
  mkdir -p "$FUZZERS_DIR"
  flock "$FUZZERS_DIR/.lock" cmake -S . -B "$FUZZERS_DIR" -G Ninja --log-level=WARNING \
    -DCMAKE_C_COMPILER=clang -DCMAKE_CXX_COMPILER=clang++ \
    -DCMAKE_BUILD_TYPE=Debug -DCMAKE_CXX_FLAGS_DEBUG=-O1 \
    -DSANITIZE=fuzzer-no-link,address,undefined -DBUILD_FUZZERS=ON -DSOURCES_TOGETHER=ON >/dev/null
}

# build_fuzzers TARGET: all of them, or brief_fuzzers.
build_fuzzers() {
  configure_fuzzers || return
  step "Building the fuzzers in build-fuzzers/"
  flock "$FUZZERS_DIR/.lock" nice cmake --build "$FUZZERS_DIR" --target "$1"
}

build_peers() {
  configure || return
  step "Building the module and its peers in $folder/"
  flock "$folder/.lock" nice cmake --build "$folder" \
    --target _libvswitch vswitch nebPublic peers "$@"
}
