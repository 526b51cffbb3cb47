#!/usr/bin/env bash
# Passes when PROGRAM, which has a fault built in, fails in SCENARIO with MESSAGE, and fails the same way
# when the order that it prints is replayed: find_fault.sh PROGRAM SCENARIO MESSAGE
set -uo pipefail
program=$1 scenario=$2 message=$3

if found=$("$program" "$scenario"); then
    echo "the fault was not found: $found"
    exit 1
fi
echo "$found"
order=$(sed -n 's/^replay: interleavings .* --replay //p' <<<"$found")
name=$(sed -n 's/^replay: interleavings \(.*\) --replay .*/\1/p' <<<"$found")
[[ $name == "$scenario" ]] || { echo "found by another scenario than $scenario"; exit 1; }
failure=$(sed -n 's/^[^ ]*: FAILED[^:]*: //p' <<<"$found" | head -n 1)
[[ -n $failure && $failure == *"$message"* ]] || { echo "another failure than \"$message\""; exit 1; }
replayed=$("$program" "$name" --replay "$order") && { echo "the replay passed"; exit 1; }
[[ $replayed == *$'\n'"$failure"* ]] || { echo "the replay fails otherwise: $replayed"; exit 1; }
