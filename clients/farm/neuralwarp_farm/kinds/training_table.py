# SPDX-License-Identifier: Apache-2.0
"""The table at the end of a sweep: every model with its error on frames that were held out, best first."""

import json
from pathlib import Path
from typing import Any, NamedTuple, Optional

from .. import codes
from ..errors import FarmError
from ..plan import Plan, Task, write_whole
from ..results import is_done

JSON, TEXT = "table.json", "table.txt"
DIFFERENT_ROWS = "the seeds hold out different frames: --validation-set compares all models on the same ones"
HEADS = ("model", "skin", "mean", "p99.99", "max", "epochs", "seconds", "MB", "")


class Row(NamedTuple):
    """A model, in mm: the skin's mean, the network's mean, 99.99th percentile and maximum."""
    name: str
    measured: str                # the data set that errors are of: only those of the same can be compared
    skin: Optional[float]
    mean: float
    p9999: float
    largest: float
    seed: int
    epochs: int                  # until the best one
    seconds: float
    size: int                    # of the model, in bytes
    own_rows: bool               # held out of the data set itself, by the seed
    held_out: bool               # otherwise they are of rows that were trained on
    is_best: bool = False        # of those that can be compared


def show(plan: Plan, is_to_be_written: bool) -> int:
    """Says what is there; a table that is written has all. Returns the status."""
    rows, missing = rows_of(plan)
    print(text_of(rows), end="", flush=True)
    if missing:
        raise FarmError(f"{len(missing)} of {len(rows) + len(missing)} models are not there: {', '.join(missing[:5])}")
    if is_to_be_written:
        write_whole(plan.folder / JSON, json.dumps({"format": "neuralWarp training table", "version": 1, "unit": "mm",
                                                    "models": [entry_of(row) for row in rows]}, indent=1) + "\n")
        write_whole(plan.folder / TEXT, text_of(rows))
    return codes.DONE


def rows_of(plan: Plan) -> tuple[list[Row], list[str]]:
    """Rows, best first, of those that are there; and the names of those that are not."""
    rows: list[Row] = []
    missing: list[str] = []
    for task in plan.tasks:
        if task.result.kind == "model":
            report = plan.absolute(task.result.path).with_suffix(".report") / "report.json"
            if not is_done(plan, task):
                missing.append(task.id)
            elif report.is_file():
                rows.append(row_of(task, report))
            else:  # killed between the two
                raise FarmError(f"{plan.absolute(task.result.path)} has no report: remove it, and submit again")
    rows.sort(key=lambda row: (row.measured, row.mean))
    firsts = [before is None or before.measured != row.measured for before, row in zip([None, *rows], rows)]
    return [row._replace(is_best=is_first) for row, is_first in zip(rows, firsts)], missing


def measured_on(task: Task) -> str:
    """The data set whose rows a training was measured on."""
    words = list(task.command)
    return words[words.index("--validation-set") + 1] if "--validation-set" in words else words[2]


def row_of(task: Task, path: Path) -> Row:
    try:
        report: dict[str, Any] = json.loads(path.read_bytes())
        errors = report["errors"]
        network = errors["network"]
        return Row(task.id, measured_on(task),
                   errors["skin"]["mean"]["mm"] if errors["skin"] else None, network["mean"]["mm"],
                   network["p9999"]["mm"], network["max"]["mm"], report["seed"], report["bestEpoch"], report["seconds"],
                   sum(report["sizes"].values()), not report["split"]["validationSet"], bool(report["heldOut"]))
    except (ValueError, KeyError, TypeError, AttributeError):
        raise FarmError(f"{path} is no report of a training that can be read") from None


def entry_of(row: Row) -> dict[str, Any]:
    return {"name": row.name, "measuredOn": row.measured, "skin": row.skin, "mean": row.mean, "p9999": row.p9999,
            "max": row.largest, "seed": row.seed, "bestEpoch": row.epochs, "seconds": row.seconds, "bytes": row.size,
            "heldOut": row.held_out, "best": row.is_best}


def text_of(rows: list[Row]) -> str:
    """Columns as wide as what they hold; a table for each data set."""
    lines: list[str] = []
    for measured in sorted({row.measured for row in rows}):
        those = [row for row in rows if row.measured == measured]
        cells = [HEADS, *map(cells_of, those)]
        widths = [max(len(line[column]) for line in cells) for column in range(len(HEADS))]
        lines.append(f"{measured}: errors in mm on frames held out")
        for line in cells:
            lines.append("  ".join(cell.rjust(width) if column else cell.ljust(width)
                                   for column, (cell, width) in enumerate(zip(line, widths))).rstrip())
        if len({(row.seed, row.own_rows) for row in those}) > 1 and any(row.own_rows for row in those):
            lines.append(DIFFERENT_ROWS)
        lines.append("")
    return "\n".join(lines)


def cells_of(row: Row) -> tuple[str, ...]:
    numbers = [row.skin, row.mean, row.p9999, row.largest]
    return (row.name, *("-" if number is None else f"{number:.4g}" for number in numbers), str(row.epochs),
            f"{row.seconds:.0f}", f"{row.size / 1e6:.1f}",
            " ".join(["best"] * row.is_best + ["trained rows"] * (not row.held_out)))
