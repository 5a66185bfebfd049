#!/usr/bin/env bash
# The whole-process figure: `trelm-host --format json query contacts --all` over the 5,000 friends
# of the demo user, against a separately started emulator (20,000 users), timed with
# /usr/bin/time -v (wall, user + sys CPU, peak RSS); beside it the same HTTP requests (taken from
# the emulator's request log, login left out) replayed with curl's own command line, all in one
# curl process over one kept connection (`--next`), timed the same way.
#
#   bench/whole_process.sh            uses build/rel (Release, bench on), building what is missing
#
# Environment: BENCH_BUILD_DIR (default build/rel), WHOLE_PORT (default 18080; HTTPS on +1),
# WHOLE_RUNS (default 3: each command is timed this many times, the runs are printed).
set -euo pipefail

root=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)
build=${BENCH_BUILD_DIR:-$root/build/rel}
port=${WHOLE_PORT:-18080}
tls_port=$((port + 1))
runs=${WHOLE_RUNS:-3}
[ -x /usr/bin/time ] || { echo "whole_process.sh: /usr/bin/time missing (apt-get install time)" >&2; exit 2; }
if [ ! -x "$build/bin/trelm-host" ] || [ ! -x "$build/bin/trelm-emulator" ]; then
  cmake -S "$root" -B "$build" -DCMAKE_BUILD_TYPE=Release -DTRELM_BUILD_BENCH=ON >/dev/null
  cmake --build "$build" --target trelm-host trelm-emulator trelmfacebook -j2 >/dev/null
fi

work=$(mktemp -d)
emulator_pid=
cleanup() {
  if [ -n "$emulator_pid" ]; then kill "$emulator_pid" 2>/dev/null || true; wait "$emulator_pid" 2>/dev/null || true; fi
  rm -rf "$work"
}
trap cleanup EXIT

"$build/bin/trelm-emulator" --http-port "$port" --https-port "$tls_port" --tls-dir "$work/tls" \
  --users 20000 --demo-friends 5000 --friends-per-user 5 --albums-per-user 1 --photos-per-album 1 \
  --posts-per-user 1 --threads-per-user 1 --messages-per-thread 1 --log "$work/requests.jsonl" \
  >"$work/emulator.txt" 2>&1 &
emulator_pid=$!
for _ in $(seq 1 600); do
  grep -q "is running" "$work/emulator.txt" 2>/dev/null && break
  sleep 0.1
done
grep -q "is running" "$work/emulator.txt" || { cat "$work/emulator.txt" >&2; exit 1; }

host=("$build/bin/trelm-host" --config "$root/Tools/trelm-host/demo.json" --plugin "$build/lib/libtrelmfacebook.so"
      --state-dir "$work/state" --no-emulator --connect-to "api.facebook.com:80:127.0.0.1:$port"
      --connect-to "api.facebook.com:443:127.0.0.1:$tls_port" --ca-file "$work/tls/ca.pem"
      --format json query contacts --all)

# Prints "wall user+sys peakRSS" of one timed command from /usr/bin/time -v's report.
measure() {
  local report=$1
  awk -F': ' '
    /Elapsed \(wall clock\)/ { n = split($2, p, ":"); wall = 0; for (i = 1; i <= n; ++i) wall = wall * 60 + p[i] }
    /User time/ { user = $2 }
    /System time/ { sys = $2 }
    /Maximum resident set size/ { rss = $2 }
    END { printf "%.2f s wall  %.2f s CPU (user %.2f + sys %.2f)  %.1f MB peak RSS\n", wall, user + sys, user, sys, rss / 1024 }' "$report"
}

# A first run signs in (keeping the session in the state folder) and fills the request log.
"${host[@]}" >"$work/first.json"
rows=$(grep -c '"core_contact_service_id"' "$work/first.json" || true)
[ "$rows" = 5000 ] || { echo "whole_process.sh: the first run listed $rows contacts, not 5000" >&2; exit 1; }

# The replay: every non-login request of the last run, as curl config entries joined by --next.
: >"$work/requests.jsonl"
"${host[@]}" >/dev/null
python3 - "$work/requests.jsonl" "$work" "$port" <<'PY'
import json, sys, urllib.parse
log, work, port = sys.argv[1], sys.argv[2], sys.argv[3]
entries = []
for line in open(log):
    r = json.loads(line)
    if 'auth.login' in r.get('method', ''):
        continue
    entries.append(r)
with open(work + '/replay.curl', 'w') as out:
    for i, r in enumerate(entries):
        body = urllib.parse.urlencode(sorted(r['args'].items()), quote_via=urllib.parse.quote, safe='-._~')
        with open('%s/body%d' % (work, i), 'w') as f:
            f.write(body)
        if i > 0:
            out.write('next\n')
        out.write('url = "http://127.0.0.1:%s/restserver.php"\n' % port)
        out.write('data-binary = "@%s/body%d"\n' % (work, i))
        out.write('output = "%s/answer%d"\n' % (work, i))
        out.write('silent\nshow-error\nfail\n')
print(len(entries), 'requests', file=sys.stderr)
PY

# The replay must get the same answers, not error documents.
curl --config "$work/replay.curl"
if grep -l "error_response" "$work"/answer* >/dev/null 2>&1; then
  echo "whole_process.sh: a replayed request was refused" >&2; exit 1
fi
replayed=$(cat "$work"/answer* | grep -o "<uid>" | wc -l)
echo "replayed answers hold $replayed rows" >&2

echo "trelm-host --format json query contacts --all  (5,000 friends; sign-in kept from a first run)"
for i in $(seq 1 "$runs"); do
  /usr/bin/time -v "${host[@]}" >/dev/null 2>"$work/time.txt"
  printf '  run %d: ' "$i"; measure "$work/time.txt"
done
echo "curl --config replay.curl  (the same requests, one curl process, one kept connection)"
for i in $(seq 1 "$runs"); do
  /usr/bin/time -v curl --config "$work/replay.curl" 2>"$work/time.txt"
  printf '  run %d: ' "$i"; measure "$work/time.txt"
done
