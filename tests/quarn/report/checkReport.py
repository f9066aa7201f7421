# SPDX-License-Identifier: Apache-2.0
"""checkReport.py make FOLDER | check FOLDER REPORT NAME TITLE: the target of the test's scene; and whether a report
says what the files say, by other arithmetic, and is a page that a foreign parser takes."""

import array
import json
import math
import re
import struct
import sys
from html.parser import HTMLParser
from pathlib import Path
from xml.etree import ElementTree

VOID = {"meta", "img", "br", "link"}


def read(path: Path) -> list[list[float]]:
    """Of an .npy <f4 [frames, vertices, 3]: a list of numbers a frame."""
    content = path.read_bytes()
    begin = 10 + struct.unpack("<H", content[8:10])[0]
    numbers = array.array("f", content[begin:])
    frames = int(re.search(rb"\((\d+),", content[:begin]).group(1))  # type: ignore[union-attr]
    size = len(numbers) // frames
    return [list(numbers[i * size:(i + 1) * size]) for i in range(frames)]


def make(folder: Path) -> None:
    """Four fifths of the way from the skin to what the deformer makes of it: a quarter of the distance is left."""
    skin, mesh = read(folder / "strip.npy"), read(folder / "wave.npy")
    head = (folder / "strip.npy").read_bytes()
    head = head[:10 + struct.unpack("<H", head[8:10])[0]]
    points = [0.2 * a + 0.8 * b for one, other in zip(skin, mesh) for a, b in zip(one, other)]
    (folder / "target.npy").write_bytes(head + array.array("f", points).tobytes())


def distances(one: list[list[float]], other: list[list[float]]) -> list[list[float]]:
    """mm; a unit of the scene is a metre."""
    return [[1000 * math.dist(a[i:i + 3], b[i:i + 3]) for i in range(0, len(a), 3)] for a, b in zip(one, other)]


def near(found: float, wanted: float, what: str, above: float = 1e-9) -> None:
    """`above`: how much more, in parts of it, may be found."""
    if not wanted * (1 - 1e-9) - 2e-6 <= found <= wanted * (1 + above) + 2e-6:
        sys.exit(f"{what} is {found}, not {wanted}")


def check_stage(stage: dict, lists: dict, errors: list[list[float]], diagonal: float) -> None:
    flat = sorted(value for frame in errors for value in frame)
    near(stage["mean_mm"], sum(flat) / len(flat), "mean")
    near(stage["max_mm"], flat[-1], "max")
    near(stage["max_percent"], 100 * flat[-1] / diagonal, "max in %")
    for name, part in (("p99", 0.99), ("p9999", 0.9999)):
        near(stage[f"{name}_mm"], flat[math.ceil(part * len(flat)) - 1], name, 1 / 1024)
    worst = errors[stage["worst"]["frame"] - 1][stage["worst"]["vertex"]]
    near(worst, flat[-1], "the worst vertex's")
    if stage["worst"]["joint"] != ("left", "right")[stage["worst"]["vertex"] % 2]:
        sys.exit(f"the worst vertex is not at {stage['worst']['joint']}")
    for rows, key in ((errors, "frameErrors"), ([list(vertex) for vertex in zip(*errors)], "vertexErrors")):
        for number, row in enumerate(rows):
            near(lists[key]["mean_mm"][number], sum(row) / len(row), f"{key} mean {number}")
            near(lists[key]["max_mm"][number], max(row), f"{key} max {number}")


class Page(HTMLParser):
    """Elements have to close in order; what they are called and have is kept."""

    def __init__(self) -> None:
        super().__init__()
        self.open: list[str] = []
        self.seen: list[tuple[str, dict]] = []
        self.texts: list[str] = []

    def handle_starttag(self, tag: str, attributes: list) -> None:
        self.seen.append((tag, dict(attributes)))
        if tag not in VOID:
            self.open.append(tag)

    def handle_endtag(self, tag: str) -> None:
        if not self.open or self.open.pop() != tag:
            sys.exit(f"</{tag}> closes what is not open, line {self.getpos()[0]}")

    def handle_data(self, data: str) -> None:
        self.texts.append(data)


