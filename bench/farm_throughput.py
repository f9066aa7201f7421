#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Measures what a farm's night is made of, with the real quarn and the demo's hand, and plans past this machine.

usage: farm_throughput.py QUARN FOLDER [--frames N] [--parts P] [--repeat R]
    QUARN   the built application
    FOLDER  a new one, for scenes and data sets, some 60 bytes a vertex and frame

Measured, each as the median of R: start-up of a task, frames a second of one core in an export, bytes a frame, and what
`quarn merge` takes of P parts. Seconds are of the processor unless they are called wall: other people's work on a
shared machine does not count. Then a table for 10, 100 and 1000 nodes by the formula of docs/farm.md.
"""

import argparse
import json
import math
import os
import statistics
import subprocess
import sys
import time
from pathlib import Path
from typing import List, NamedTuple

ROOT = Path(__file__).resolve().parents[1]
VERTICES = 1159  # of the hand


class Cost(NamedTuple):
    wall: float
    processor: float


class Job(NamedTuple):
    """What is to be made of F frames: seconds of a core a frame, and bytes a frame that are merged."""
    name: str
    frames: int
    seconds: float
    bytes: float


class Farm(NamedTuple):
    """What the machines and the programs give."""
    start: float          # seconds of a task before its first frame
    merge_start: float    # seconds of a merge beside its bytes
    merge_rate: float     # bytes a second
    longest: float = 1200  # seconds of a task, as planned, where there is more to do than room
    shortest: float = 60   # and where there is less
    wait: float = 30      # seconds until the scheduler has begun with the first tasks, and with the merge


def cost_of(words: List[str]) -> Cost:
    begin = time.monotonic()
    process = subprocess.Popen(words, stdout=subprocess.DEVNULL)
    _, status, usage = os.wait4(process.pid, 0)
    process.returncode = os.waitstatus_to_exitcode(status)
    if process.returncode:
        sys.exit(f"{' '.join(words)} ended with {process.returncode}")
    return Cost(time.monotonic() - begin, usage.ru_utime + usage.ru_stime)


def median(costs: List[Cost]) -> Cost:
    return Cost(*(statistics.median(column) for column in zip(*costs)))


def spans(frames: int, parts: int) -> List[str]:
    edges = [frames * part // parts for part in range(parts + 1)]
    return [f"{first + 1}-{last}" for first, last in zip(edges, edges[1:])]


def wall_seconds(job: Job, farm: Farm, slots: int) -> float:
    """Of a whole job where so many tasks run at once: the formula of docs/farm.md. Tasks are as short as fills all
    places, within limits."""
    length = min(max(job.frames * job.seconds / slots, farm.shortest), farm.longest)
    tasks = max(1, min(job.frames, math.ceil(job.frames * job.seconds / length)))
    making = math.ceil(tasks / slots) * (farm.start + math.ceil(job.frames / tasks) * job.seconds)
    return farm.wait + making + farm.wait + farm.merge_start + job.frames * job.bytes / farm.merge_rate


class Bench:
    def __init__(self, options: argparse.Namespace) -> None:
        self.options, self.quarn = options, str(options.quarn.resolve())
        self.folder: Path = options.folder
        self.made = 0

    def prepare(self) -> None:
        hand = ROOT / "examples" / "hand"
        character = ROOT / "build" / "deps" / "hand" / "left.glb"
        self.folder.mkdir(parents=True)
        self.call("import", str(character), "-o", self.at("hand.json"), "--parents", str(hand / "parents.json"),
                  "--limits", str(hand / "limits.json"), "--neural-warp", "-q")
        poses, skin = self.at("poses.json"), self.at("skin.npy")
        self.call("pose", self.at("hand.json"), "-o", poses, "--samples", str(self.options.frames), "-q")
        self.call("play", poses, "--no-model", "-o", skin, "-q")
        self.call("target", poses, "--cache", skin, "-o", self.at("targets.json"), "-q")

    def at(self, name: str) -> str:
        return str(self.folder / name)

    def call(self, *words: str) -> Cost:
        return cost_of([self.quarn, *words])

    def export(self, frames: str, folder: str) -> Cost:
        return self.call("export", self.at("targets.json"), "-o", folder, "--frames", frames, "--of",
                         f"1-{self.options.frames}", "--threads", "1", "-q")

    def fresh(self, name: str) -> str:
        self.made += 1
        return self.at(f"{name}.{self.made}")

    def measured(self) -> List[str]:
        """The lines that are said, and then the table."""
        frames, repeat = self.options.frames, range(self.options.repeat)
        one = median([self.export("1-1", self.fresh("one")) for _ in repeat])
        whole = [self.fresh("whole") for _ in repeat]
        all_of_it = median([self.export(f"1-{frames}", folder) for folder in whole])
        frame = (all_of_it.processor - one.processor) / (frames - 1)
        size = sum(file.stat().st_size for file in Path(whole[0]).iterdir())
        parts = [self.fresh("part") for _ in range(self.options.parts)]
        for span, part in zip(spans(frames, len(parts)), parts):
            self.export(span, part)
        merged = [self.fresh("merged") for _ in repeat]
        merge = median([self.call("merge", *parts, "-o", folder, "-q") for folder in merged])
        self.require_same(Path(whole[0]), Path(merged[0]))
        small = median([self.call("merge", *self.small_parts(number), "-o", self.fresh("small"), "-q")
                        for number in repeat])
        rate = (size / (merge.processor - small.processor)) if merge.processor > small.processor else math.inf
        farm = Farm(one.processor, small.processor, rate)
        return [
            f"start-up of an export   {one.processor:.3f} s ({one.wall:.3f} s wall)",
            f"frames of an export     {1 / frame:.0f} a second of a core ({VERTICES} vertices)",
            f"bytes of a frame        {size / frames:.0f} ({size / frames / VERTICES:.1f} a vertex)",
            f"merge of {len(parts)} parts        {merge.processor:.3f} s ({merge.wall:.3f} s wall) for "
            f"{size / 1e6:.1f} MB",
            f"start-up of a merge     {small.processor:.3f} s",
            f"rate of a merge         {rate / 1e6:.0f} MB/s of a core, from files in memory",
            "", *table(farm, [Job("export of the hand", 15_000, frame, size / frames),
                              Job("targets of the hand, 5 s a pose", 15_000, 5, 12 * VERTICES),
                              Job("targets of 60 k vertices, 60 s", 15_000, 60, 12 * 60_000),
                              Job("export of 60 k vertices", 15_000, frame * 60_000 / VERTICES,
                                  size / frames / VERTICES * 60_000)])]

    def small_parts(self, number: int) -> List[str]:
        """Two parts of two frames of a whole of four."""
        made = [self.at(f"small.{number}.{side}") for side in (1, 2)]
        for span, folder in zip(("1-2", "3-4"), made):
            self.call("export", self.at("targets.json"), "-o", folder, "--frames", span, "--of", "1-4", "-q")
        return made

    @staticmethod
    def require_same(whole: Path, merged: Path) -> None:
        for file in whole.glob("*.npy"):
            if file.read_bytes() != (merged / file.name).read_bytes():
                sys.exit(f"{merged / file.name} is not {file}: what is measured would be no merge")


def table(farm: Farm, jobs: List[Job]) -> List[str]:
    cores = 16
    nodes = (1, 10, 100, 1000)
    lines = [f"15,000 poses, {cores} tasks at once on a node, of {farm.shortest / 60:.0f} to {farm.longest / 60:.0f} "
             "min; wall time:",
             f"{'':34}" + "".join(f"{count:>6} node{'s' if count > 1 else ' '}" for count in nodes) + "   merge alone"]
    for job in jobs:
        walls = "".join(f"{clock(wall_seconds(job, farm, cores * count)):>12}" for count in nodes)
        lines.append(f"{job.name:34}{walls}{clock(farm.merge_start + job.frames * job.bytes / farm.merge_rate):>14}")
    return lines


def clock(seconds: float) -> str:
    if seconds < 600:
        return f"{seconds:.0f} s"
    return f"{seconds / 60:.0f} min" if seconds < 2 * 3600 else f"{seconds / 3600:.1f} h"


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("quarn", type=Path)
    parser.add_argument("folder", type=Path)
    parser.add_argument("--frames", type=int, default=2000)
    parser.add_argument("--parts", type=int, default=8)
    parser.add_argument("--repeat", type=int, default=3)
    bench = Bench(parser.parse_args())
    bench.prepare()
    build = json.loads(subprocess.run([bench.quarn, "info", "--build", "--json"], check=True,
                                      stdout=subprocess.PIPE).stdout)
    print(f"quarn {build['version']} ({build['build']}, {build['instructionSet']}) on {os.cpu_count()} cores")
    print("\n".join(bench.measured()))


if __name__ == "__main__":
    main()
