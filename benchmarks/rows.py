"""The rows: what is measured, what is to be reached, under which conditions, and what limits it.

This table drives the page, the kept baseline and the check. Every value of a goal is better when it is less.
"""

from dataclasses import dataclass
from typing import Callable

import measure
import measure_linux

LOCKED = ("mutex+deque", "asio io_context", "asio strand", "tbb serial node")
LOCK_FREE = ("moodycamel (lock-free)",)
QUEUES = LOCKED + LOCK_FREE
HASH_MAPS = ("absl::flat_hash_map", "std::unordered_map")
MAPS = HASH_MAPS + ("std::map", "RapidJSON", "nlohmann::json")
STANDARD_MAPS = ("std::map", "std::unordered_map")
PIPELINES = ("mutex+deque", "asio io_context", "moodycamel (lock-free)")

USERS = ("here", "ordinary user")  # "here": the user who runs the benchmarks
REPEATS = 5
FRAMES = (25_000, 50_000, 100_000)
IMAGES = (2500, 5000, 10_000)


@dataclass(frozen=True)
class Goal:
    what: str
    value: Callable[[dict], float]  # of one sample
    limit: float | None = None  # None: shown, not judged
    unit: str = ""  # a ratio without one

    def compared(self):
        """Whether the kept baseline has it: what depends on the machine's speed alone, it has not."""
        return self.unit not in ("ns", "µs", "ms", "s")


@dataclass(frozen=True)
class Curve:
    """A drawing of a row: a sample's values at sizes, by series."""
    file: str
    title: str
    x: str
    y: str
    key: str  # of a sample, with {series} and {size}
    series: tuple
    sizes: tuple


@dataclass(frozen=True)
class Row:
    name: str
    title: str
    sample: Callable[[bool], dict]
    goals: tuple
    conditions: str
    limit: str
    unit: str = "ns"  # of the contenders' values
    curves: tuple = ()
    needs_root: bool = False
    repeats: int = REPEATS  # how often the row is sampled


def over(numerator, denominator):
    return numerator / denominator if denominator > 0 else float("nan")


def of_best(peers, suffix=""):
    """Our value over that of the best of these peers."""
    return lambda sample: over(sample["here" + suffix], min(sample[p + suffix] for p in peers))


def value(key, scale=1.0, digits=3):
    return lambda sample: round(sample[key] * scale, digits)


def growth(later, earlier, later_size=1, earlier_size=1):
    return lambda sample: over(sample[later] / later_size, sample[earlier] / earlier_size)


EQUAL = ("Poster and worker at the same nice level: -5 as root, which is what our queue asks for, else the "
         "caller's.")
RAISED = "The worker five levels above the poster, as our queue has it when root runs the bench."
ALONE = "One thread measures while a second one sleeps; CPU time."
GUEST = (
    "One after the other on Debian's kernel in a virtual machine of one processor. **The time is virtual**: the "
    "guest's clock counts its instructions, one per nanosecond, and skips the time without any. So the values hardly "
    "depend on this machine and its load, one boot is enough, and they say nothing about the seconds of a processor. "
    "Instructions are those of all threads of the process, in the kernel too, and of the interrupts that fall into "
    "them. \"zrlab run\" is the whole program with its plug-in: what each item more costs it.")
PIPELINE_CONDITIONS = (
    "A camera of eight buffers delivers as fast as they come back, 100,000 frames, log off, metadata of "
    "30 keys made beforehand. The peers do the same steps on their queue and absl::flat_hash_map, with "
    "the same nice levels for receiving (-5, when allowed) and processing (10). ")


