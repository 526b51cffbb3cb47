"""What is measured: benchmarks of zr_benchmarks, and programs as a whole.

A row's function returns one sample: a dictionary from names to numbers. When it is to be quick, it does a
small part of the work under the same names.
"""

import datetime
import json
import os
import re
import statistics
import subprocess
import tempfile
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
BUILD = ROOT / "build/release"
BIN = BUILD / "bin"
MODULES = {"here": BIN / "zr_plugin.so", "empty": BUILD / "lib/zr_empty_module.so"}

# Runs a command as an ordinary user would as far as priorities go: without root's right to raise them.
WITHOUT_RAISING = ["setpriv", "--bounding-set=-sys_nice", "--inh-caps=-sys_nice"] if os.geteuid() == 0 else []

FORMS = ("text", "html", "json", "jsonl")


class Failed(Exception):
    """A measurement that did not work; its text is one line."""


def output_of(command):
    command = [str(word) for word in command]
    ended = subprocess.run(command, capture_output=True, text=True, cwd=ROOT, check=False)
    if ended.returncode != 0:
        complaint = (ended.stderr or ended.stdout).strip().splitlines()[-1:] or [""]
        raise Failed(f"{' '.join(command)}: status {ended.returncode}: {complaint[0]}")
    return ended.stdout


def spend(*command):
    """What a whole process used: "seconds", "cpu" seconds, context "switches", peak "megabytes"."""
    with tempfile.NamedTemporaryFile("r") as used:
        output_of([BIN / "zr_spend", used.name, *command])
        return json.load(used)


def google(row, prefix=()):
    """Measures the contenders of a row in one process: nanoseconds per item under "CONTENDER" or
    "CONTENDER/SIZE", a counter under "… [COUNTER]"; medians of repetitions in random order."""

    def sample(quick):
        text = output_of([*prefix, BIN / "zr_benchmarks", f"--benchmark_filter=^{row}/",
                          f"--benchmark_repetitions={1 if quick else 5}",
                          f"--benchmark_min_time={0.001 if quick else 0.05}",
                          "--benchmark_enable_random_interleaving=true", "--benchmark_format=json"])
        found = {}
        for run in json.loads(text)["benchmarks"]:
            if run["run_type"] != "iteration":
                continue
            if run.get("error_occurred"):
                raise Failed(f"{run['name']}: {run['error_message']}")
            name = re.sub(r"/(manual_time|real_time|iterations:\d+)", "", run["run_name"])[len(row) + 1:]
            if "items_per_second" in run:
                found.setdefault(name, []).append(1e9 / run["items_per_second"])
            # What a peer takes from malloc itself is not counted: only our allocations are comparable.
            own = ("allocations", "bytes") if name.startswith("here") else ()
            for counter in ("start", "posting", "switches", *own):
                if counter in run:
                    found.setdefault(f"{name} [{counter}]", []).append(run[counter])
        return {name: statistics.median(values) for name, values in found.items()}

    return sample


def zrlab_list(quick):
    """Milliseconds of `zrlab list` and of a program that does nothing, taken in turn."""
    times = {"here": [], "empty program": []}
    for _ in range(3 if quick else 50):
        times["here"].append(spend(BIN / "zrlab", "list")["seconds"] * 1e3)
        times["empty program"].append(spend("true")["seconds"] * 1e3)
    return {name: statistics.median(values) for name, values in times.items()}


def module_load(quick):
    """Milliseconds of loading the plug-in and an empty module, taken in turn."""
    times = {name: [] for name in MODULES}
    for _ in range(3 if quick else 30):
        for name, module in MODULES.items():
            times[name].append(float(output_of([BIN / "zr_module_load", module])) * 1e-6)
    return {name: statistics.median(values) for name, values in times.items()}


def zrlab_run(name, *settings, speed="max", extra=()):
    sets = [word for setting in settings for word in ("--set", setting)]
    return spend(BIN / "zrlab", "run", name, *sets, "--speed", speed, "--log", "off", *extra)


def at_30_fps(quick):
    """A run at the device's own pace, the device alone, and the device with two threads that each frame wakes:
    CPU seconds and switches per frame."""
    frames = 30 if quick else 300
    run = zrlab_run("VantorFaultDiagnostic", f"frameCount={frames}", "timeout=60", speed="1")
    alone = spend(BIN / "zr_device_alone", frames)
    handed_over = spend(BIN / "zr_device_alone", frames, "handed-over")
    found = {}
    for name, used in (("here", run), ("device alone", alone), ("two bare threads woken", handed_over)):
        found[f"{name} [share]"] = 100 * used["cpu"] / (frames / 30)
        found[f"{name} [switches]"] = used["switches"] / frames
    return found


def scaled(size, quick):
    return size // 100 if quick else size


def memory_of_frames(quick):
    """Peak megabytes of a run of the experiment over a hand-fed stream, by user and number of frames."""
    return {f"{user}/{frames}": spend(*prefix, BIN / "zr_benchmarks",
                                      f"--benchmark_filter=^frames/here/{scaled(frames, quick)}/")["megabytes"]
            for user, prefix in (("here", ()), ("ordinary user", WITHOUT_RAISING))
            for frames in (1000, 30_000, 1_000_000)}


def memory_of_runs(quick):
    """Peak megabytes of a session, by number of runs. The median of five of the short ones, whose peak varies; a
    long one has passed through every state that a short one can be in, and takes minutes."""
    return {f"here/{runs}": statistics.median(
        zrlab_run("VantorFaultDiagnostic", "frameCount=5", "timeout=0.1",
                  extra=["--repeat", scaled(runs, quick)])["megabytes"] for _ in range(1 if quick else sessions))
        for runs, sessions in ((1000, 5), (10_000, 1), (100_000, 1))}


def report(name, parameter, sizes):
    """By form and size: seconds beyond the text form, and those and the peak megabytes of the session. The forms
    run side by side: the device paces each session, which leaves nine tenths of a core idle."""

    def sample(quick):
        found = {}
        with tempfile.TemporaryDirectory() as folder:
            for size in sizes:

                def session(form, size=size):
                    return zrlab_run(name, f"{parameter}={scaled(size, quick)}", "timeout=600",
                                     extra=["--format", form, "--output", f"{folder}/{form}"])

                with ThreadPoolExecutor() as pool:
                    used = dict(zip(FORMS, pool.map(session, FORMS)))
                for form, spent in used.items():
                    found[f"{form}/{size} [seconds]"] = spent["cpu"] - used["text"]["cpu"]
                    found[f"{form}/{size} [session]"] = spent["cpu"]
                    found[f"{form}/{size} [megabytes]"] = spent["megabytes"]
        return found

    return sample


def machine():
    """What the page and the kept baseline say of the machine."""
    processor = re.search(r"^model name\s*:\s*(.*)$", Path("/proc/cpuinfo").read_text(), re.M)
    return {
        "processor": processor.group(1) if processor else os.uname().machine,
        "cores": len(os.sched_getaffinity(0)),
        "kernel": os.uname().release,
        "compiler": output_of(["g++", "--version"]).splitlines()[0],
        "commit": output_of(["git", "describe", "--always", "--dirty"]).strip(),
        "root": os.geteuid() == 0,
        "nice": os.nice(0),
        "load": os.getloadavg()[0],
        "date": datetime.date.today().isoformat(),
    }
