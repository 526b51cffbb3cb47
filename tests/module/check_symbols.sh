#!/usr/bin/env bash
# The module must export nothing of its own, and must not lean on the simulator or on the host.
set -euo pipefail
module=$1
# What the compiler emits into every object that shares templates and type information is weak or
# unique; only strong functions and data would be an interface.
exported=$(nm -DC --defined-only "$module" | awk '$2 ~ /^[TDBR]$/ {print}')
leaning=$(nm -DC --undefined-only "$module" | grep -E '(simulator|host)::' || true)
[ -z "$exported" ] || { echo "exported:"; echo "$exported"; exit 1; }
[ -z "$leaning" ] || { echo "needs:"; echo "$leaning"; exit 1; }
# A check that finds no symbol at all has looked at the wrong file.
nm -DC --undefined-only "$module" | grep -q 'ZRLab::defaultLab' || { echo "no module"; exit 1; }
