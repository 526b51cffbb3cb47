"""The values that a kind of machine once reached, and what has become worse since."""

import json
import math
import re
from pathlib import Path

FOLDER = Path(__file__).resolve().parent / "baseline"
WORSE_BY = 1.1


def path(machine):
    kind = re.sub(r"[^a-z0-9]+", "-", f"{machine['processor']} {machine['cores']} cores".lower()).strip("-")
    user = "root" if machine["root"] else "user"
    return FOLDER / f"{kind}-{user}.json"


def load(machine):
    """The kept values: row to goal to "value" and "spread"; empty when there are none."""
    file = path(machine)
    return json.loads(file.read_text()) if file.exists() else {}


def update(machine, results):
    """Keeps these results; rows that were not measured stay as they were."""
    kept = load(machine)
    for row, result in results.items():
        kept[row] = {goal: {"value": found["value"], "spread": found["spread"]}
                     for goal, found in result["goals"].items() if found["compared"]}
    FOLDER.mkdir(exist_ok=True)
    path(machine).write_text(json.dumps(kept, indent=1, ensure_ascii=False) + "\n")


def worse(kept, row, result):
    """The goals of a row that became worse by a tenth and by more than the kept spread, with the values before
    and now. A kept goal that was not measured, or not as a number, counts as worse."""
    found = []
    for goal, before in kept.get(row, {}).items():
        now = result["goals"].get(goal, {}).get("value", math.nan)
        if not (now <= before["value"] * WORSE_BY or now - before["value"] <= before["spread"]):
            found.append((goal, before["value"], now))
    return found