def check_page(text: str, name: str, title: str) -> None:
    page = Page()
    page.feed(text)
    page.close()
    tags = [tag for tag, _ in page.seen]
    if page.open or "script" in tags or "b" in tags or "link" in tags:
        sys.exit(f"the page is left open at {page.open}, or has elements of the name")
    text_of_all = "".join(page.texts)
    if page.texts.count(title) != 2 or name not in text_of_all or text_of_all.count("There is no page") != 1:
        sys.exit("the page does not say names as they are, or why there is no viewer")
    if (tags.count("svg"), tags.count("img")) != (4, 2):
        sys.exit("there are not four charts and two pictures")
    for tag, attributes in page.seen:
        for key in ("src", "href"):
            if key in attributes and not attributes[key].startswith("data:image/png;base64,iVBORw0KGgo"):
                sys.exit(f"<{tag}> asks for {attributes[key][:60]}")
    for svg in re.findall(r"<svg.*?</svg>", text, re.S):
        ElementTree.fromstring(svg)


def check(folder: Path, report: Path, name: str, title: str) -> None:
    said = json.loads((report / "report.json").read_text())
    row, = said["rows"]
    skin, mesh, target = (read(folder / f"{what}.npy") for what in ("strip", "wave", "target"))
    for stage, side, points in (("skin", "before", skin), ("network", "after", mesh)):
        lists = {key: row[key][side] for key in ("frameErrors", "vertexErrors")}
        check_stage(row[stage], lists, distances(points, target), row["diagonal_mm"])
        if sum(row["histogram"][side]) != len(target) * len(target[0]) // 3:
            sys.exit(f"the histogram of {side} has not all distances")
    played = json.loads((folder / "played.json").read_text())
    for key, stage in (("before", "skin"), ("distance", "network")):
        near(row[stage]["p9999_mm"], played[key]["mm"]["p99.99"], "quarn play's p99.99")
        near(row["jitter_mm"][stage], played[key]["jitterMm"], "quarn play's jitter")
    left = [[a - b for a, b in zip(one, other)] for one, other in zip(mesh, target)]
    second = [[c - 2 * b + a for a, b, c in zip(*left[i:i + 3])] for i in range(len(left) - 2)]
    lengths = [length for frame in distances(second, [[0.0] * len(left[0])] * len(second)) for length in frame]
    near(row["errorJitter_mm"]["network"]["mean"], sum(lengths) / len(lengths), "jitter of the error", 1e-5)
    near(row["errorJitter_mm"]["network"]["max"], max(lengths), "largest jitter of the error", 1e-5)
    facts = {key: said[key] for key in ("format", "version", "title", "isMotion", "kept")}
    if facts != {"format": "neuralWarp report", "version": 2, "title": title, "isMotion": True, "kept": False}:
        sys.exit(f"the report says of itself {facts}")
    if [row["limits"][what]["kept"] for what in ("mean", "max")] != [True, False] or row["base"] is not None:
        sys.exit(f"limits: {row['limits']}")
    if (row["epochs"], row["training"]["seed"], row["training"]["settings"]) != (3, 7, {"neurons": "32"}):
        sys.exit(f"training: {row['training']}")
    model = folder / "models" / "wave.nwrp"
    if row["model"]["files"] != {path.name: path.stat().st_size for path in model.iterdir()}:
        sys.exit(f"the model's files are {row['model']['files']}")
    check_page((report / "report.html").read_text(), name, title)


if __name__ == "__main__":
    if sys.argv[1] == "make":
        make(Path(sys.argv[2]))
    else:
        check(Path(sys.argv[2]), Path(sys.argv[3]), sys.argv[4], sys.argv[5])