def report_row(name, title, experiment, parameter, sizes, limit, more=()):
    last, first = sizes[-1], sizes[0]
    judged = []
    forms = measure.FORMS[1:]
    for form in forms:
        judged += [
            Goal(f"{form}: seconds at {last:,}", value(f"{form}/{last} [seconds]"), 5, "s"),
            Goal(f"{form}: peak memory at {last:,}", value(f"{form}/{last} [megabytes]"), 200, "MB"),
            Goal(f"{form}: session's time per item at {last:,} of that at {first:,}",
                 growth(f"{form}/{last} [session]", f"{form}/{first} [session]", last, first), 1.5),
        ]
    judged.append(Goal(f"jsonl: peak memory at {last:,} of the text form's",
                       growth(f"jsonl/{last} [megabytes]", f"text/{last} [megabytes]"), 1.03))
    return Row(
        name, title, measure.report(experiment, parameter, sizes), (*judged, *more),
        "Whole zrlab sessions with --speed max and --log off; the report goes to a file. The four forms' sessions "
        "run side by side, each paced by its device. Time is CPU time beyond the same session with the text form, "
        "peak memory is the whole process's.",
        limit,
        curves=(
            Curve(f"{name}-seconds.svg", f"{title}: time", parameter, "seconds", "{series}/{size} [seconds]",
                  forms, sizes),
            Curve(f"{name}-memory.svg", f"{title}: peak memory", parameter, "MB",
                  "{series}/{size} [megabytes]", forms, sizes)))


