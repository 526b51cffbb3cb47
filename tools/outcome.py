"""What a run ended in, and whether it ends in the same when it is run again on its recording."""

import json
import re
import subprocess

STATUS = {"PASS": 0, "FAIL": 1, "ERROR": 2}


def failure_text(failure):
    """The error's code and message, then what caused it, down to the device."""
    error = failure["error"]
    if error is None:
        return failure["message"]
    text = f'{error["code"]} {error["description"]}'
    while error := error.get("underlying"):
        text += f' < {error["domain"]} {error["code"]}'
    return text


def of(report):
    """The verdict of a run and, when it is not PASS, why."""
    done = report["runs"][0]
    reasons = [failure_text(failure) for failure in done["failures"]]
    if not reasons:
        judged = done["results"] + [one for one in done["benchResults"] if one["partOfVerdict"]]
        reasons = [one["name"] for one in judged if one["judgement"] == "outside"]
    return ": ".join([done["verdict"], *(["; ".join(reasons)] if reasons else [])])


def status(outcome):
    """The exit status that goes with an outcome."""
    return STATUS[outcome.split(":")[0]]


DATE = re.compile(r"\d{4}-\d\d-\d\d \d\d:\d\d:\d\d \+0000")  # of the wall clock, in a frame's row
STOPPING = "We are stopping because there was an error. If stopping the stream fails, it will be ignored."
FRAME_LINE = re.compile(r"(?:(?:Received f|Processing f|F)rame |Frame,Date[^\n]*\n+)(\d+)\b")


def without_timing(report):
    """What a run and its replay must agree on. A stream may deliver further frames before the stop reaches it: how
    many of them are counted, and what the log says of them, depends on the threads. So does how many frames have
    been processed when another one is received that cannot be used."""
    done = report["runs"][0]
    lines = [DATE.sub("DATE", line["message"]) for line in done["log"]]
    last = next((int(number) for line in lines for number in
                 re.findall(r"Frame (\d+) (?:is the last frame|failed projection validation)", line)), None)

    def is_timed(line):
        frame = FRAME_LINE.match(line)
        if frame and last is None:
            return STOPPING in lines and line.startswith("Processing")
        return "won't be counted" in line or (frame and int(frame.group(1)) > last)

    def value_of(result):
        return last if last and result["name"] == "Actual Frames" else result["value"]

    stops = lines.count(STOPPING)
    lines = [line for line in lines if not is_timed(line) and line != STOPPING]
    received = [line for line in lines if line.startswith(("Received frame", "Processing event"))]
    return {
        "verdict": done["verdict"],
        "failures": done["failures"],
        "results": [[one["name"], one["judgement"], value_of(one)] for one in done["results"]],
        "auxiliary data": done["auxiliaryData"],
        "frames": [[one["number"], one["presentation"], one["temperatures"], one["lightSource"]]
                   for one in done["frames"]],
        "stops for an error": stops,
        "log of receiving": received,
        "log of processing": [line for line in lines if line not in received],
    }


def replay_problem(zrlab, recording, name, report, agreed=None, options=()):
    """How the run on the recording differs, in all of without_timing() or in these of it; None when it does not."""
    command = [zrlab, "run", name, "--device", f"replay:{recording}", "--speed", "max", "--log", "debug"]
    command += ["--format", "json", *options]
    done = subprocess.run(command, capture_output=True, text=True, timeout=120, check=False)
    try:
        replayed = without_timing(json.loads(done.stdout))
    except (ValueError, KeyError):
        return f"replay: no report; exit status {done.returncode}: {done.stderr.strip()}"
    differences = [f"{what}: {replayed[what]}, recorded {value}"[:2000]
                   for what, value in without_timing(report).items()
                   if (agreed is None or what in agreed) and replayed[what] != value]
    return "replay: " + "; ".join(differences) if differences else None
