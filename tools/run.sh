#!/usr/bin/env bash
# Builds and runs the project on a fresh machine.
#   tools/run.sh demo   build and run the example system
#   tools/run.sh test   build with g++, clang and the sanitizers, and run every test
set -euo pipefail
cd "$(dirname "$0")/.."
jobs=$(nproc 2>/dev/null || echo 2)

build() {  # build <dir> <cmake args...>
    local dir=$1; shift
    cmake -S . -B "$dir" "$@" >/dev/null
    cmake --build "$dir" -j"$jobs"
}

case "${1:-}" in
    demo)
        build build -DKT48_TESTS=OFF -DKT48_BENCH=OFF
        ./build/examples/kt48demo
        ;;
    test)
        build build-gcc -DCMAKE_CXX_COMPILER=g++ -DCMAKE_C_COMPILER=gcc
        ctest --test-dir build-gcc --output-on-failure
        build build-clang -DCMAKE_CXX_COMPILER=clang++ -DCMAKE_C_COMPILER=clang -DKT48_BENCH=OFF
        ctest --test-dir build-clang --output-on-failure
        build build-san -DKT48_SANITIZE=ON -DKT48_BENCH=OFF -DCMAKE_BUILD_TYPE=Debug
        ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1 \
            ctest --test-dir build-san --output-on-failure
        ;;
    *)
        echo "usage: tools/run.sh demo|test" >&2
        exit 2
        ;;
esac
