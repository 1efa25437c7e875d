#!/usr/bin/env python3
# SPDX-License-Identifier: LGPL-2.1-or-later
"""Makes FOLDER/performance.md and performance.svg from the figures in FOLDER/performance.json.

    bench/report.py FOLDER [RESULTS-FOLDER]

With the folder of what the benchmarks printed, it makes performance.json from that first. A file
there is named PROCESSORS.PROGRAM.ROUND.json. A benchmark is named CASE/LIBRARY, and a case's first
part is its group. A figure is the median of all repetitions of all rounds.
"""

import collections
import datetime
import json
import pathlib
import platform
import statistics
import subprocess
import sys

OURS, LIMIT = "kesbluetooth", "libdbus"
LIBRARIES = [OURS, LIMIT, "sdbus-c++", "GDBus", "dbus-glib"]
PACKAGES = ["libdbus-1-3", "dbus", "libsdbus-c++1", "libsystemd0", "libglib2.0-0",
            "libdbus-glib-1-2", "libbenchmark1debian", "g++"]
SECONDS = {"s": 1, "ms": 1e-3, "us": 1e-6, "ns": 1e-9}


class Figures:
    """The figures of performance.json: {(processors, case, library): {quantity: statistics}}."""

    def __init__(self, measured):
        self.values = {(row["processors"], row["case"], row["library"]): row
                       for row in measured["results"]}

    def median(self, processors, case, library, quantity="time"):
        row = self.values.get((processors, case, library), {})
        return row[quantity]["median"] if quantity in row else None

    def ratio(self, processors, case, library, base, quantity="time"):
        value = self.median(processors, case, library, quantity)
        other = self.median(processors, case, base, quantity)
        return value / other if value is not None and other else None

    def overlap(self, processors, case, library, other):
        """Whether the middle halves of two libraries' times overlap."""
        first, second = (self.values[processors, case, name]["time"] for name in (library, other))
        if "lower_quartile" not in first or "lower_quartile" not in second:
            return True
        return (first["lower_quartile"] <= second["upper_quartile"]
                and second["lower_quartile"] <= first["upper_quartile"])

    def cases(self, processors, group):
        found = {case for where, case, _ in self.values if where == processors
                 and case.split("/")[0] == group}
        return sorted(found, key=lambda case: int(case.split("/")[1]))


def microseconds(value):
    if value is None:
        return "–"
    value *= 1e6
    return f"{value:,.{2 if value < 10 else 1 if value < 1000 else 0}f}"


def table(head, rows):
    lines = ["| " + " | ".join(head) + " |", "|" + "---|" * len(head)]
    lines += ["| " + " | ".join(row) + " |" for row in rows]
    return "\n".join(lines) + "\n"


def compared(figures, processors, cases, libraries, label, quantity="time", scale=1):
    """One row for each case: the time with each library, and how ours relates to each."""
    rows = []
    for case, text in cases:
        cells = [text]
        for library in libraries:
            value = figures.median(processors, case, library, quantity)
            cell = microseconds(value * scale if value is not None else None)
            if library != OURS and value is not None:
                ratio = figures.ratio(processors, case, OURS, library, quantity)
                cell += f" (× {ratio:.2f})"
            cells.append(cell)
        rows.append(cells)
    return table([label] + libraries, rows)


CALLS = [("call/nothing", "no data"), ("call/text", "a string"),
         ("call/properties", "15 properties, decoded"),
         ("call/text-beside-receive-thread", "a string, beside an idle receive thread")]
SIGNALS = [("signal/idle", "200 a second"), ("signal/2000-per-second", "2,000 a second"),
           ("signal/idle-while-calling", "200 a second, another thread calls"),
           ("signal/2000-per-second-while-calling", "2,000 a second, another thread calls")]


def goal(figures, text, case, base, limit):
    ratio = figures.ratio("one", case, OURS, base)
    verdict = "met" if ratio <= limit else "missed"
    if limit == 1 and figures.overlap("one", case, OURS, base):
        verdict = "level"
    return [text, f"× {ratio:.3f}", f"{'<' if limit == 1 else '≤'} {limit}", verdict]


def goals(figures):
    rows = []
    for case, text in CALLS[:3]:
        rows.append(goal(figures, f"call, {text}: against raw libdbus", case, LIMIT, 1.03))
        for peer in LIBRARIES[2:]:
            rows.append(goal(figures, f"call, {text}: against {peer}", case, peer, 1))
    for peer in ("sdbus-c++", "GDBus"):
        worst = max(figures.cases("one", "decode"),
                    key=lambda case: figures.ratio("one", case, OURS, peer))
        rows.append(goal(figures, f"decoding, worst size: against {peer}", worst, peer, 1))
    for case in figures.cases("one", "list"):
        rows.append(goal(figures, f"listing {case.split('/')[1]}: against raw libdbus", case, LIMIT,
                         1.05))
    for peer in ("sdbus-c++", "GDBus"):
        rows.append(goal(figures, f"signal, idle: against {peer}", "signal/idle", peer, 1))
    return table(["goal", "time", "wanted", ""], rows)


