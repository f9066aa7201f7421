# SPDX-License-Identifier: Apache-2.0
"""The report folder: report.json and loss.png."""

import io
import json
import os
from pathlib import Path
from typing import Any

from .files import write_bytes
from .training import History

NAMES = ("report.json", "loss.png")


def write_report(folder: Path, report: dict[str, Any], history: History) -> None:
    write_bytes(folder / "report.json", (json.dumps(report, indent=1, allow_nan=False) + "\n").encode())
    draw_losses(folder / "loss.png", history)


def draw_losses(path: Path, history: History) -> None:
    os.environ.setdefault("MPLBACKEND", "Agg")
    from matplotlib.backends.backend_agg import FigureCanvasAgg
    from matplotlib.figure import Figure
    from matplotlib.ticker import MaxNLocator

    figure = Figure(figsize=(8, 5), layout="constrained")
    FigureCanvasAgg(figure)
    axes = figure.add_subplot()
    epochs = range(1, len(history.train) + 1)
    marker = "." if len(history.train) < 20 else None
    axes.plot(epochs, history.train, label="training", marker=marker)
    if history.validation:
        axes.plot(epochs, history.validation, label="validation", marker=marker)
    axes.axvline(history.best_epoch, color="grey", linestyle=":", label=f"best: epoch {history.best_epoch}")
    axes.set(xlabel="epoch", ylabel="mean squared error (1 = the outputs' own)", yscale="log")
    axes.xaxis.set_major_locator(MaxNLocator(integer=True))
    axes.grid(True, which="both", alpha=0.3)
    axes.legend()
    picture = io.BytesIO()
    figure.savefig(picture, dpi=100)
    write_bytes(path, picture.getvalue())
