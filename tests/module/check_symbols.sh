#!/usr/bin/env bash
# The module must export nothing of its own, and must not lean on the simulator or on the host.
set -euo pipefail
module=$1
defined=$(nm -DC --defined-only "$module")
undefined=$(nm -DC --undefined-only "$module")
# A check that finds none of the module's needs has looked at the wrong file.
case $undefined in
    *ZRLab::defaultLab*) ;;
    *) echo "no module"; exit 1 ;;
esac
# What the compiler emits into every object that shares templates and type information is weak or
# unique; only strong functions and data would be an interface.
exported=$(awk '$2 ~ /^[TDBR]$/ {print}' <<<"$defined")
leaning=$(grep -E '(simulator|host)::' <<<"$undefined" || true)
[ -z "$exported" ] || { echo "exported:"; echo "$exported"; exit 1; }
[ -z "$leaning" ] || { echo "needs:"; echo "$leaning"; exit 1; }
