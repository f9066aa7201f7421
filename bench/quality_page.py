# SPDX-License-Identifier: Apache-2.0
"""Measures what networks make of a hand, an arm and a face, and writes the table of docs/quality.md anew.

usage: quality_page.py QUARN FOLDER PAGE
    QUARN   the built application
    FOLDER  for data sets and models, 2 GB; what is there from an earlier call is not made again
    PAGE    the page; what stands between its two marks is replaced

Takes about half an hour of one core. The hand is the demo's (scripts/fetch_hand.sh).
"""

import json
import os
import pathlib
import subprocess
import sys
from typing import Any, Dict, List, NamedTuple

ROOT = pathlib.Path(__file__).resolve().parents[1]
BEGIN, END = "<!-- measured: begin -->", "<!-- measured: end -->"
SEEDS = (1, 2, 3)
FIGURES = ("mean", "p99", "p9999", "max")


class Rig(NamedTuple):
    """What quarn run is given, and what its mesh is called."""

    character: str
    mesh: str
    samples: int
    words: List[str]
    program: List[str]


HAND = ["--parents", "examples/hand/parents.json", "--limits", "examples/hand/limits.json", "--activation-rate", "0.8",
        "--motion", "examples/hand/motion.json"]
SURFACE = ["--import-option=--delta-mode", "--import-option=surface", "--import-option=--smoothing",
           "--import-option=5"]
OFFSET = ["--import-option=--delta-mode", "--import-option=offset"]
RELAX = ["examples/hand/target_command.py"]
RIGS: Dict[str, Rig] = {
    "hand, 1500 poses": Rig("build/deps/hand/left.glb", "l_handMeshNode", 1500, HAND + SURFACE, RELAX),
    "hand, 3000 poses": Rig("build/deps/hand/left.glb", "l_handMeshNode", 3000, HAND + SURFACE, RELAX),
    "hand, offsets, 3000 poses": Rig("build/deps/hand/left.glb", "l_handMeshNode", 3000, HAND + OFFSET, RELAX),
    "arm, 600 poses": Rig("arm.glb", "arm", 600, [
        *OFFSET, "--limits", "examples/arm/limits.json", "--activation-rate", "0.8", "--motion",
        "examples/arm/motion.json"], ["examples/arm/arm_targets.py"]),
    "face, 2000 poses": Rig("face.glb", "face", 2000, [*OFFSET, "--motion", "face.motion.json"],
                            ["bench/face_rig.py"]),
}
BEFORE = ["--principal-shapes", "--activation", "LeakyReLU", "--no-linear-path", "--no-local-neurons",
          "--batch-size", "128", "--learning-rate", "0.001", "--principal-limit", "100", "--principal-accuracy",
          "0.999"]
AFTER = ["--principal-shapes", "--activation", "SiLU", "--linear-path", "--local-neurons", "--batch-size", "32",
         "--learning-rate", "0.003", "--principal-limit", "200", "--principal-accuracy", "0.99999"]


class Kind(NamedTuple):
    """How poses are drawn and what is trained with."""

    called: str
    name: str          # of files
    limit_rate: str
    training: List[str]


KINDS = [Kind("before", "before", "0", BEFORE), Kind("other training, the same poses", "after", "0", AFTER),
         Kind("other training, poses at limits", "limits", "0.3", AFTER)]


def run(command: List[str], log: pathlib.Path) -> str:
    done = subprocess.run(command, cwd=ROOT, capture_output=True, text=True, check=False, env={
        **os.environ, "NW_PYTHON": sys.executable})
    log.write_text(done.stdout + done.stderr)
    if done.returncode:
        sys.exit(f"quality_page.py: {' '.join(command)}: status {done.returncode}, see {log}")
    return done.stdout


