#!/usr/bin/env bash
# Sets up, builds, and renders the bundled example to out/cards.0000.png.
set -euo pipefail
cd "$(dirname "$0")/.."

bash scripts/setup.sh
cmake --preset default >/dev/null
cmake --build --preset default
./build/default/ostrel render examples/cards/cards.json -o out/cards.####.png --frames 0-0
