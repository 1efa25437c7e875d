#!/usr/bin/env python3
# SPDX-License-Identifier: LGPL-2.1-or-later
"""Makes FOLDER/performance.md and performance.svg from the figures in FOLDER/performance.json.

    bench/report.py FOLDER [RESULTS-FOLDER]

With the folder of what the benchmarks printed, it makes performance.json from that first. A file
there is named PROCESSORS.PROGRAM.ROUND.json, with PROGRAM-before for the version before this one. A
benchmark is named CASE/LIBRARY, and a case's first part is its group. A figure is the median of all
repetitions of all rounds; its spread is the lowest and the highest median of a round.
"""

import collections
import datetime
import json
import pathlib
import platform
import statistics
import subprocess
import sys

OURS, LIMIT, SHARED, BEFORE = "kesbluetooth", "libdbus", "libdbus-shared", "before"
LIBRARIES = [OURS, LIMIT, "sdbus-c++", "GDBus", "dbus-glib"]
PACKAGES = ["libdbus-1-3", "dbus", "libsdbus-c++1", "libsystemd0", "libglib2.0-0",
            "libdbus-glib-1-2", "libbenchmark1debian", "g++"]
SECONDS = {"s": 1, "ms": 1e-3, "us": 1e-6, "ns": 1e-9}
RATES = ("calls_per_second", "signals_per_second", "answers_per_second", "bytes_per_second")
COUNTERS = RATES + ("p99_us", "longest_us", "processor_us", "ns_per_entry", "ns_per_record",
                    "bus_us", "wake_ups", "rss_before_bytes", "rss_bytes", "rss_peak_bytes", "pss_bytes")


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

    def spread(self, processors, case, library, base=None, quantity="time"):
        """The figure, or its ratio to another library's: (of all rounds, lowest, highest)."""
        row = self.values.get((processors, case, library), {}).get(quantity)
        other = self.values.get((processors, case, base), {}).get(quantity)
        if row is None or base and other is None:
            return None
        if base is None:
            return row["median"], min(row["rounds"]), max(row["rounds"])
        pairs = [(row["median"], other["median"]), *zip(row["rounds"], other["rounds"])]
        if quantity in RATES: # the time of one
            pairs = [(second, first) for first, second in pairs]
        ratios = [first / second if second else float("inf") for first, second in pairs]
        return ratios[0], min(ratios), max(ratios)

    def cases(self, processors, group):
        found = {case for where, case, _ in self.values if where == processors
                 and case.split("/")[0] == group}
        return sorted(found, key=lambda case: int(case.split("/")[1]))

    def has(self, processors, group):
        return any(where == processors and case.split("/")[0] == group
                   for where, case, _ in self.values)


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
            if library != OURS and value:
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
LISTS = [(f"list/{count}", f"{count:,}") for count in (1, 10, 100, 1000)]
CHECKS = [(f"presence-check/{count}", f"{count:,}") for count in (10, 1000)]
DECODING = [(f"decode/{count}", f"{count:,}") for count in (1, 15, 100, 1000, 10000)]
PLACES = {"one": "one processor", "all": "all processors",
          "plain": "one processor, ordinary scheduling", "real": "all processors, real-time"}


def worst(figures, where, cases, library, base, quantity):
    """The row that is furthest from its goal, and where it is."""
    found = [(figures.spread(place, case, library, base, quantity), f"{text}; {PLACES[place]}")
             for place in where for case, text in cases]
    return max((row for row in found if row[0]), default=None)


def verdict(spread, limit):
    if spread[0] <= limit:
        return "met"
    if spread[1] <= limit:
        return "met in a round, missed in another"
    return f"missed by {spread[0] / limit - 1:.1%}"