def make_data(quarn: str, folder: pathlib.Path, name: str, limit_rate: str) -> pathlib.Path:
    """The folder with the data sets `set` and `heldOut` of a rig."""
    ending = "" if limit_rate == "0" else "-limits"
    rig, place = RIGS[name], folder / (name.replace(",", "").replace(" ", "-") + ending)
    data = place / "data" / rig.mesh
    words = [str(folder / word) if word == "face.motion.json" else word for word in rig.words]
    character = folder / rig.character if (folder / rig.character).exists() else ROOT / rig.character
    command = [quarn, "run", str(character), "-o", str(place), "--until", "held-out", "--seed", "1",
               "--samples", str(rig.samples), "--limit-rate", limit_rate, *words]
    made = folder / f"hand-3000-poses{ending}" / "data" / rig.mesh
    if name == "hand, offsets, 3000 poses":
        command += ["--targets", str(made / "poses_target.npy"), "--motion-targets", str(made / "motion_target.npy")]
    else:
        command += ["--target-command", sys.executable, *rig.program]
    run(command, folder / f"{place.name}.log")
    return data


def measure(quarn: str, data: pathlib.Path, folder: pathlib.Path, label: str, kind: Kind, seed: int) -> Dict[str, Any]:
    """Errors on the held-out motion, the skin's and the network's."""
    answer = folder / f"{label}-{kind.name}-{seed}.json"
    if not answer.exists():
        model = folder / f"{label}-{kind.name}-{seed}.nwrp"
        trainer = [sys.executable, "-m", "trainer"]
        run([*trainer, "train", str(data / "set"), "-o", str(model), "--seed", str(seed), "--validation-ratio", "0.1",
             "--quarn", quarn, *kind.training], model.with_suffix(".log"))
        errors = json.loads(run([*trainer, "evaluate", str(data / "heldOut"), str(model), "--quarn", quarn, "--json"],
                                model.with_suffix(".evaluate.log")))
        report = json.loads((model.with_suffix(".report") / "report.json").read_text())
        answer.write_text(json.dumps({**errors, "limit": report["limit"]}))
    found: Dict[str, Any] = json.loads(answer.read_text())
    return found


def cells(stages: List[Dict[str, Any]], before: Dict[str, Any]) -> str:
    """Means over the seeds, in mm and in parts of what there is before, and the worst seed's p99.99."""
    means = {name: sum(stage[name]["mm"] for stage in stages) / len(stages) for name in FIGURES}
    parts = {name: 100 * means[name] / before[name]["mm"] for name in FIGURES}
    worst = 100 * max(stage["p9999"]["mm"] for stage in stages) / before["p9999"]["mm"]
    jitter = sum(stage["jitter"]["mean"]["mm"] for stage in stages) / len(stages)
    return (" / ".join(f"{means[name]:.3g}" for name in FIGURES)
            + f" | {parts['mean']:.1f} % | {parts['p9999']:.1f} % ({worst:.1f} %) | {jitter:.2g}")


def table(quarn: str, folder: pathlib.Path) -> List[str]:
    lines = ["| rig | | mean / p99 / p99.99 / max, mm | mean of before | p99.99 of before (worst seed) | jitter of the "
             "error, mm | limit |", "|---|---|---|---|---|---|---|"]
    for name in RIGS:
        for kind in KINDS:
            data = make_data(quarn, folder, name, kind.limit_rate)
            found = [measure(quarn, data, folder, data.parent.parent.name, kind, seed) for seed in SEEDS]
            skin = found[0]["skin"]
            if kind.name == "before":
                lines.append(f"| {name} | the skin | " + " / ".join(f"{skin[figure]['mm']:.3g}" for figure in FIGURES)
                             + " | | | | |")
            limits = ", ".join(sorted({str(one["limit"]) for one in found}))
            lines.append(f"| | {kind.called} | {cells([one['network'] for one in found], skin)} | {limits} |")
    return lines


def main() -> None:
    if len(sys.argv) != 4:
        sys.exit(__doc__)
    quarn, folder, page = sys.argv[1], pathlib.Path(sys.argv[2]).resolve(), pathlib.Path(sys.argv[3])
    folder.mkdir(parents=True, exist_ok=True)
    log = folder / "rigs.log"
    run([sys.executable, "examples/arm/write_arm.py", str(folder / "arm.glb")], log)
    run([sys.executable, "bench/face_rig.py", str(folder / "face.glb"), str(folder / "face.motion.json")], log)
    text = page.read_text()
    head, _, rest = text.partition(BEGIN)
    page.write_text(head + BEGIN + "\n" + "\n".join(table(quarn, folder)) + "\n" + END + rest.partition(END)[2])


if __name__ == "__main__":
    main()
