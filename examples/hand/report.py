# SPDX-License-Identifier: Apache-2.0
"""report.py FOLDER: the report of a demo, from what its commands have written below FOLDER.

Writes report.json (the numbers), report.html (one file that shows them with the pictures, to be sent as it is),
preview.webp (the moving picture) and table.txt. Ends with status 1 when the numbers do not agree with each other, or,
with --judge, when the limits are not kept.
"""

import argparse
import base64
import html
import json
import sys
from pathlib import Path
from typing import Any, Optional

import numpy as np
from PIL import Image

Json = dict[str, Any]

MODES, KINDS = ("surface", "offset"), ("principal", "direct")
STAGES = ("skin", "base", "basis", "network")
# what a model has to achieve on the held-out motion, against the better of the skin and the deformer without deltas
MEAN_LIMIT, MAX_LIMIT = 1 / 5, 1 / 2
PERCENTILES = {"p99": 99, "p9999": 99.99}


def read_json(path: Path) -> Any:
    with open(path, encoding="utf-8") as file:
        return json.load(file)


def distances(points: np.ndarray, target: np.ndarray, scale: float) -> np.ndarray:
    """Of each vertex in each frame from the target, in mm: [frames, vertices]."""
    return np.linalg.norm(points.astype(np.float64) - target.astype(np.float64), axis=2) * scale


def statistics(errors: np.ndarray, diagonal_mm: float) -> Json:
    """Mean, percentiles and largest of distances in mm, the same in % of the diagonal, and where the largest is."""
    values = {"mean": float(errors.mean()), "max": float(errors.max())}
    values.update({name: float(np.percentile(errors, part)) for name, part in PERCENTILES.items()})
    frame, vertex = np.unravel_index(np.argmax(errors), errors.shape)
    return {
        **{f"{name}_mm": value for name, value in values.items()},
        **{f"{name}_percent": 100 * value / diagonal_mm for name, value in values.items()},
        "worst": {"frame": int(frame) + 1, "vertex": int(vertex)},
    }


def jitter(points: np.ndarray, scale: float) -> float:
    """Largest second difference over the motion, in mm: what shows as popping."""
    second = points[2:].astype(np.float64) - 2 * points[1:-1] + points[:-2]
    return float(np.linalg.norm(second, axis=2).max() * scale)


def judged(stage: Optional[Json]) -> Optional[Json]:
    """The trainer's figures of one stage, with the names of the report; none where the stage does not exist."""
    if stage is None:
        return None
    numbers = {name: stage[name] for name in ("mean", "p99", "max")}
    return {
        **{f"{name}_mm": value["mm"] for name, value in numbers.items()},
        **{f"{name}_percent": value["percentOfDiagonal"] for name, value in numbers.items()},
        "worst": {"frame": stage["worstFrame"], "vertex": stage["worstVertex"]},
    }


def require_agreement(name: str, measured: Json, by_quarn: Json) -> None:
    """The plug-in's player and this script see the same files: their figures are the same."""
    for figure in ("mean", "max"):
        difference = abs(measured[f"{figure}_mm"] - by_quarn["mm"][figure])
        if difference > 1e-6:
            sys.exit(f"report.py: {name}: {figure} differs by {difference:g} mm from what quarn play measured")


def times(played: Json) -> Json:
    return {"median_ms": played["medianMs"], "p99_ms": played["p99Ms"]}


def gpu_of_row(played: Json, on_cpu: np.ndarray, on_gpu: np.ndarray, scale: float, diagonal_mm: float) -> Json:
    """Where and how fast the OpenCL device played the motion, and how far it came out from the CPU."""
    use = played["gpu"]
    return {
        "device": use["device"],
        "deformations": use["onGpu"],
        "fallbacks": use["fallbacks"],
        **times(played),
        "difference": statistics(distances(on_gpu, on_cpu, scale), diagonal_mm),
    }


def row_of_report(data: Path, mode: str, kind: str) -> Json:
    name = f"{mode}_{kind}"
    played, on_device, evaluated = (read_json(data / "results" / name / f"{what}.json")
                                    for what in ("play_cpu", "play_gpu", "evaluate"))
    scale = 1000 * read_json(data / "sets" / f"motion_{mode}" / "dataset.json")["metersPerUnit"]
    skin, target, network, network_gpu = (np.load(data / f"motion_{what}.npy")
                                          for what in ("skin", "target", f"{name}_cpu", f"{name}_gpu"))
    diagonal = played["boxDiagonalMm"]
    errors: Json = {
        "skin": statistics(distances(skin, target, scale), diagonal),
        "base": judged(evaluated["base"]),
        "basis": judged(evaluated.get("basis")),
        "network": statistics(distances(network, target, scale), diagonal),
    }
    require_agreement(f"{name}, skin", errors["skin"], played["before"])
    require_agreement(f"{name}, network", errors["network"], played["distance"])
    best = {figure: min(errors[stage][figure] for stage in ("skin", "base")) for figure in ("mean_mm", "max_mm")}
    return {
        "mode": mode,
        "kind": kind,
        **errors,
        "ratio": {figure: errors["network"][f"{figure}_mm"] / best[f"{figure}_mm"] for figure in ("mean", "max")},
        "jitter_mm": {what: jitter(points, scale) for what, points in
                      (("skin", skin), ("target", target), ("network", network))},
        "cpu": times(played),
        "gpu": gpu_of_row(on_device, network, network_gpu, scale, diagonal),
    }