def goals(figures):
    """One row for each goal: the worst of all that it is for."""
    one, every, both, usual = ("one",), ("all",), ("one", "all"), tuple(PLACES)
    idle, loop, answers = [("idle-minute", "a minute")], [("stop/loop", "a loop")], "scanner/"
    many = [(answers + "found-4000", "64 clients, 4,000 devices")]
    entries = [(case, f"entries: {text}") for case, text in DECODING]
    lists = [(case, f"devices: {text}") for case, text in LISTS]
    checks = [(case, f"names: {text}") for case, text in CHECKS]
    relative = [
        ("a call against raw libdbus", both, CALLS, LIMIT, 1.03, "time"),
        ("a call against sdbus-c++", both, CALLS, "sdbus-c++", 1.1, "time"),
        ("a call against GDBus", both, CALLS, "GDBus", 1, "time"),
        ("a call against dbus-glib", both, CALLS, "dbus-glib", 1, "time"),
        ("decoding against sdbus-c++", one, entries, "sdbus-c++", 1, "time"),
        ("decoding against GDBus", one, entries, "GDBus", 1, "time"),
        ("a list against raw libdbus, one by one", both, lists, LIMIT, 1.05, "time"),
        ("a list of 100 against raw libdbus, one by one", every, lists[2:3], LIMIT, 0.3, "time"),
        ("a presence check against raw libdbus", both, checks, LIMIT, 1.05, "time"),
        ("signals, nobody calls: against sdbus-c++", usual, SIGNALS[:1], "sdbus-c++", 1, "time"),
        ("signals, nobody calls: against sdbus-c++", usual, SIGNALS[1:2], "sdbus-c++", 1.2, "time"),
        ("signals beside calls: against sdbus-c++", usual, SIGNALS[2:], "sdbus-c++", 1.2, "time"),
        ("signals against GDBus", both, SIGNALS, "GDBus", 1, "time"),
        ("calls beside signals: against the version before", usual, SIGNALS[2:], BEFORE, 1.02,
         "calls_per_second"),
        ("`kesbt adapters` against `gdbus call`", every, [("command/adapters", "whole process")],
         "GDBus", 1, "time")]
    absolute = [
        ("wake-ups of an idle receive thread", one, idle, 60, "wake_ups", 1, ""),
        ("processor time of an idle receive thread", one, idle, 4, "time", 1e3, " ms"),
        ("from `stopLoop()` to the end of `waitLoop()`", every, loop, 1, "time", 1e3, " ms"),
        ("an answer of the scanner service", every,
         [(answers + "known-1000", "1,000 known devices")], 5, "time", 1e3, " ms"),
        ("an answer's processor time", every, many, 3.4, "processor_us", 1e-3, " ms"),
        ("the service's memory, at most", every, many, 60, "rss_peak_bytes", 1e-6, " MB")]
    rows = [(text, worst(figures, where, cases, OURS, base, quantity), limit, 1, "")
            for text, where, cases, base, limit, quantity in relative]
    rows += [(text, worst(figures, where, cases, OURS, None, quantity), limit, scale, unit)
             for text, where, cases, limit, quantity, scale, unit in absolute]
    cells = []
    for text, found, limit, scale, unit in rows:
        if found is None: # not measured in this run
            continue
        spread, label = [value * scale for value in found[0]], found[1]
        sign, form = ("", ".1f") if unit or limit > 2 else ("× ", ".3f")
        cells.append([text, label, f"{sign}{spread[0]:{form}}{unit}",
                      f"{spread[1]:{form}} to {spread[2]:{form}}", f"≤ {limit}{unit}",
                      verdict(spread, limit)])
    return table(["goal", "its worst row", "measured", "by rounds", "wanted", ""], cells)


def numbered(figures, group, quantity, unit, scale):
    """Rows of the groups that only we are measured in."""
    rows = []
    for case in figures.cases("one", group):
        count = int(case.split("/")[1])
        rows.append([f"{group.replace('-', ' ')}, {count:,}",
                     microseconds(figures.median("one", case, OURS)),
                     f"{figures.median('one', case, OURS, quantity) * scale:.0f} {unit}"])
    return rows


def cell(figures, place, case, library, quantity="time", scale=1.0, form=",.1f"):
    value = figures.median(place, case, library, quantity)
    return "–" if value is None else f"{value * scale:{form}}"


def grid(figures, head, cases, columns):
    """A row for each (processors, case, library, text), with a column for each quantity."""
    rows = [[text] + [cell(figures, place, case, library, *column[1:]) for column in columns]
            for place, case, library, text in cases]
    return table([head] + [column[0] for column in columns], rows)


def scanner(figures):
    loads = [("scanner/known-1000", "1 client, 20 devices found, 1,000 known"),
             ("scanner/found-1000", "8 clients, 1,000 devices found"),
             ("scanner/found-4000", "64 clients, 4,000 devices found")]
    if not figures.has("all", "scanner"):
        return ""
    columns = [("median, ms", "time", 1e3), ("99th percentile, ms", "p99_us", 1e-3),
               ("longest, ms", "longest_us", 1e-3), ("answers a second", "answers_per_second"),
               ("processor time of one, ms", "processor_us", 1e-3),
               ("signals a second", "signals_per_second", 1, ",.0f"),
               ("memory, MB", "rss_bytes", 1e-6), ("at most, MB", "rss_peak_bytes", 1e-6)]
    return f"""## The scanner service under load

Client programs ask on 2 adapters without pause, while the devices are found again and again; the
4,000 are reported once, before. All processors; the clients and the simulated daemon take part of
them. Processor time is the service's alone.

{grid(figures, "load", [("all", case, OURS, text) for case, text in loads], columns)}
"""


