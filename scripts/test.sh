#!/usr/bin/env bash
# Installs the dependencies; checks the framework and the plug-in with clang's thread-safety
# analysis; runs each fuzz target for a short while (TRELM_FUZZ_SECONDS, default 30); builds
# everything with ASan+UBSan and runs every test; then builds the concurrency tests with TSan and
# runs them again there.
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

# The fuzz targets (libFuzzer, ASan+UBSan), each for a bounded run: the emulator's request reading
# and FQL engine from the seeds in tests/fuzz/seeds, the plug-in's answer parsers from the answer
# documents the tests hold. A crash, a leak, a hang or a malformed answer fails the run.
cmake -S "$root" -B "$root/build/fuzz" -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo -DCMAKE_CXX_COMPILER=clang++ \
  -DCMAKE_C_COMPILER=clang -DTRELM_SANITIZE=address -DTRELM_BUILD_FUZZ=ON "${launcher[@]}" >/dev/null
cmake --build "$root/build/fuzz" -j "$jobs" --target fuzz_request_parser fuzz_fql_engine fuzz_answer_parsers
fuzz_seconds=${TRELM_FUZZ_SECONDS:-30}
for run in "fuzz_request_parser tests/fuzz/seeds/request" "fuzz_fql_engine tests/fuzz/seeds/fql" \
    "fuzz_answer_parsers tests/data/xml"; do
  read -r target seeds <<<"$run"
  work=$(mktemp -d)
  mkdir "$work/corpus"
  # Crash files land in the working directory, kept when the run fails.
  if ! (cd "$work" && "$root/build/fuzz/bin/$target" -max_total_time="$fuzz_seconds" -timeout=10 \
      -rss_limit_mb=2048 -print_final_stats=1 "$work/corpus" "$root/$seeds" >"$work/log" 2>&1); then
    tail -n 60 "$work/log"
    echo "fuzz: $target failed; the input is in $work" >&2
    exit 1
  fi
  echo "$target: $(grep -E '^stat::number_of_executed_units' "$work/log")"
  rm -rf "$work"
done
echo "fuzz targets: clean"

cmake -S "$root" -B "$root/build/asan" -G Ninja -DTRELM_SANITIZE=address -DTRELM_WERROR=ON -DCMAKE_BUILD_TYPE=Debug "${launcher[@]}" >/dev/null
cmake --build "$root/build/asan" -j "$jobs"
export ASAN_OPTIONS=detect_leaks=1:abort_on_error=1
export UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1
(cd "$root/build/asan" && ctest --output-on-failure -j "$jobs" --timeout 300)

cmake -S "$root" -B "$root/build/tsan" -G Ninja -DTRELM_SANITIZE=thread -DCMAKE_BUILD_TYPE=Debug "${launcher[@]}" >/dev/null
cmake --build "$root/build/tsan" -j "$jobs" --target concurrency_tests
export TSAN_OPTIONS=halt_on_error=1:second_deadlock_stack=1
(cd "$root/build/tsan" && ctest --output-on-failure -j "$jobs" -L concurrency --timeout 300)