def make_report(folder: Path) -> Json:
    data = folder / "data"
    # a demo that was not asked for --all has no direct models
    trained = [(mode, kind) for mode in MODES for kind in KINDS if (data / "results" / f"{mode}_{kind}").is_dir()]
    rows = [row_of_report(data, mode, kind) for mode, kind in trained]
    kept = all(row["ratio"]["mean"] <= MEAN_LIMIT and row["ratio"]["max"] <= MAX_LIMIT for row in rows)
    training = read_json(data / "results" / "surface_principal" / "report.json")
    training_set = read_json(data / "sets" / "poses_surface" / "dataset.json")
    return {
        "version": 1,
        "vertices": training_set["affectCount"],
        "controls": training_set["controlCount"],
        "poses": training_set["frameCount"],
        "epochs": training["settings"]["epochs"],
        "smoothingIterations": training_set["smoothingIterations"],
        "rows": rows,
        "limits": {"mean": MEAN_LIMIT, "max": MAX_LIMIT, "kept": kept},
    }


def cell(stage: Optional[Json]) -> str:
    if stage is None:
        return f"{'-':>23}"
    return f"{stage['mean_mm']:7.3f} {stage['p99_mm']:7.3f} {stage['max_mm']:7.3f}"


def table(report: Json) -> str:
    """The errors in mm as text: a line a row, mean, p99 and maximum of each stage."""
    lines = [f"{'mm: mean, p99, max':18}" + "".join(f" | {stage:^23}" for stage in STAGES) +
             " |  mean   max | ms CPU   GPU | GPU from CPU, max"]
    for row in report["rows"]:
        line = f"{row['mode'] + ', ' + row['kind']:18}" + "".join(f" | {cell(row[stage])}" for stage in STAGES)
        ratio = row["ratio"]
        gpu = row["gpu"]
        lines.append(line + f" | {ratio['mean']:5.3f} {ratio['max']:5.3f} | {row['cpu']['median_ms']:6.3f} "
                     f"{gpu['median_ms']:5.3f} | {gpu['difference']['max_mm']:.2g} mm")
    return "\n".join(lines) + "\n" + device_line(report) + "\n"


def device_line(report: Json) -> str:
    """What "GPU" stands for in this report."""
    used = [row["gpu"] for row in report["rows"]]
    if any(gpu["deformations"] == 0 for gpu in used):
        return "GPU: there was none to be used, and those frames ran on the CPU as well"
    return f"GPU: {used[0]['device']}"


def write_preview(folder: Path) -> Path:
    """All frames of the preview as one looping picture."""
    frames = [Image.open(path).convert("RGB") for path in sorted((folder / "data" / "preview").glob("*.png"))]
    if not frames:
        sys.exit(f"report.py: there are no pictures in {folder / 'data' / 'preview'}")
    path = folder / "preview.webp"
    frames[0].save(path, save_all=True, append_images=frames[1:], duration=83, loop=0, quality=80, method=4)
    return path


def embedded(path: Path, text: str) -> str:
    kind = path.suffix.lstrip(".")
    content = base64.b64encode(path.read_bytes()).decode("ascii")
    return f'<img alt="{html.escape(text)}" src="data:image/{kind};base64,{content}">'


STYLE = """
body { font: 16px/1.5 system-ui, sans-serif; margin: 2rem auto; max-width: 1200px; padding: 0 1rem; color: #1c2430; }
img { max-width: 100%; border-radius: 6px; }
table { border-collapse: collapse; font-variant-numeric: tabular-nums; font-size: 14px; }
th, td { padding: .35rem .7rem; text-align: right; border-bottom: 1px solid #dde2e8; }
th:first-child, td:first-child { text-align: left; }
.best { font-weight: 600; }
small { color: #5b6675; }
"""


def html_cells(stage: Optional[Json], best: bool = False) -> str:
    if stage is None:
        return "<td>-</td>" * 3
    mark = ' class="best"' if best else ""
    figures = ((stage[f"{name}_mm"], stage[f"{name}_percent"]) for name in ("mean", "p99", "max"))
    return "".join(f"<td{mark}>{mm:.3f}<br><small>{percent:.3f} %</small></td>" for mm, percent in figures)