def processes(figures):
    if not figures.has("all", "command"):
        return ""
    commands = [("all", "command/adapters", OURS, "`kesbt adapters`"),
                ("all", "command/adapters", "GDBus", "one `gdbus call`")]
    loops = [("all", "memory/loop", OURS, "with a receive thread"),
             ("all", "memory/loop", LIMIT, "with raw libdbus alone")]
    return f"""## Start-up and memory

From the start of a command to its end, beside the simulated daemon, on all processors. `gdbus call`
sends one message.

{grid(figures, "command", commands, [("ms", "time", 1e3, ".2f")])}
What a program that only waits for signals holds (RSS), and its share of that (PSS):

{grid(figures, "program", loops, [("RSS, MB", "rss_bytes", 1e-6, ".2f"),
                                  ("PSS, MB", "pss_bytes", 1e-6, ".2f")])}
"""


def real_time(figures):
    if not figures.has("real", "signal"):
        return ("Real-time priority (`chrt`) was not permitted where this was measured: all of it "
                "has ordinary scheduling.\n")
    pair = [OURS, "sdbus-c++"]
    return f"""Unless said otherwise, what shares one processor has real-time priority (`chrt -f 1`) on this
page, and what uses all of them `nice -n -10`. With ordinary scheduling, one processor:

{compared(figures, "plain", SIGNALS, pair, "signals")}
With real-time priority, all processors:

{compared(figures, "real", SIGNALS, pair, "signals")}"""


def threads(figures):
    cases = [(case, case.split("/")[1]) for case in figures.cases("all", "threads")]
    columns = [OURS, LIMIT, SHARED, "sdbus-c++"]
    rates = [[text] + [cell(figures, "all", case, library, "calls_per_second", 1, ",.0f")
                       for library in columns] for case, text in cases]
    return f"""## Threads that call at once

Calls for a string, all processors. kesbluetooth has one connection for all threads, and so has
`{SHARED}`; the others have one for each. Calls a second of all threads together:

{table(["threads"] + columns, rates)}
The median time of a call:

{compared(figures, "all", cases, columns, "threads")}"""


def before(figures):
    """The version before beside this one, where it was measured."""
    groups = [(f"call, {text}", case, "time") for case, text in CALLS]
    groups += [(f"signals, {text}", case, "time") for case, text in SIGNALS]
    groups += [(f"a call beside signals, {text}", case, "calls_per_second")
               for case, text in SIGNALS[2:]]
    groups += [(f"list of {text}", case, "time") for case, text in LISTS]
    groups += [("most signals a second", "most-signals", "signals_per_second"),
               ("a minute idle", "idle-minute", "time"),
               ("a minute idle, wake-ups", "idle-minute", "wake_ups")]
    rows = []
    for text, case, quantity in groups:
        for place in PLACES:
            spread = figures.spread(place, case, OURS, BEFORE, quantity)
            if spread:
                rows.append([text, PLACES[place], *(f"× {value:.3f}" for value in spread)])
    if not rows:
        return ""
    return f"""## Against the version before

How the cost relates to that of the version that `KES_BENCH_BASELINE` named, side by side in the
same run.

{table(["what", "where", "ratio", "lowest round", "highest round"], rows)}
"""


def document(figures, measured):
    one, every = "one", "all"
    quick = LIBRARIES[:4]
    idle = [(one, "idle-minute", library, library) for library in (OURS, "sdbus-c++", "GDBus")]
    most = [[library] + [cell(figures, place, "most-signals", library, "signals_per_second", 1,
                              ",.0f") for place in (one, every)] for library in quick]
    rates = [[text] + [f"{figures.median(one, case, library, 'calls_per_second'):,.0f}"
                       for library in quick] for case, text in SIGNALS[2:]]
    shares = [[text] + [cell(figures, place, case, OURS, "bus_us", 1, ",.0f")
                        for place in (one, every)] for case, text in LISTS]
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
Ratios are of times. "By rounds" has the lowest and the highest of the rounds of this run.

{OBSTACLES}
In small calls sdbus-c++ is ahead of raw libdbus, and so of kesbluetooth: libdbus reads and checks a
string reply with 17,000 instructions, and sdbus-c++ makes the whole call with 13,000. It is 33,100
with kesbluetooth, of which 617 are its own and all others libdbus's and the C library's, and 59,000
with raw libdbus (counted by callgrind).

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
{real_time(figures)}
The most signals a second before anybody on the way has to queue, so that they arrive late: the
peer, the bus or the library.

{table(["library", "one processor", "all processors"], most)}
In a burst of calls the receive thread looks every millisecond whether the burst is over, so that no
call has to wake it; a signal wakes it at once. A string beside an idle receive thread takes 0.90 of
the time that it would take if each call woke the thread, on all processors 0.73 (30 repetitions,
measured by hand).

