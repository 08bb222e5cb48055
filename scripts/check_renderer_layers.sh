#!/usr/bin/env bash
# Fails when a folder of the renderer core includes a folder above it: the folders are layers,
# each calling only those below, so the include graph has no cycle.
set -euo pipefail
cd "$(dirname "$0")/../renderer"

layers=(shadow scene mbuffer dof raster frame)  # bottom to top
rank() {
    local i
    for i in "${!layers[@]}"; do
        [[ ${layers[$i]} == "$1" ]] && echo "$i" && return
    done
    echo "renderer/$1 is in no layer: add it to the list in $0" >&2
    exit 1
}

status=0
for folder in */; do
    folder=${folder%/}
    own=$(rank "$folder")
    while IFS=: read -r file line target; do
        if (($(rank "$target") > own)); then
            echo "renderer/$file:$line includes renderer/$target, a layer above renderer/$folder"
            status=1
        fi
    done < <(grep -rnoE '#include "renderer/[a-z]+/' "$folder" | sed -E 's|#include "renderer/([a-z]+)/|\1|')
done
exit $status