def numbered(figures, group, quantity, unit, scale):
    """Rows of the groups that only we are measured in."""
    rows = []
    for case in figures.cases("one", group):
        count = int(case.split("/")[1])
        rows.append([f"{group.replace('-', ' ')}, {count:,}",
                     microseconds(figures.median("one", case, OURS)),
                     f"{figures.median('one', case, OURS, quantity) * scale:.0f} {unit}"])
    return rows


def scanner(rows):
    """What the load of the scanner service printed, a quantity and its value in each row."""
    if not rows:
        return ""
    return f"""## The scanner service under load

8 client programs ask on 2 adapters without pause, while 1,000 devices are found again and again.
All processors.

{table(["", "measured"], rows)}
"""


def document(figures, measured):
    one, every = "one", "all"
    sizes = [(case, f"{int(case.split('/')[1]):,}") for case in figures.cases(one, "decode")]
    lists = [(case, f"{int(case.split('/')[1]):,}") for case in figures.cases(one, "list")]
    quick = LIBRARIES[:4]
    idle = [[library, f"{figures.median(one, 'idle-processor-time-per-minute', library) * 1e3:.1f}"]
            for library in (OURS, "sdbus-c++", "GDBus")]
    rates = [[text] + [f"{figures.median(one, case, library, 'calls_per_second'):,.0f}"
                       for library in quick] for case, text in SIGNALS[2:]]
    text = numbered(figures, "format", "bytes_per_second", "MB/s", 1e-6)
    text += numbered(figures, "parse", "bytes_per_second", "MB/s", 1e-6)
    dispatch = numbered(figures, "dispatch-to-all", "ns_per_record", "ns", 1)
    dispatch += numbered(figures, "dispatch-to-none", "ns_per_record", "ns", 1)
    return f"""# Performance

Measured by `scripts/bench.sh` on {measured["date"]}. `bench/report.py docs` makes this page and its
chart from the figures in [performance.json](performance.json): do not edit.

Machine: {measured["machine"]}.

All libraries talk to the same peer, a small process that uses raw libdbus, over one private bus in
one run, their repetitions mixed in random order. Times are medians in microseconds; (× 0.90) says
that kesbluetooth takes 0.90 times as long as the library of that column. Raw libdbus is the limit:
it looks at each value and keeps none. Unless a heading says otherwise, all processes share one
processor, so that a time is the work done for it; with more, it depends as well on where the
scheduler puts whom and on what else the machine does.

![Times relative to raw libdbus](performance.svg)

## Goals

{goals(figures)}
"Level" means that the middle halves of both libraries' repetitions overlap.

In small calls sdbus-c++ is ahead of raw libdbus, and so of kesbluetooth: libdbus reads and checks a
string reply with 17,000 instructions, and sdbus-c++ makes the whole call with 13,000. It is 34,000
with kesbluetooth and 59,000 with raw libdbus (counted by callgrind).

## Blocking calls

{compared(figures, one, CALLS, LIBRARIES, "reply")}
On all processors:

{compared(figures, every, CALLS, LIBRARIES, "reply")}
## Signals, from emission to callback

While another thread calls, it is that thread which reads a signal; the receive thread, on which all
callbacks run, has to be woken for it.

{compared(figures, one, SIGNALS, quick, "signals")}
On all processors:

{compared(figures, every, SIGNALS, quick, "signals")}
The slowest of a hundred (99th percentile), on one processor:

{compared(figures, one, SIGNALS, quick, "signals", "p99_us", 1e-6)}
Calls a second that the other thread made meanwhile; raw libdbus has a second connection for them:

{table(["signals"] + quick, rates)}
Processor time of a thread that waits for signals while none comes, in milliseconds a minute.
kesbluetooth's looks ten times a second whether `stopLoop()` was called, which may happen in a signal
handler and so sets a flag only:

{table(["library", "ms"], idle)}
## Listing devices

`Adapter::listDevices()` asks the daemon for its devices and, for each, the bus whether the daemon
is there. Raw libdbus sends the same messages.

{compared(figures, one, lists, LIBRARIES[:2], "devices")}
## Decoding dictionaries

From a received message to all names and values as objects of the program; raw libdbus makes none.

{compared(figures, one, sizes, quick, "entries")}
## Text form of dictionaries

{table(["entries", "time", "rate"], text)}
## Dispatch

One signal offered to as many subscriptions of its kind, all or none of which it is for.

{table(["subscriptions", "time", "each"], dispatch)}
{scanner(measured["scanner"])}## Versions

{table(["package", "version"], measured["versions"].items())}"""


COLOURS = {OURS: "#1f6feb", LIMIT: "#8b949e", "sdbus-c++": "#d29922", "GDBus": "#bf4b8a",
           "dbus-glib": "#3fb950"}
BARS = CALLS + SIGNALS[:1] + [("decode/15", "decoding 15 entries"), ("list/100", "100 devices")]


