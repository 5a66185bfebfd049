#!/usr/bin/env bash
# Builds the benchmark programs in a Release tree, runs them and prints one line per figure with
# its ratio to the baseline measured in the same run.
#
#   bench/run.sh                 everything (a few minutes on two cores once built)
#   bench/run.sh cursor parsing  only the programs whose names contain one of these words
#   bench/run.sh --report        print the table again from the last results, running nothing
#
# Environment:
#   BENCH_BUILD_DIR     build tree (default: build/bench under the repository)
#   BENCH_MIN_TIME      seconds per micro-benchmark repetition (default 0.5)
#   BENCH_E2E_MIN_TIME  seconds per repetition of the cursor walks (default 2)
#   BENCH_REPETITIONS   repetitions; the median is reported (default 3)
#   BENCH_JOBS          build jobs (default 2)
# Anything else (BENCH_USERS, BENCH_FRIENDS for the FQL paging program) passes through.
# The raw results stay in <build>/results: <program>.json and the console output <program>.txt.
set -euo pipefail

report_only=false
if [ "${1:-}" = --report ]; then
  report_only=true
  shift
fi

root=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)
build=${BENCH_BUILD_DIR:-$root/build/bench}
min_time=${BENCH_MIN_TIME:-0.5}
e2e_min_time=${BENCH_E2E_MIN_TIME:-2}
reps=${BENCH_REPETITIONS:-3}
jobs=${BENCH_JOBS:-2}

