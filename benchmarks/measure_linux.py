"""What is measured of the Linux device: programs in the virtual machine, on Debian's kernel.

The guest's clock counts instructions of its one processor, one per nanosecond, and skips idle time, so nanoseconds
of its clock are instructions. What else this machine does makes no difference.
"""

import json
import shlex
import sys

from measure import BUILD, ROOT, Failed

sys.path.append(str(ROOT / "tools/virtual_machine"))
import command
import guest
import scenarios

PROGRAMS = ("zrlab", "zr_plugin.so", "vm_sensor", "zr_spend", "zr_linux_device", "zr_linux_calls")
STATION = "/stations/vivid.json"
DEVICE = ("zr_linux_device", STATION)
CALLS = ("zr_linux_calls",)
RATES = (30, 60)  # frames per second
LIMIT = 600  # seconds of this machine's clock


def frames(quick):
    """By contender and frames per second: instructions and context switches per frame, frames lost."""
    number = 30 if quick else 300
    return _measure({f"{name}/{rate}": (*program, "frames", number, rate)
                     for rate in RATES for name, program in (("here", DEVICE), ("bare calls", CALLS))},
                    "VantorFaultDiagnostic", "frameCount", number, "zrlab run/30")


def reports(quick):
    """By contender: instructions and context switches per report, its latency, reports lost."""
    number = 20 if quick else 200
    return _measure({"here": (*DEVICE, "reports", number), "bare calls": (*CALLS, "reports", number)},
                    "KirraImageExperiment", "images", number, "zrlab run")


def _measure(commands, experiment, parameter, number, run):
    """What the commands print, as contenders. `run` is the contender of a whole zrlab run: what `number` items more
    cost."""
    short, long = (_spend(experiment, parameter, items) for items in (number, 2 * number))
    printed = _in_guest({**commands, "short run": short, "long run": long})
    found = {}
    for name in commands:
        costs = printed[name]
        found[name] = costs["time"]
        found[f"{name} [switches]"] = costs["switches"]
        found[f"{name} [lost]"] = costs["lost"]
        if costs["latency"]:
            found[f"{name} [latency]"] = costs["latency"]
            found[f"{name} [worst]"] = costs["worst"]
    for what, key, scale in (("", "cpu", 1e9), (" [switches]", "switches", 1)):
        found[run + what] = (printed["long run"][key] - printed["short run"][key]) * scale / number
    return found


def _spend(experiment, parameter, number):
    run = (f"zrlab run {experiment} --set {parameter}={number} --set timeout=60 --device linux:{STATION} "
           "--log off >/dev/null")
    return ("sh", "-c", f"zr_spend /tmp/spent {run} && cat /tmp/spent")


def _in_guest(commands):
    """What the commands print, each a line of JSON, by their names: one after the other, with a sensor plugged in."""
    lines = ["#!/bin/busybox sh", ". /scenario.sh", "sensor || exit 1"]
    for number, words in enumerate(commands.values()):
        lines.append(f"timeout 300 {shlex.join(map(str, words))} >/results/{number} 2>/results/{number}.problem || "
                     f">/results/{number}")
    try:
        guest.boot(BUILD, PROGRAMS, scenarios.stations(), "\n".join([*lines, "true"]) + "\n", LIMIT, lambda said: None)
    except command.Failed as failed:
        raise Failed(f"virtual machine: {failed}") from failed
    printed = {}
    for number, name in enumerate(commands):
        text = (guest.RESULTS / str(number)).read_text()
        if not text:
            problem = (guest.RESULTS / f"{number}.problem").read_text().strip().splitlines() or ["no reason given"]
            raise Failed(f"virtual machine: {name}: {problem[-1]}")
        printed[name] = json.loads(text)
    return printed
