# SPDX-License-Identifier: Apache-2.0
"""What keeps a model from being better: its shapes, its network or its poses; and what a straight line would do."""

from typing import Any, Callable, Optional

import numpy as np

from .dataset import Dataset
from .measure import measure

# what shapes miss and what the network misses in their span are at right angles: here both are alike
AT_THE_BASIS = 2**0.5
NEW_POSES = 1.5        # times the error on poses that it was trained on: beyond, it knows these and not the others
LOOKED_AT = 300        # rows that were trained on, at most, spread over all


def on_trained_rows(dataset: Dataset, rows: np.ndarray,
                    deltas_of: Callable[[np.ndarray], np.ndarray]) -> dict[str, Any]:
    """What the network leaves on rows that it was trained on: their number, and the mean."""
    some = rows[::max(1, len(rows) // LOOKED_AT)]
    return {"frames": len(some), "mean": measure(dataset, some, deltas_of)["network"]["mean"]}


def of_line(dataset: Dataset, rows: np.ndarray, deltas_of: Callable[[np.ndarray], np.ndarray]) -> dict[str, Any]:
    """What the best straight line from the controls leaves."""
    left = measure(dataset, rows, deltas_of)["network"]
    return {name: left[name] for name in ("mean", "p99", "p9999", "max")}


def limit(errors: dict[str, Any], trained: dict[str, Any], held_out: bool) -> Optional[str]:
    """Which one it is: "shapes", "poses" or "network"; None where nothing is left, or nothing was held out."""
    left = errors["network"]["mean"]["mm"]
    if left <= 0 or not held_out:
        return None
    if errors["basis"] is not None and left <= AT_THE_BASIS * errors["basis"]["mean"]["mm"]:
        return "shapes"
    return "poses" if left > NEW_POSES * trained["mean"]["mm"] else "network"


def sentences(report: dict[str, Any]) -> list[str]:
    """Of the report of a training, for the user."""
    line, trained, errors = report["line"], report["trainedRows"], report["errors"]
    said = [f"the best straight line from controls to deltas leaves {line['mean']['mm']:.4g} mm in the mean, "
            f"{line['p9999']['mm']:.4g} mm at p99.99"]
    left = errors["network"]["mean"]["mm"]
    on_trained = f"{trained['mean']['mm']:.4g} mm on poses that it was trained on, {left:.4g} mm on others"
    settings = report["settings"]
    whys = {
        "shapes": f"the shapes are the limit: with an accuracy of {settings['principalShapesAccuracy']:g} and at most "
                  f"{settings['principalShapesLimit']} of them they hold {percent(report['explained'])} of the deltas, "
                  "and the network leaves little more than the best that they could do; a higher --principal-accuracy "
                  "or --principal-limit would leave less",
        "poses": f"the poses are the limit: the network leaves {on_trained}; more poses would leave less",
        "network": f"the network is the limit: it leaves {on_trained}; more --neurons or --epochs would leave less"}
    return said + ([whys[report["limit"]]] if report["limit"] else [])


def percent(part: Optional[float]) -> str:
    return "all" if part is None else f"{100 * part:.6g} %"
