#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""What a call of the Python module costs beside the call in C++ that it makes, on the same objects and arrays.

usage: python_calls.py BUILD
    BUILD   the build folder; bench_python_calls has been built in it

The two are measured in turn, a round of some milliseconds each; figures are medians over the rounds.
"""

import statistics
import sys
import tempfile
import time
from pathlib import Path
from typing import Any, Callable

import numpy as np

BUILD = Path(sys.argv[1]).resolve()
sys.path[:0] = [str(BUILD / "clients" / "python"), str(BUILD / "bench")]

import neuralwarp  # noqa: E402
import bench_python_calls  # noqa: E402

COLUMNS, ROWS, CONTROLS, CHARACTERS, ROUNDS = 40, 25, 24, 64, 60
N = COLUMNS * ROWS


def grid() -> tuple[np.ndarray, np.ndarray]:
    v, u = np.mgrid[0:ROWS, 0:COLUMNS].astype(np.float32)
    points = np.stack([u, v, np.sin(u) * np.cos(v)], axis=2).reshape(N, 3)
    corner = (np.arange(ROWS - 1)[:, None] * COLUMNS + np.arange(COLUMNS - 1)).ravel()
    return points, np.stack([corner, corner + 1, corner + 1 + COLUMNS, corner + COLUMNS], axis=1)


def seconds_of(call: Callable[[], Any], count: int) -> float:
    begin = time.perf_counter()
    for _ in range(count):
        call()
    return time.perf_counter() - begin


def compared(plain: Callable[[int], float], ours: Callable[[], Any], count: int) -> tuple[float, float, float, float]:
    """Medians of seconds a call: in C++, by the module, their difference and the ratio C++ / module."""
    plain(count), seconds_of(ours, count)
    pairs = [(plain(count) / count, seconds_of(ours, count) / count) for _ in range(ROUNDS)]
    return (statistics.median(a for a, _ in pairs), statistics.median(b for _, b in pairs),
            statistics.median(b - a for a, b in pairs), statistics.median(a / b for a, b in pairs))


def main() -> None:
    points, faces = grid()
    random = np.random.default_rng(1)
    with tempfile.TemporaryDirectory() as folder:
        bench_python_calls.write_model(f"{folder}/grid.nwrp", N)
        model = neuralwarp.Model.load(f"{folder}/grid.nwrp")
        deformers = [neuralwarp.Deformer(model, faces, points) for _ in range(CHARACTERS)]
        rows = [points.copy() for _ in deformers]
        controls = [random.uniform(-1, 1, CONTROLS).astype(np.float32) for _ in deformers]
        out = [np.empty_like(points) for _ in deformers]

        def single(count: int) -> float:
            return bench_python_calls.seconds_of(deformers[:1], rows[:1], controls[:1], out[:1], count)

        def many(count: int) -> float:
            return bench_python_calls.seconds_of(deformers, rows, controls, out, count)

        one = deformers[0]
        print(f"{N} vertices, {CONTROLS} controls                C++      module  difference   C++/module")
        for name, plain, ours, count in (
                ("evaluate(..., out)", single, lambda: one.evaluate(rows[0], controls[0], out[0]), 50),
                ("evaluate(...)", single, lambda: one.evaluate(rows[0], controls[0]), 50),
                (f"evaluate_characters, {CHARACTERS}", many,
                 lambda: neuralwarp.evaluate_characters(deformers, rows, controls, out), 2)):
            a, b, difference, ratio = compared(plain, ours, count)
            print(f"{name:28} {a * 1e6:9.1f} us {b * 1e6:9.1f} us {difference * 1e6:7.2f} us {ratio:9.3f}")


if __name__ == "__main__":
    main()