def html_table(report: Json) -> str:
    head = "".join(f'<th colspan="3">{stage}</th>' for stage in STAGES)
    names = "<th>mean</th><th>p99</th><th>max</th>" * len(STAGES)
    lines = [f"<tr><th></th>{head}<th colspan='2'>network, part of before</th><th colspan='2'>CPU, ms a frame</th>"
             "<th colspan='2'>GPU, ms a frame</th><th>GPU from CPU</th></tr>",
             f"<tr><th></th>{names}<th>mean</th><th>max</th>" + "<th>median</th><th>p99</th>" * 2 + "<th>max</th></tr>"]
    for row in report["rows"]:
        cells = "".join(html_cells(row[stage], stage == "network") for stage in STAGES)
        lines.append(f"<tr><td>{row['mode']}, {row['kind']}</td>{cells}"
                     f"<td>{row['ratio']['mean']:.3f}</td><td>{row['ratio']['max']:.3f}</td>"
                     + "".join(f"<td>{row[where]['median_ms']:.3f}</td><td>{row[where]['p99_ms']:.3f}</td>"
                               for where in ("cpu", "gpu"))
                     + f"<td>{row['gpu']['difference']['max_mm']:.2g} mm</td></tr>")
    return "<table>" + "\n".join(lines) + "</table>"


def html_worst(report: Json) -> str:
    items = []
    for row in report["rows"]:
        network, moves = row["network"], row["jitter_mm"]
        items.append(f"<li>{row['mode']}, {row['kind']}: p99.99 {network['p9999_mm']:.3f} mm; worst at vertex "
                     f"{network['worst']['vertex']} in frame {network['worst']['frame']}; "
                     f"jitter {moves['network']:.3f} mm, "
                     f"of the target {moves['target']:.3f} mm, of the skin {moves['skin']:.3f} mm</li>")
    return "<ul>" + "".join(items) + "</ul>"


def caption(path: Path) -> str:
    """Of a still, motion.0020.png or offset.0060.png: whose network it shows, and the frame."""
    name, frame = path.stem.split(".")
    return f"{'offsets' if name == 'offset' else 'surface deltas'}, principal shapes, frame {int(frame)}"


def html_page(folder: Path, report: Json, preview: Path) -> str:
    stills = "".join(f"<p>{embedded(path, path.stem)}<br><small>{caption(path)}</small></p>"
                     for path in sorted((folder / "pictures").glob("*.png")))
    results = folder / "data" / "results"
    losses = "".join(f"<h3>{mode}, {kind}</h3>" + embedded(results / f"{mode}_{kind}" / "loss.png",
                                                           f"loss curves, {mode}, {kind}")
                     for mode, kind in ((row["mode"], row["kind"]) for row in report["rows"]))
    return f"""<!DOCTYPE html>
<html lang="en"><head><meta charset="utf-8"><title>A hand that keeps its volume</title><style>{STYLE}</style></head>
<body>
<h1>A hand that keeps its volume</h1>
<p>{embedded(preview, "skin, target, neural and error, in motion")}</p>
<p>A motion that the networks have not seen: linear skinning, the target shapes, the mesh that the deformer makes
with a network, and the distance that is left. {report['vertices']} vertices, {report['controls']} control values,
{report['poses']} training poses, {report['epochs']} epochs.</p>
<h2>Errors on the held-out motion, in mm and in % of the bounding box's diagonal</h2>
{html_table(report)}
<p><small>skin: linear skinning alone. base: the deformer with deltas of zero (in surface mode the rest surface carried
by smoothed frames). basis: the best that the principal shapes could do. network: the trained model, through the
plug-in. The part of before is of the smaller of skin and base; asked for are {MEAN_LIMIT:g} in the mean and
{MAX_LIMIT:g} at most.
{html.escape(device_line(report))}. GPU from CPU: the largest distance of a vertex between the two.</small></p>
<h2>Where it is worst, and how smooth</h2>
{html_worst(report)}
<h2>Frames of the motion</h2>
{stills}
<h2>Training</h2>
{losses}
</body></html>
"""


def main() -> None:
    parser = argparse.ArgumentParser(description="The report of a demo.")
    parser.add_argument("folder", type=Path, help="what ./run demo calls its output folder")
    parser.add_argument("--judge", action="store_true", help="end with status 1 when the limits are not kept")
    arguments = parser.parse_args()
    folder = arguments.folder
    report = make_report(folder)
    (folder / "report.json").write_text(json.dumps(report, indent=1) + "\n", encoding="utf-8")
    (folder / "table.txt").write_text(table(report), encoding="utf-8")
    (folder / "report.html").write_text(html_page(folder, report, write_preview(folder)), encoding="utf-8")
    print(table(report), end="")
    if arguments.judge and not report["limits"]["kept"]:
        sys.exit(f"report.py: the network leaves more than {MEAN_LIMIT:g} of the mean or {MAX_LIMIT:g} of the largest "
                 "error")


if __name__ == "__main__":
    main()
