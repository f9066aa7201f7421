# SPDX-License-Identifier: Apache-2.0
"""Runs the benchmarks that docs/performance.md quotes, and writes its table anew.

usage: performance_page.py PROGRAMS PAGE
    PROGRAMS  the folder of the built benchmarks
    PAGE      the page; what stands between its two marks is replaced
"""

import csv
import datetime
import os
import pathlib
import platform
import subprocess
import sys
import tempfile
from typing import Dict, List, NamedTuple, Optional, Tuple

BEGIN, END = "<!-- measured: begin -->", "<!-- measured: end -->"
HEADS = ("kind", "phase", "vertices", "scene")  # how the first column of a program's rows is called

Row = Dict[str, str]
Rows = List[Row]


class Line(NamedTuple):
    """A line of the table: where its number comes from, and what was asked of it."""

    what: str
    run: str  # one of RUNS
    where: Row
    column: str
    asked: Optional[float] = None
    before: Optional[str] = None  # measured once, on the code before; where that still runs, the program measures it
    form: str = "{:.2f}"
    factor: float = 1.0


RUNS: Dict[str, List[str]] = {
    "plain": ["bench_deform", "--only", "plain", "--seconds", "1"],
    "frames": ["bench_deform", "--only", "frames", "--quick", "--seconds", "1"],
    "many": ["bench_deform", "--only", "many", "--seconds", "2"],
    "product": ["bench_deform", "--only", "product"],
    "smoothing": ["bench_quill", "--only", "frame smoothing", "--seconds", "1"],
    "order": ["bench_quill", "--only", "frame order", "--seconds", "1"],
    "transport": ["bench_quill", "--only", "frame transport", "--seconds", "1"],
    "core": ["bench_model", "--only", "second core", "--seconds", "2"],
    "opening": ["bench_model", "--only", "open shapes", "--seconds", "2"],
    "halves": ["bench_model", "--only", "sum shapes", "--seconds", "2"],
    "device": ["bench_gpu", "--only", "fixed cost"],
}

# Of plain, on the code before frames had tables of their own: (vertices, mode, model, threads, state).
BEFORE: Dict[Tuple[str, str, str, str, str], str] = {
    ("10000", "Surface", "S=50", "1", "hot"): "0.50-0.54",
    ("10000", "Surface", "S=50", "1", "paused"): "0.71-0.76",
    ("10000", "Surface", "S=50", "2", "hot"): "0.50-0.54",
    ("10000", "Surface", "S=50", "2", "paused"): "0.71-0.76",
    ("99856", "Surface", "S=50", "1", "hot"): "0.69-0.75",
    ("99856", "Surface", "S=50", "1", "paused"): "0.67-0.76",
    ("99856", "Surface", "S=50", "2", "hot"): "0.67-0.69",
    ("99856", "Surface", "S=50", "2", "paused"): "0.69-0.70",
    ("99856", "Offset", "S=50", "1", "hot"): "0.68-0.84",
    ("99856", "Offset", "S=50", "1", "paused"): "0.76-0.80",
    ("99856", "Offset", "S=50", "2", "hot"): "0.81-0.88",
    ("99856", "Offset", "S=50", "2", "paused"): "0.78-0.86",
    ("1000000", "Surface", "S=50", "1", "hot"): "0.56-0.59",
    ("1000000", "Surface", "S=50", "1", "paused"): "0.51-0.54",
    ("1000000", "Surface", "S=50", "2", "hot"): "0.44",
    ("1000000", "Surface", "S=50", "2", "paused"): "0.43-0.45",
}


def thousands(count: str) -> str:
    return {"2500": "2.5 k", "10000": "10 k", "99856": "100 k", "1000000": "1 M"}.get(count, count)


def whole_frames() -> List[Line]:
    lines = []
    for vertices, mode, model, threads, state in BEFORE:
        asked = 0.65 if vertices == "1000000" else 0.6 if state == "paused" else 0.55 if threads == "1" else 0.5
        where = {"vertices": vertices, "mode": mode, "model": model, "threads": threads, "state": state}
        lines.append(Line(f"whole frame / plain, {thousands(vertices)}, {mode}, {model}, {threads} thr, {state}",
                          "plain", where, "ratio", asked if mode == "Surface" else None,
                          BEFORE[vertices, mode, model, threads, state]))
    for vertices in ("10000", "99856"):
        for threads in ("1", "2"):
            for state in ("hot", "paused"):
                lines.append(Line(f"whole frame / plain, {thousands(vertices)}, direct 2x512, {threads} thr, {state}",
                                  "plain", {"vertices": vertices, "model": "direct 2x512", "threads": threads,
                                            "state": state}, "ratio"))
    for threads in ("1", "2"):
        for state in ("hot", "paused"):
            lines.append(Line(f"p99 / median of our frames, 100 k, Surface, {threads} thr, {state}", "plain",
                              {"vertices": "99856", "mode": "Surface", "model": "S=50", "threads": threads,
                               "state": state}, "p99_over_median", 1.5))
    return lines


