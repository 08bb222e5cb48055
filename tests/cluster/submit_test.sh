#!/usr/bin/env bash
# `ostrel submit` end to end: what it refuses and the script it writes, then, on a single-node
# cluster started here, a job whose frames must match a local render byte for byte and one whose
# failing task must be named with its frames and log. Skipped (status 77) where Slurm cannot run:
# not root, or its packages missing. usage: submit_test.sh OSTREL
set -euo pipefail
ostrel=$(realpath "$1")
root=$(cd "$(dirname "$0")/../.." && pwd)
base=$(mktemp -d)
# The paths in the batch script must survive a space and a quote.
work="$base/a shot's folder"
mkdir "$work"
# A folder and ports of its own, apart from a cluster someone started by hand or another run
# of this test.
export OSTREL_SLURM_DIR=$base/slurm OSTREL_SLURM_PORT=$((20000 + RANDOM % 5000 * 2))
export SLURM_CONF=$OSTREL_SLURM_DIR/slurm.conf
# The cluster is stopped on every way out, also when the test runs past its bound (each command
# has its own too): CTest's time limit would kill the test without stopping it.
(sleep 120 && kill -TERM $$) >/dev/null 2>&1 &
watchdog=$!
trap 'kill $(ps -o pid= --ppid $watchdog) $watchdog 2>/dev/null; bash "$root/scripts/slurm-local.sh" stop >/dev/null 2>&1 || true
      rm -rf "$base"' EXIT
trap 'echo "FAIL: interrupted or out of time" >&2; exit 1' INT TERM
cd "$work"
cp -r "$root/examples/cards" shot

fail() {
    echo "FAIL: $*" >&2
    exit 1
}
# expect STATUS TEXT COMMAND...: the command ends with the status and prints the text.
expect() {
    local status=$1 text=$2 got=0
    shift 2
    timeout 60 "$@" >out.txt 2>&1 || got=$?
    [[ $got == "$status" ]] || fail "$* ended with $got, not $status: $(cat out.txt)"
    grep -qF -- "$text" out.txt || fail "$* did not print '$text': $(cat out.txt)"
}
# same A B FIRST LAST: frames FIRST to LAST of A/c.####.png and B/c.####.png are the same bytes.
same() {
    for frame in $(seq -f %04g "$3" "$4"); do
        cmp -s "$1/c.$frame.png" "$2/c.$frame.png" || fail "$1/c.$frame.png differs from $2's"
    done
}

"$ostrel" render shot/cards.json -o local/c.####.png --frames 0-23 >/dev/null

# A resumed render does only the frames missing or cut short.
mkdir resumed && cp local/c.000[0-2].png resumed/ && truncate -s 2000 resumed/c.0001.png
expect 0 "1 frame in" "$ostrel" render shot/cards.json -o resumed/c.####.png --frames 0-2 \
    --skip-existing
grep -qF "2 skipped" out.txt || fail "the resumed render did not count 2 skipped: $(cat out.txt)"
same resumed local 0 2

# An image whose header reads but whose pixels are cut short (an OpenEXR file's offsets come
# first) is caught before anything is submitted.
cp -r shot cut && sed -i 's/disc\.png/disc.exr/' cut/cards.json
"$ostrel" render shot/cards.json -o cut/disc.exr --frames 0 --depth 32 >/dev/null
truncate -s 100000 cut/disc.exr
expect 1 "cards.json: layers[3].source: cannot read image" \
    "$ostrel" submit cut/cards.json -o farm/c.####.png --dry-run
expect 1 "sbatch is not installed" env PATH=/nonexistent "$ostrel" submit shot/cards.json
expect 0 "chunks=(0-4 5-9 10-14 15-19 20-23)" \
    "$ostrel" submit shot/cards.json -o farm/c.####.png --frames 0-23 --chunk 5 --dry-run
grep -qF "#SBATCH --array=0-4" out.txt && grep -qF "render '$base/a shot" out.txt ||
    fail "the script does not have the tasks or the absolute path: $(cat out.txt)"
[[ ! -e farm ]] || fail "a dry run wrote files"

missing=0
for tool in munged slurmctld slurmd sbatch; do
    command -v "$tool" >/dev/null || missing=1
done
if [[ $EUID -ne 0 ]] || ((missing)); then
    echo "SKIP: a local Slurm cluster needs root and slurm-wlm and munge (scripts/setup.sh)"
    exit 77
fi
timeout 60 bash "$root/scripts/slurm-local.sh" start >/dev/null

expect 0 "every frame is written" \
    "$ostrel" submit shot/cards.json -o farm/c.####.png --frames 0-23 --chunk 5 --wait
same farm local 0 23
expect 1 "the job was not submitted: sbatch: error: invalid partition" \
    "$ostrel" submit shot/cards.json -o farm/c.####.png --partition nowhere

# Frames 0-4 already there, 6 cut short, and a folder where frame 12 goes: task 0 skips its
# chunk, task 1 renders frame 6 again, and task 2 fails at frame 12.
mkdir -p part/c.0012.png && cp local/c.000[0-6].png part/ && truncate -s 2000 part/c.0006.png
expect 1 "left 3 frames missing or unreadable: frames 12-14 (task 2, log $work/part/.ostrel-jobs/cards." \
    "$ostrel" submit shot/cards.json -o part/c.####.png --frames 0-23 --chunk 5 --wait
log=$(grep -o "$work/part/.ostrel-jobs/cards\.[0-9]*_2\.log" out.txt)
grep -qF "part/c.0012.png" "$log" || fail "$log does not name the frame that failed"
grep -qF "0 frames, 5 skipped" "${log%_2.log}_0.log" || fail "task 0 rendered frames again"
same part local 5 11
same part local 15 23
echo "PASS"
