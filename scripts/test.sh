#!/usr/bin/env bash
# Installs the dependencies; checks the framework and the plug-in with clang's thread-safety
# analysis; builds everything with ASan+UBSan and runs every test; then builds the concurrency
# tests with TSan and runs them again there.
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
"$root/scripts/setup.sh"
jobs=$(nproc)
# A compiler cache, when the machine has one, shared by every clone: paths under the repository
# are made relative, so a fresh clone reuses what an earlier one compiled.
launcher=()
if command -v ccache >/dev/null; then
  export CCACHE_BASEDIR="$root"
  launcher=(-DCMAKE_CXX_COMPILER_LAUNCHER=ccache -DCMAKE_C_COMPILER_LAUNCHER=ccache)
fi

# The lock annotations, checked: a clang build of the framework and the plug-in in which any
# thread-safety warning is an error.
cmake -S "$root" -B "$root/build/clang" -G Ninja -DCMAKE_BUILD_TYPE=Debug -DCMAKE_CXX_COMPILER=clang++ \
  -DCMAKE_C_COMPILER=clang -DTRELM_BUILD_TESTS=OFF "-DCMAKE_CXX_FLAGS=-Wthread-safety -Werror=thread-safety" "${launcher[@]}" >/dev/null
cmake --build "$root/build/clang" -j "$jobs" --target trelm trelmfacebook
echo "thread-safety analysis: clean"

cmake -S "$root" -B "$root/build/asan" -G Ninja -DTRELM_SANITIZE=address -DTRELM_WERROR=ON -DCMAKE_BUILD_TYPE=Debug "${launcher[@]}" >/dev/null
cmake --build "$root/build/asan" -j "$jobs"
export ASAN_OPTIONS=detect_leaks=1:abort_on_error=1
export UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1
(cd "$root/build/asan" && ctest --output-on-failure -j "$jobs" --timeout 300)

cmake -S "$root" -B "$root/build/tsan" -G Ninja -DTRELM_SANITIZE=thread -DCMAKE_BUILD_TYPE=Debug "${launcher[@]}" >/dev/null
cmake --build "$root/build/tsan" -j "$jobs" --target concurrency_tests
export TSAN_OPTIONS=halt_on_error=1:second_deadlock_stack=1
(cd "$root/build/tsan" && ctest --output-on-failure -j "$jobs" -L concurrency --timeout 300)
