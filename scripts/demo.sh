#!/usr/bin/env bash
# Installs the dependencies, builds the release tree and runs trelm-host with the demo
# configuration (the plug-in against the embedded service emulator). Without arguments the host
# runs its demo tour; arguments replace that command (e.g. `scripts/demo.sh query contacts`).
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
"$root/scripts/setup.sh"
cmake -S "$root" -B "$root/build/release" -G Ninja -DCMAKE_BUILD_TYPE=Release -DTRELM_BUILD_TESTS=OFF >/dev/null
cmake --build "$root/build/release" -j "$(nproc)" >/dev/null
[ "$#" -gt 0 ] || set -- demo
exec "$root/build/release/bin/trelm-host" --config "$root/Tools/trelm-host/demo.json" \
  --plugin "$root/build/release/lib/libtrelmfacebook.so" "$@"
