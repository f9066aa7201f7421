# SPDX-License-Identifier: Apache-2.0
"""report.py FOLDER ROW...: the report of a demo, from what quarn run has written into the folders FOLDER/data/ROW.

Writes report.json (the numbers), report.html (one file that shows them with the pictures, to be sent as it is),
preview.webp (the moving picture) and table.txt. Ends with status 1 when the numbers do not agree with each other, or,
with --judge, when the limits are not kept.
"""

import argparse
import sys
from pathlib import Path
from typing import Any

sys.path.insert(0, str(Path(__file__).resolve().parents[2]))  # where the trainer is

from trainer import page  # noqa: E402
from trainer.errors import TrainerError  # noqa: E402
from trainer.rows import Played, Report, Row, figures  # noqa: E402

MESH = "l_handMeshNode"
# what a model has to achieve on the held-out motion, against the better of the skin and the deformer without deltas:
# parts of the mean and of the largest, for each row of the demo (decision 0089)
LIMITS = {"surface_principal": (1 / 16, 1 / 4), "offset_principal": (1 / 12, 1 / 4),
          "surface_direct": (1 / 16, 1 / 4), "offset_direct": (1 / 12, 1 / 4)}


def row_of(run: Path) -> Row:
    """Of the folder of a quarn run."""
    data, answers = run / "data" / MESH, run / "answers"
    cpu, gpu = (Played(answers / f"{step}-{MESH}.json", data / f"heldOut_{where}.npy")
                for step, where in (("play", "cpu"), ("play-gpu", "gpu")))
    return Row("", data / "set", data / "heldOut", data / "training", answers / f"evaluate-{MESH}.json",
               data / "heldOut_skin.npy", data / "heldOut_target.npy", cpu, gpu)


def report_of(folder: Path, rows: list[str]) -> Report:
    return Report("A hand that keeps its volume", True, 1, [row_of(folder / "data" / name) for name in rows],
                  [(path, caption(path)) for path in sorted((folder / "pictures").glob("*.png"))],
                  sorted((folder / "data" / "preview").glob("*.png")))


def caption(path: Path) -> str:
    """Of a still, motion.0020.png or offset.0060.png: whose network it shows, and the frame."""
    name, frame = path.stem.split(".")
    return f"{'offsets' if name == 'offset' else 'surface deltas'}, principal shapes, frame {int(frame)}"


def keeps(row: dict[str, Any], mean: float, largest: float) -> bool:
    return bool(row["ratio"]["mean"] <= mean and row["ratio"]["max"] <= largest)


def asked(names: list[str]) -> str:
    """What is asked of rows, for readers."""
    return "Asked for are " + ", ".join(
        f"{LIMITS[name][0]:.3g} in the mean and {LIMITS[name][1]:.3g} at most ({name.replace('_', ', ')})"
        for name in names) + "."


def main() -> None:
    parser = argparse.ArgumentParser(description="The report of a demo.")
    parser.add_argument("folder", type=Path, help="what ./run demo calls its output folder")
    parser.add_argument("rows", nargs="+", metavar="ROW", choices=LIMITS, help="folders of quarn run below FOLDER/data")
    parser.add_argument("--judge", action="store_true", help="end with status 1 when the limits are not kept")
    arguments = parser.parse_args()
    try:
        report = report_of(arguments.folder, arguments.rows)
        rows = [figures(row, report.is_motion, report.first_frame) for row in report.rows]
        missed = [name for name, row in zip(arguments.rows, rows) if not keeps(row, *LIMITS[name])]
        page.write(report, rows, arguments.folder, asked(arguments.rows),
                   {"limits": {**{name: dict(zip(("mean", "max"), LIMITS[name])) for name in arguments.rows},
                               "kept": not missed}})
    except TrainerError as error:
        sys.exit(f"report.py: {error}")
    print(page.table(rows), end="")
    if arguments.judge and missed:
        sys.exit(f"report.py: more is left than asked for by {', '.join(missed)}. {asked(missed)}")


if __name__ == "__main__":
    main()