def chart(figures):
    """Bars of each library's time relative to raw libdbus's."""
    left, width, bar, longest = 290, 860, 13, 4.0
    scale = (width - left - 70) / longest
    parts, y = [], 40
    for case, text in BARS:
        shown = [(library, figures.ratio("one", case, library, LIMIT)) for library in LIBRARIES]
        shown = [(library, ratio) for library, ratio in shown if ratio is not None]
        group = "call: " if case.startswith("call/") else ""
        group = "signal: " if case.startswith("signal/") else group
        parts.append(f'<text x="{left - 8}" y="{y + len(shown) * bar / 2 + 4:.0f}" '
                     f'text-anchor="end">{group}{text}</text>')
        for library, ratio in shown:
            length = min(ratio, longest) * scale
            parts.append(f'<rect x="{left}" y="{y}" width="{length:.1f}" height="{bar - 2}" '
                         f'fill="{COLOURS[library]}"/>'
                         f'<text x="{left + length + 4:.1f}" y="{y + bar - 3}" '
                         f'class="small">{ratio:.2f}</text>')
            y += bar
        y += 10
    x = left
    for library in LIBRARIES:
        parts.append(f'<rect x="{x}" y="12" width="11" height="11" fill="{COLOURS[library]}"/>'
                     f'<text x="{x + 15}" y="22">{library}</text>')
        x += 110
    limit = left + scale
    parts.append(f'<line x1="{limit:.1f}" y1="34" x2="{limit:.1f}" y2="{y - 6}" '
                 'stroke="#57606a" stroke-dasharray="3 3"/>')
    return (f'<svg xmlns="http://www.w3.org/2000/svg" width="{width}" height="{y}" '
            f'viewBox="0 0 {width} {y}">\n<style>text {{ font: 12px sans-serif; fill: #24292f }} '
            '.small { font-size: 10px }</style>\n'
            f'<rect width="{width}" height="{y}" fill="#ffffff"/>\n' + "\n".join(parts) +
            "\n</svg>\n")


def repetitions(folder):
    """All repetitions of all rounds: {(processors, case, library): {quantity: [value]}}."""
    found = collections.defaultdict(lambda: collections.defaultdict(list))
    for file in sorted(folder.glob("*.*.*.json")):
        for run in json.loads(file.read_text())["benchmarks"]:
            if run.get("run_type") == "aggregate":
                continue
            parts = [part for part in run["name"].split("/")
                     if part not in ("real_time", "manual_time")
                     and not part.startswith("iterations:")]
            values = found[file.name.split(".")[0], "/".join(parts[:-1]), parts[-1]]
            # What happens inside one thread is measured in its processor time.
            waits = run["name"].endswith("_time")
            values["time"].append(run["real_time" if waits else "cpu_time"]
                                  * SECONDS[run["time_unit"]])
            for name in ("p99_us", "calls_per_second", "ns_per_entry", "ns_per_record",
                         "bytes_per_second"):
                if name in run:
                    values[name].append(run[name])
    return found


def statistic(values):
    result = {"median": statistics.median(values), "repetitions": len(values)}
    if len(values) > 1:
        quarters = statistics.quantiles(values, n=4)
        result.update(lower_quartile=quarters[0], upper_quartile=quarters[2])
    return result


def version(package):
    done = subprocess.run(["dpkg-query", "-W", "-f", "${Version}", package],
                          capture_output=True, text=True)
    return done.stdout or "not installed"


def machine():
    model = next((line.split(":")[1].strip() for line in open("/proc/cpuinfo")
                  if line.startswith("model name")), platform.machine())
    memory = next(int(line.split()[1]) for line in open("/proc/meminfo")
                  if line.startswith("MemTotal"))
    processors = subprocess.run(["nproc"], capture_output=True, text=True).stdout.strip()
    return (f"{model}, {processors} processors, {memory / 2**20:.0f} GiB, "
            f"Linux {platform.release()}")


def collect(folder):
    """Performance.json of what the benchmarks printed, a result in each line."""
    scanner_file = folder / "scanner.txt"
    lines = scanner_file.read_text().splitlines() if scanner_file.exists() else []
    facts = {"date": str(datetime.date.today()), "machine": machine(),
             "versions": {package: version(package) for package in PACKAGES},
             "scanner": [line.split(None, 1) for line in lines if line.strip()],
             "times": "seconds"}
    rows = [{"processors": processors, "case": case, "library": library}
            | {name: statistic(values) for name, values in quantities.items()}
            for (processors, case, library), quantities in repetitions(folder).items()]
    return ("{" + ",\n".join(f'"{name}": {json.dumps(value)}' for name, value in facts.items())
            + ',\n"results": [\n' + ",\n".join(map(json.dumps, rows)) + "\n]}\n")


def main():
    if len(sys.argv) not in (2, 3):
        print("usage: report.py FOLDER [RESULTS-FOLDER]", file=sys.stderr)
        sys.exit(2)
    folder = pathlib.Path(sys.argv[1])
    if len(sys.argv) == 3:
        (folder / "performance.json").write_text(collect(pathlib.Path(sys.argv[2])))
    measured = json.loads((folder / "performance.json").read_text())
    figures = Figures(measured)
    (folder / "performance.md").write_text(document(figures, measured))
    (folder / "performance.svg").write_text(chart(figures))


if __name__ == "__main__":
    main()
