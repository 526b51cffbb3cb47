#!/usr/bin/env bash
# The module must export nothing, weak and unique symbols included, and must not use the simulator or
# the host.
set -euo pipefail
module=$1
exported=$(nm -DC --defined-only "$module")
undefined=$(nm -DC --undefined-only "$module")
# A module without this need is not the right file.
case $undefined in
    *ZRLab::defaultLab*) ;;
    *) echo "no module"; exit 1 ;;
esac
used=$(grep -E '(simulator|host)::' <<<"$undefined" || true)
[ -z "$exported" ] || { echo "exported:"; echo "$exported"; exit 1; }
[ -z "$used" ] || { echo "uses:"; echo "$used"; exit 1; }
