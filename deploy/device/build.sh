# shellcheck shell=bash
# Configures and builds one preset, one caller at a time. To be sourced; the working directory is the project's. What the
# tools write goes to standard error.

_build_preset() {
    local preset=$1 target=$2
    shift 2
    mkdir -p build &&
        {
            flock 9 &&
                cmake --preset "$preset" "$@" >&2 &&
                cmake --build --preset "$preset" --target "$target" >&2
        } 9>"build/.lock-$preset"
}

# What is installed. A build folder that has tests keeps them, as a run of them may be under way.
build_device() {
    if [[ -f build/$1/CMakeCache.txt ]]; then
        _build_preset "$1" device
    else
        _build_preset "$1" device -DWEBAPI_TESTS=OFF
    fi
}

# build_with_tests PRESET [ON|OFF]: with the test programs, or only what the tests of the whole system need.
build_with_tests() {
    _build_preset "$1" all -DWEBAPI_TESTS=ON -DWEBAPI_UNIT_TESTS="${2:-ON}"
}

build_fuzz_targets() {
    _build_preset fuzz fuzz_targets -DWEBAPI_TESTS=ON
}
