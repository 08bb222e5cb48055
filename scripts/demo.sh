#!/usr/bin/env bash
# Sets up, builds, and renders the bundled example.
set -euo pipefail
cd "$(dirname "$0")/.."

bash scripts/setup.sh
cmake --preset default >/dev/null
cmake --build --preset default
./build/default/renderer_demo