programs=()
for src in "$root"/bench/bench_*.cpp; do
  name=$(basename "$src" .cpp)
  if [ $# -gt 0 ]; then
    wanted=false
    for word in "$@"; do [[ $name == *"$word"* ]] && wanted=true; done
    $wanted || continue
  fi
  programs+=("$name")
done
[ ${#programs[@]} -gt 0 ] || { echo "run.sh: no benchmark program matches: $*" >&2; exit 2; }

results=$build/results
mkdir -p "$results"
failed=()
if ! $report_only; then
  generator=()
  if [ ! -f "$build/CMakeCache.txt" ] && command -v ninja >/dev/null; then generator=(-G Ninja); fi
  cmake -S "$root" -B "$build" "${generator[@]}" -DCMAKE_BUILD_TYPE=Release \
    -DTRELM_BUILD_BENCH=ON -DTRELM_BUILD_TESTS=OFF >/dev/null
  echo "building ${programs[*]} in $build" >&2
  cmake --build "$build" -j"$jobs" --target "${programs[@]}" >/dev/null

  for name in "${programs[@]}"; do
    # A whole cursor walk takes a good part of a second: give it more time to repeat.
    t=$min_time
    case $name in *cursor*) t=$e2e_min_time ;; esac
    echo "running $name" >&2
    rm -f "$results/$name.json"
    if ! "$build/bin/$name" --benchmark_min_time="$t" --benchmark_repetitions="$reps" \
        --benchmark_report_aggregates_only=true \
        --benchmark_out="$results/$name.json" --benchmark_out_format=json >"$results/$name.txt" 2>&1; then
      echo "run.sh: $name failed, see $results/$name.txt" >&2
      failed+=("$name")
    fi
  done
fi

# One line per benchmark: name, real ns, cpu ns, items/s, pages. The median of the repetitions,
# or the single run when there was only one. Google Benchmark writes one key per line, which is
# all this reader relies on.
medians() {
  for name in "${programs[@]}"; do
    if [ -f "$results/$name.json" ]; then cat "$results/$name.json"; fi
  done | awk '
    function num(line) { sub(/^[^:]*: */, "", line); sub(/,$/, "", line); gsub(/"/, "", line); return line }
    function ns(v, unit) { return unit == "ms" ? v * 1e6 : unit == "us" ? v * 1e3 : unit == "s" ? v * 1e9 : v }
    /"run_name":/       { run = num($0); agg = ""; real = cpu = items = pages = 0; unit = "ns"; err = 0 }
    /"aggregate_name":/ { agg = num($0) }
    /"error_occurred":/ { err = 1 }
    /"real_time":/      { real = num($0) }
    /"cpu_time":/       { cpu = num($0) }
    /"time_unit":/      { unit = num($0) }
    /"items_per_second":/ { items = num($0) }
    /"pages":/          { pages = num($0) }
    /^    }/ {
      if (run != "" && !err && (agg == "median" || agg == "")) {
        line = sprintf("%s %.6g %.6g %.6g %.6g", run, ns(real, unit), ns(cpu, unit), items, pages)
        if (!(run in seen)) { seen[run] = 1; order[++n] = run }
        if (agg == "median") median[run] = line
        else if (!(run in single)) single[run] = line
      }
      run = ""
    }
    END { for (i = 1; i <= n; ++i) print (order[i] in median) ? median[order[i]] : single[order[i]] }'
}

table=$(medians)

# Prints "figure value ratio baseline value" when both figures were measured.
#   how: cpu (CPU time per iteration), wall (wall time per iteration), page and pagecpu (wall
#        time, or the benchmark thread's CPU time, per request of a cursor walk), throughput
#        (items per second). The ratio is always figure / baseline.
report() {
  local figure=$1 baseline=$2 how=$3
  awk -v f="$figure" -v b="$baseline" -v how="$how" '
    function show(v) {
      if (how == "throughput") return sprintf("%.0f rows/s", v)
      if (v >= 1e6) return sprintf("%.2f ms", v / 1e6)
      if (v >= 1e3) return sprintf("%.2f us", v / 1e3)
      return sprintf("%.0f ns", v)
    }
    function pick(real, cpu, items, pages) {
      if (how == "cpu") return cpu
      if (how == "throughput") return items
      if (how == "page") return pages > 0 ? real / pages : 0
      if (how == "pagecpu") return pages > 0 ? cpu / pages : 0
      return real
    }
    $1 == f { fv = pick($2, $3, $4, $5) }
    $1 == b { bv = pick($2, $3, $4, $5) }
    END {
      if (fv == "" || bv == "" || bv == 0) exit
      label = how == "page" ? " wall/page" : how == "pagecpu" ? " CPU/page" : how == "cpu" ? " CPU" : how == "wall" ? " wall" : ""
      printf "%-34s %13s%-10s %6.2f  %-34s %13s\n", f, show(fv), label, fv / bv, b, show(bv)
    }' <<<"$table"
}

echo
printf "%-34s %13s%-10s %6s  %-34s %13s\n" figure value "" ratio baseline value
report sign/addAuth md5/bare cpu
report parse/fql_users_150 expat/fql_users_150 cpu
report parse/stream_posts_75 expat/stream_posts_75 cpu
report cache/window/real_time/threads:2 cache/window/real_time/threads:1 throughput
report cursor/contacts_walk/real_time curl/contacts_replay/real_time page
report cursor/contacts_walk/real_time curl/contacts_replay/real_time pagecpu
report cursor/stream_walk/real_time curl/stream_replay/real_time page
report cursor/stream_walk/real_time curl/stream_replay/real_time pagecpu
for kind in photo_events messages albums media photo_tags friend_requests; do
  report cursor/${kind}_walk/real_time curl/${kind}_replay/real_time page
  report cursor/${kind}_walk/real_time curl/${kind}_replay/real_time pagecpu
done
report sync/full_sync/real_time walk/every_kind/real_time wall
report engine/contact_page sqlite_xml/contact_page cpu
report engine/count sqlite_xml/count cpu
report http/contact_page/process_time/real_time engine/contact_page wall
report http/contact_page/process_time/real_time sqlite/contact_page wall
report http/contact_page/process_time/real_time sqlite/contact_page cpu

# The message cursor's peak resident memory over the bytes of its records' keys and values.
if [ -f "$results/bench_message_memory.json" ]; then
  awk '
    function num(line) { sub(/^[^:]*: */, "", line); sub(/,$/, "", line); gsub(/"/, "", line); return line }
    /"run_name":/       { agg = ""; err = 0; peak = bytes = ratio = "" }
    /"aggregate_name":/ { agg = num($0) }
    /"error_occurred":/ { err = 1 }
    /"peak_rss":/       { peak = num($0) }
    /"record_bytes":/   { bytes = num($0) }
    /"rss_ratio":/      { ratio = num($0) }
    /^    }/ {
      if (!err && ratio != "" && (agg == "median" || agg == ""))
        line = sprintf("%-34s %10.1f MB peak RSS %6.2f  %-34s %10.1f MB", "memory/message_cursor", peak / 1e6, ratio,
                       "record keys and values", bytes / 1e6)
    }
    END { if (line != "") print line }' "$results/bench_message_memory.json"
fi

if [ ${#failed[@]} -gt 0 ]; then
  echo "run.sh: failed: ${failed[*]}" >&2
  exit 1
fi