def parts() -> List[Line]:
    lines = []
    for threads in ("1", "2"):
        for vertices, limit in (("10000", 0.55 if threads == "2" else 0.5),
                                ("99856", 0.55 if threads == "2" else 0.5), ("1000000", 0.48)):
            lines.append(Line(f"smoothing / plain, {thousands(vertices)}, {threads} thr, hot", "smoothing",
                              {"mesh": "grid", "vertices": vertices, "threads": threads}, "ratio_to_plain_loop", limit))
        for vertices in ("10000", "99856"):
            lines.append(Line(f"smoothing of shuffled vertices / of ordered, {thousands(vertices)}, {threads} thr, "
                              "hot", "order", {"vertices": vertices, "threads": threads}, "ratio_to_plain_loop", 1.15,
                              "1.39"))
            lines.append(Line(f"frames and transport / before, {thousands(vertices)}, {threads} thr, hot", "transport",
                              {"mesh": "grid", "vertices": vertices, "threads": threads}, "ratio_to_plain_loop", 0.4,
                              "1"))
        for shapes in ("50", "100"):
            lines.append(Line(f"product / reading its bytes, 100 k, S={shapes}, {threads} thr", "product",
                              {"phase": f"product S={shapes}", "vertices": "100000", "threads": threads},
                              "ratio_to_plain_loop", 1.1))
    lines.append(Line("sum of half shapes / of whole ones, 100 k, S=50", "halves", {}, "ratio_to_plain_loop", 0.6))
    return lines


def around_frames() -> List[Line]:
    lines = []
    for weights, limit in (("2", 1.05), ("14", 1.05), ("20", 1.3), ("60", 1.3)):
        lines.append(Line(f"loop after a network's run / alone, {weights} MB of weights, 2 thr", "core",
                          {"weights_mb": weights, "entry": "yes" if limit < 1.1 else "no"}, "ratio", limit,
                          "1.99-2.00"))
    for threads in ("1", "2"):
        small = {"vertices": "1024", "threads": threads}
        lines.append(Line(f"what the host adds to a frame, 1 k, {threads} thr, paused, us", "frames", small, "rest_us",
                          8.0, None, "{:.1f}"))
    for vertices in ("2500", "10000"):
        where = {"kind": "many", "vertices": vertices}
        lines.append(Line(f"frame of each of 64 characters / as many of one, {thousands(vertices)}, 1 thr", "many",
                          where, "ratio", 1 / 0.95))
        lines.append(Line(f"memory of each further of 64 characters, {thousands(vertices)}, MB", "many", where,
                          "further_mb"))
    lines.append(Line("opening shapes, 100 k, S=50, s", "opening", {"phase": "open shapes"}, "ns_per_vertex_median",
                      0.4, "0.79", "{:.3f}", 3 * 50 * 100000 * 1e-9))
    for passes, before in (("0", "115"), ("10", "129")):
        lines.append(Line(f"frame on PoCL beyond its kernels, {passes} passes, in a row, us", "device",
                          {"row": "fixed cost in a row", "smoothing": passes}, "median", 80.0, before, "{:.0f}", 1.0))
    return lines


def rows_of(path: pathlib.Path) -> Rows:
    """All rows of a program, each under the head that came last before it."""
    rows: Rows = []
    head: List[str] = []
    with path.open(encoding="utf-8", newline="") as file:
        for cells in csv.reader(file):
            if cells and cells[0] in HEADS:
                head = cells
            else:
                rows.append(dict(zip(head, cells)))
    return rows


def run_all(programs: pathlib.Path) -> Dict[str, Rows]:
    measured = {}
    with tempfile.TemporaryDirectory() as folder:
        for name, (program, *arguments) in RUNS.items():
            print(f"== {program} {' '.join(arguments)}", flush=True)
            subprocess.run([programs / program, *arguments, "--csv", folder], check=True)
            measured[name] = rows_of(pathlib.Path(folder) / f"{program}.csv")
    return measured


def found(rows: Rows, line: Line) -> float:
    for row in rows:
        if all(row.get(column) == value for column, value in line.where.items()) and line.column in row:
            return float(row[line.column]) * line.factor
    raise LookupError(f"no row of {' '.join(RUNS[line.run])} has {line.where} and {line.column}")


def table(measured: Dict[str, Rows]) -> str:
    text = ["| what | before | asked | measured | |", "|---|---|---|---|---|"]
    for line in whole_frames() + parts() + around_frames():
        value = found(measured[line.run], line)
        asked = "" if line.asked is None else line.form.format(line.asked)
        missed = "missed" if line.asked is not None and value > line.asked else ""
        text.append(f"| {line.what} | {line.before or ''} | {asked} | {line.form.format(value)} | {missed} |")
    return "\n".join(text)


def processor() -> str:
    for text in pathlib.Path("/proc/cpuinfo").read_text(encoding="utf-8").splitlines():
        if text.startswith("model name"):
            return text.split(":", 1)[1].strip()
    return platform.machine()


def main(programs: str, page: str) -> None:
    path = pathlib.Path(page)
    text = path.read_text(encoding="utf-8")
    if text.count(BEGIN) != 1 or text.count(END) != 1 or text.index(BEGIN) > text.index(END):
        sys.exit(f"performance_page: {page} does not hold {BEGIN} and then {END}, once each")
    measured = table(run_all(pathlib.Path(programs)))
    cores = len(os.sched_getaffinity(0))
    said = f"Measured on {datetime.date.today()}, {processor()}, {cores} cores.\n\n{measured}\n"
    path.write_text(f"{text[:text.index(BEGIN)]}{BEGIN}\n{said}{text[text.index(END):]}", encoding="utf-8")
    print(f"{page} is written")


if __name__ == "__main__":
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    main(*sys.argv[1:])