ROWS = (
    Row("post", "Post an item to a busy serial queue", measure.google("post"),
        (Goal("of the best peer with a lock", of_best(LOCKED, "/1000"), 0.8),
         Goal("of the lock-free queue", of_best(LOCK_FREE, "/1000"), 1.1),
         Goal("allocations per item, 16 items queued", value("here/16 [allocations]"), 0, "allocations")),
        "The item captures a buffer reference, a weak reference and 24 bytes. The worker is held in an "
        "item; 1,000 (or 16) items are queued, and run outside the measured time. " + EQUAL,
        "Two reference counts per item are common to all. Of our samples of a profile, two fifths are in taking the "
        "lock and giving it back, which a queue without one spares; a queue uses the memory of its last 1,024 items "
        "again."),
    Row("through", "20,000 items through a serial queue, equal nice levels", measure.google("through"),
        (Goal("of the best peer", of_best(QUEUES, "/20000"), 0.9),),
        "The same items, from the first one's posting until the last one ran. " + EQUAL,
        "The cache lines of the items, which poster and worker pass to and fro. Our worker takes all items "
        "that are there at once, and yields its core for up to 40 µs before it sleeps, so it is hardly "
        "ever woken: the figures have the context switches per item."),
    Row("through-raised", "20,000 items through a serial queue, worker raised",
        measure.google("through-raised"),
        (Goal("of mutex + deque at the same levels", of_best(("mutex+deque",), "/20000"), 1.0),),
        RAISED,
        "As above. A raised worker preempts a poster that wakes it on its own core; one that is hardly ever "
        "woken does not.",
        needs_root=True),
    Row("wake", "Wake a sleeping queue", measure.google("wake"),
        (Goal("post to start, of the bare futex", of_best(("bare futex",), " [start]"), 1.1),
         Goal("posting, of the best peer's", of_best(QUEUES, " [posting]"), 1.1)),
        "200 µs of rest before each of 1,000 items; medians in one process. " + EQUAL,
        "The system call that wakes a thread, and the scheduler's way to it. Beyond the bare futex, our queue "
        "takes a lock on each side, and keeps itself alive while it is woken."),
    Row("wake-raised", "Wake a sleeping queue, worker raised", measure.google("wake-raised"),
        (Goal("post to start, of mutex + deque at the same levels", of_best(("mutex+deque",), " [start]")),
         Goal("posting, of mutex + deque at the same levels", of_best(("mutex+deque",), " [posting]"))),
        RAISED,
        "The worker preempts the poster when both share a core: the item starts before posting returns, "
        "so posting seems to take the whole time.",
        needs_root=True),
    Row("thread", "A queue that is made, used once and dropped", measure.google("thread"),
        (Goal("of a bare detached thread", of_best(("bare thread",))),),
        "Not held: each item starts a thread. As root the queue's thread runs at nice -5, the bare one at "
        "0.",
        "Starting a thread is nine tenths of it; the rest is the queue's own objects, and setting the thread's "
        "name and nice level."),
    Row("describe", "Frame description from 30 metadata keys", measure.google("describe"),
        (Goal("of the best hash map", of_best(HASH_MAPS), 1.0),
         Goal("allocations", value("here [allocations]"), 1, "allocations")),
        "The dictionary is there; eighteen look-ups, one allocation, the clock. Peers hold their numbers "
        "in a variant, JSON values in their own. " + ALONE,
        "Of the samples of a profile, 44 % are in the eighteen look-ups, whose hashes are made at compile time, "
        "22 % in the comparison of their keys, 20 % in the reading of the clock, 5 % in the one allocation."),
    Row("build", "Build a dictionary of 30 keys and describe it", measure.google("build"),
        (Goal("of the best peer", of_best(MAPS), 1.0),),
        "A fresh one each time, keys copied, room reserved where the peer can, in no order of the keys; "
        "its end is part of it. " + ALONE,
        "Half of the samples of a profile are in making the map: thirty hashes, and copies of the keys into the "
        "map's one block. 11 % are in the look-ups, 13 % in three allocations. RapidJSON makes no index, but "
        "compares every key with those before it when it looks one up; a map of std::string allocates for each key of "
        "more than 15 characters."),
    Row("image", "Record to image to result dictionary", measure.google("image"),
        (Goal("of RapidJSON", of_best(("RapidJSON",), "/1000"), 0.6),
         Goal("bytes allocated per image", value("here/10000 [bytes]", digits=0), 1024, "bytes"),
         Goal("allocations per image", value("here/10000 [allocations]", digits=1), 4, "allocations")),
        "A whole run of the experiment whose sensor sends 1,000 reports in one turn of the run loop "
        "(10,000 for the memory), the end of the result included; the run's own cost is in it. The peers "
        "go from the bytes to an array of objects at once. " + ALONE,
        "Of 968 bytes, 384 are the image's 96 samples, 48 what two lists need besides, 344 the dictionary's five "
        "entries with room for their keys, and index, 88 what is shared of it, 80 the parsed image and 24 its place "
        "in the result. Half of the samples of a profile are in malloc and free."),
    Row("samples", "Samples to measurements and analysis", measure.google("samples"),
        tuple(Goal(f"of the best standard map, {n:,} channels", of_best(STANDARD_MAPS, f"/{n}"), 0.8)
              for n in (60, 1000, 10_000, 100_000)) +
        (Goal("per sample, 100,000 of 1,000 channels", growth("here/100000", "here/1000"), 1.5),),
        "Channels in random order, the same for all; sixty of them are expected and analysed. Values are "
        "per sample, the end of the result is part of them. " + ALONE,
        "The analysis judges sixty channels whatever N is. At 60 it makes the whole time: of the samples of a "
        "profile, 60 % are in making and freeing its results and their limits, 6 % in storing the measurements. At "
        "1,000 everything fits the second-level cache; at 100,000 the store of the measurements takes 10 MB, each "
        "byte touched once and the index of 2 MB in random order. Memory is what grows: reading the names alone, "
        "without a store, costs about three times as much per sample there, and the standard maps five to eight "
        "times. Fetching the index ahead won nothing beyond the spread.",
        curves=(Curve("samples.svg", "Samples to measurements and analysis", "channels", "ns per sample",
                      "{series}/{size}", ("here",) + STANDARD_MAPS, (60, 1000, 10_000, 100_000)),)),
    Row("pipeline", "Frames through the fault experiment at full speed, as root", measure.google("pipeline"),
        (Goal("time of the best peer pipeline's", of_best(PIPELINES, "/100000"), 0.5),
         Goal("time per frame", value("here/100000", 1e-3), None, "µs")),
        PIPELINE_CONDITIONS + "Receiving runs at nice -5.",
        "How often one of the three threads sleeps, on two cores: a wake-up costs microseconds, everything "
        "else that is done to a frame about one. The figures have the context switches per frame. The camera "
        "sleeps in all contenders when its eight buffers are out.",
        needs_root=True),
    Row("pipeline-user", "Frames through the fault experiment at full speed, as an ordinary user",
        measure.google("pipeline", measure.WITHOUT_RAISING),
        (Goal("time of the best peer pipeline's", of_best(PIPELINES, "/100000"), 0.5),
         Goal("time per frame", value("here/100000", 1e-3), None, "µs")),
        PIPELINE_CONDITIONS + "Without the right to raise a priority (setpriv takes it from root), so "
        "receiving runs at nice 0.",
        "As above; the receiving thread has no priority over the camera's."),
    Row("log-off", "A log line whose level is off", measure.google("log-off"),
        (Goal("nanoseconds", value("here"), None, "ns"),), ALONE,
        "One load of the level, and the jump over the line."),
    Row("log-on", "A log line that is written", measure.google("log-on"),
        (Goal("of snprintf alone", of_best(("snprintf",))),), "A sink that does nothing. " + ALONE,
        "Formatting the text as snprintf does is nearly all of it; the rest is finding the sink under a lock."),
    Row("list", "zrlab list, whole process", measure.zrlab_list,
        (Goal("milliseconds (2, give or take a half)", value("here"), 2.5, "ms"),
         Goal("of an empty program", of_best(("empty program",)))),
        "Wall time from fork to exit, in turn with `true`.",
        "Starting a process, nearly half of it, as the empty program shows; the rest is loading libraries and the "
        "module, and the set-up of the command line.", unit="ms"),
    Row("module", "Module load and registration", measure.module_load,
        (Goal("beyond an empty module", lambda s: s["here"] - s["empty"], 0.5, "ms"),),
        "One load per process, in turn; the host's libraries are there already.",
        "Mapping a file, two thirds of it, as the empty module shows; the rest is relocations and seven "
        "registrations.", unit="ms"),
    Row("at-30-fps", "300 frames at 30 per second, beyond the simulated device alone", measure.at_30_fps,
        (Goal("of a core", lambda s: s["here [share]"] - s["device alone [share]"], 0.15, "%"),
         Goal("context switches per frame", lambda s: s["here [switches]"] - s["device alone [switches]"], 3,
              "switches")),
        "Whole zrlab run against the simulated camera with handlers that do nothing; user and system time "
        "of all threads, divided by the ten seconds that the frames take.",
        "The program's start, a first frame and the report take 3.9 ms, 0.04 % of the ten seconds, and some 20 "
        "switches. Beyond them a frame wakes the receiving and the processing thread once, each of which goes back "
        "to sleep on an idle core. Two bare threads that do nothing else when each frame wakes them, on the system "
        "call alone, are in the table below. No queue can save what they cost beyond the device."),
    Row("memory-frames", "Memory of a run by its number of frames", measure.memory_of_frames,
        tuple(Goal(f"{user}: 1,000,000 frames of 1,000", growth(f"{user}/1000000", f"{user}/1000"), 1.03)
              for user in USERS),
        "Peak memory of a process that runs the experiment once over the hand-fed stream of eight buffers.",
        "Eight buffers bound the receiving queue. Nothing bounds the processing queue, whose thread runs at nice "
        "10: beside other programs that want both cores, frames wait in it at full speed. At a load of ten three "
        "runs of 1,000,000 frames peaked at 5.1, 5.4 and 6.1 MB, two others at 65 and 102 MB.",
        unit="MB",
        curves=(Curve("memory-frames.svg", "Peak memory of a run", "frames", "MB", "{series}/{size}", USERS,
                      (1000, 30_000, 1_000_000)),)),
    Row("memory-runs", "Memory of a session by its number of runs", measure.memory_of_runs,
        (Goal("100,000 runs of 1,000", growth("here/100000", "here/1000"), 1.03),),
        "Peak memory of zrlab run VantorFaultDiagnostic --repeat N, five frames per run, --speed max; the "
        "time-out of 0.1 s is well below what 1,000 runs take. The median of five sessions of 1,000 runs beside one "
        "of each longer series, once: 100,000 runs take minutes.",
        "A pending time-out keeps its experiment until it has passed: a tenth of a second of runs, some forty, is "
        "alive at once. The allocator's arenas: each thread that finds it busy would get one of its own, so zrlab "
        "bounds them to two. 15,000 runs then peaked at 1.01 of 1,000, and 60,000 at 1.05 on a machine with a load of "
        "fourteen; without the bound 1,000 runs alone vary by 4 %.",
        unit="MB", repeats=1,
        curves=(Curve("memory-runs.svg", "Peak memory of a session", "runs", "MB", "{series}/{size}", ("here",),
                      (1000, 10_000, 100_000)),)),
    report_row("report-frames", "Report of a run of frames", "VantorFaultDiagnostic", "frameCount", FRAMES,
               "HTML and JSON are made at the session's end from the record, which holds 168 bytes per frame; JSON's "
               "text, some 700 bytes per frame, is made whole in memory. jsonl writes 32 frames at a time as they "
               "come, and keeps none: its time is formatting 2.9 kB per frame and writing them.",
               (Goal(f"jsonl: peak memory at {FRAMES[-1]:,} of that at {FRAMES[0]:,}",
                     growth(f"jsonl/{FRAMES[-1]} [megabytes]", f"jsonl/{FRAMES[0]} [megabytes]"), 1.03),)),
    report_row("report-images", "Report of a run of images", "KirraImageExperiment", "images", IMAGES,
               "Every form keeps the run's result, 0.9 kB per image. HTML draws from it; JSON is a tree of values, "
               "one per sample, before it is text: 10 kB per image. jsonl writes image by image."),
    Row("linux-frames", "Frames of a camera behind Linux", measure_linux.frames,
        (*(Goal(f"of bare system calls, {rate} per second", of_best(("bare calls",), f"/{rate}"))
           for rate in measure_linux.RATES),
         *(Goal(f"instructions per frame, {rate} per second", value(f"here/{rate}", digits=0), None, "instructions")
           for rate in measure_linux.RATES),
         *(Goal(f"frames lost of 310, {rate} per second", value(f"here/{rate} [lost]"), 0, "frames")
           for rate in measure_linux.RATES)),
        "310 frames of 320 x 180 pixels with metadata, of which the first ten only warm up. The camera is that of the "
        "kernel's driver vivid, described by `examples/linux/virtual-station.json`: of a frame's numbers four come "
        "from the metadata buffer, one from a control every 0.2 s, one from a file every 0.5 s, the others are "
        "constant. The client looks at one number and lets the frame go. Bare calls: poll, VIDIOC_DQBUF and "
        "VIDIOC_QBUF on both nodes, and the same numbers into a structure. " + GUEST,
        "Of 38,800 instructions at 30 per second, about 10,500 are in the file, which is found by its pattern each "
        "time, as its number in /sys may change, and about 350 in each of twelve constants. A description without "
        "these and the control takes 24,000, beside the bare calls' 19,300, which are nearly all the kernel's. Nothing "
        "was lost either of 120 frames at 60 per second while twelve other programs in the guest wanted the processor "
        "all the time.",
        unit="instructions", repeats=1),
    Row("linux-reports", "Reports of a HID sensor behind Linux", measure_linux.reports,
        (Goal("of bare system calls", of_best(("bare calls",))),
         Goal("latency, of bare system calls", of_best(("bare calls",), " [latency]")),
         Goal("instructions per report", value("here", digits=0), None, "instructions"),
         Goal("latency", value("here [latency]", digits=0), None, "instructions"),
         Goal("reports lost of 210", value("here [lost]"), 0, "reports")),
        "210 reports of 792 bytes, twenty per second, of which the first ten only warm up, from a sensor behind uhid "
        "and hidraw. Latency is what passes from the sensor's writing a report to the client's having it: the median, "
        "and the worst of all. Bare calls: read on the hidraw node. " + GUEST,
        "A report wakes the device's thread, which wakes the run loop's: three context switches per report, the bare "
        "calls have one.",
        unit="instructions", repeats=1),
)
