# SPDX-License-Identifier: Apache-2.0
"""The report folder: report.json, the errors per frame and vertex as arrays, and of a training the losses."""

import io
import json
import logging
import os
import platform
from pathlib import Path
from typing import Any, Callable

import numpy as np

from . import __version__
from .dataset import Dataset
from .files import LOCK, write_bytes
from .measure import Measured
from .state import History

ERROR_NAMES = ("report.json", "frames.npy", "frameErrors.npy", "vertices.npy", "vertexErrors.npy")
NAMES = (*ERROR_NAMES, "losses.csv", "loss.png")


def write_report(folder: Path, report: dict[str, Any], history: History, dataset: Dataset, errors: Measured,
                 say: Callable[[str], None]) -> None:
    write_errors(folder, report, dataset, errors)
    write_bytes(folder / "losses.csv", losses(history).encode())
    try:
        picture = drawn_losses(history)
    except OSError as error:  # matplotlib keeps a list of fonts in the user's home; no training is lost for that
        say(f"no loss.png, as matplotlib does not start ({error}): losses.csv has the numbers")
    else:
        write_bytes(folder / "loss.png", picture)


def write_errors(folder: Path, report: dict[str, Any], dataset: Dataset, errors: Measured) -> None:
    """report.json, and what the network leaves in mm, a mean and a largest distance each: of every measured frame
    beside its number, and of every vertex beside its index in the whole mesh."""
    write_bytes(folder / "report.json", (json.dumps(report, indent=1, allow_nan=False) + "\n").encode())
    vertices = [dataset.vertex(slot) for slot in range(dataset.delta_count)]
    for name, numbers, kind in (("frames", dataset.frames[errors.rows], "<i4"), ("frameErrors", errors.by_frame, "<f4"),
                                ("vertices", np.array(vertices), "<i4"), ("vertexErrors", errors.by_vertex, "<f4")):
        content = io.BytesIO()
        np.save(content, np.ascontiguousarray(numbers, kind))
        write_bytes(folder / f"{name}.npy", content.getvalue())


def versions() -> dict[str, str]:
    """Of what a model depends on."""
    import torch  # by whoever trains; evaluate does without

    return {"trainer": __version__, "python": platform.python_version(), "torch": str(torch.__version__),
            "numpy": np.__version__}


def sizes(model: Path) -> dict[str, int]:
    """Bytes of each file of a model directory, which may be locked while it is made."""
    return {path.name: path.stat().st_size for path in sorted(model.iterdir()) if path.name != LOCK}


def losses(history: History) -> str:
    """A line of names, and one for each epoch."""
    held = [str(loss) for loss in history.validation] or [""] * len(history.train)
    lines = [f"{epoch},{train},{other}" for epoch, (train, other) in enumerate(zip(history.train, held), 1)]
    return "\n".join(["epoch,training,validation", *lines]) + "\n"


def drawn_losses(history: History) -> bytes:
    """A PNG."""
    os.environ.setdefault("MPLBACKEND", "Agg")
    logging.getLogger("matplotlib.font_manager").setLevel(logging.ERROR)  # else the first use ever has lines of its own
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
    return picture.getvalue()