What a thread that waits for signals takes in a minute in which none comes. kesbluetooth's looks
once a second whether a blocking call of the program itself has read a signal without waking it;
`stopLoop()` wakes it at once:

{grid(figures, "library", idle, [("wake-ups", "wake_ups", 1, ".0f"),
                                 ("ms of processor", "time", 1e3)])}
{threads(figures)}
## Listing devices

`Adapter::listDevices()` asks the daemon for its devices and, for each, the bus whether the daemon
is there; these questions are sent many at a time. Raw libdbus sends the same messages one by one.

{compared(figures, one, LISTS, LIBRARIES[:2], "devices")}
On all processors:

{compared(figures, every, LISTS, LIBRARIES[:2], "devices")}
What the bus daemon works for each list, in microseconds of processor time; no way of asking is
faster than that:

{table(["devices", "one processor", "all processors"], shares)}
One such question, by the number of names on the bus besides:

{compared(figures, one, CHECKS, LIBRARIES[:2], "names")}
## Decoding dictionaries

From a received message to all names and values as objects of the program; raw libdbus makes none.

{compared(figures, one, DECODING, quick, "entries")}
## Text form of dictionaries

{table(["entries", "time", "rate"], text)}
## Dispatch

One signal offered to as many subscriptions of its kind, all or none of which it is for.

{table(["subscriptions", "time", "each"], dispatch)}
{scanner(figures)}{processes(figures)}{before(figures)}## Versions

{table(["package", "version"], measured["versions"].items())}"""


# Of goals that have been missed: what stands in the way, measured by hand where a row cannot.
OBSTACLES = """What stands in the way where a goal is missed:

- Signals beside calls: in sdbus-c++ the loop thread sleeps on the socket beside the callers, and
  reads signals itself (strace); here one thread reads, the caller while it calls, and hands signals
  over, so that a reply wakes nobody else. On one processor with real-time priority, whoever is
  woken goes to the end of the queue: in three signals that were traced the receive thread waited 21
  to 35 microseconds for its turn. The receive thread leading always, waiting inside libdbus and
  `dbus_watch_handle` were tried, and cost the calls more than they gave the signals.
- Signals while nobody calls, and a call against sdbus-c++: raw libdbus is behind sdbus-c++
  in most of these rows too.
- A list of 100: the bus daemon is busy most of the time that a list takes (below), and has to
  answer each question; on all processors that alone is more than 0.3 of the time one by one.
  Letting the reader sleep between answers was tried once and gained nothing.
- `kesbt adapters`: it makes eight calls, one after the other, where `gdbus call` makes two; at 0.1 ms
  each on all processors that is most of what it takes longer.
- An answer with 1,000 known devices: the service works a third of that time (below); the rest is
  the client's, the bus's and the simulated daemon's.
- The scanner service's processor time: of an answer of 4,000 devices 11% is spent in this library
  (perf), the rest in libdbus (38%, nearly half of it checking UTF-8), in dbus-glib and GLib (16%), and in
  the C library for both; an answer has to go through dbus-glib.
"""

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
    """All repetitions: {(processors, case, library): {quantity: [[value of a round]]}}."""
    found = collections.defaultdict(lambda: collections.defaultdict(dict))
    for file in sorted(folder.glob("*.*.*.json")):
        processors, program, _, _ = file.name.split(".")
        for run in json.loads(file.read_text())["benchmarks"]:
            if run.get("run_type") == "aggregate":
                continue
            parts = [part for part in run["name"].split("/")
                     if part not in ("real_time", "manual_time")
                     and not part.startswith("iterations:")]
            library = BEFORE if program.endswith("-before") else parts[-1]
            values = found[processors, "/".join(parts[:-1]), library]
            # What happens inside one thread is measured in its processor time.
            waits = run["name"].endswith("_time")
            time = run["real_time" if waits else "cpu_time"] * SECONDS[run["time_unit"]]
            for name in ("time", *COUNTERS):
                if name == "time" or name in run:
                    values[name].setdefault(file, []).append(time if name == "time" else run[name])
    return found


def statistic(rounds):
    values = [value for one in rounds for value in one]
    result = {"median": statistics.median(values), "repetitions": len(values),
              "rounds": [statistics.median(one) for one in rounds]}
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
    facts = {"date": str(datetime.date.today()), "machine": machine(),
             "versions": {package: version(package) for package in PACKAGES},
             "times": "seconds"}
    rows = [{"processors": processors, "case": case, "library": library}
            | {name: statistic(list(rounds.values())) for name, rounds in quantities.items()}
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
