# SPDX-License-Identifier: Apache-2.0
"""A report as a table of text, and as one page that can be sent as it is."""

import base64
import html
import io
import json
from pathlib import Path
from typing import Any, Iterable, Optional

from .files import write_bytes
from .measure import FIGURE_NAMES, FIGURES, STAGES
from .rows import RATIOS, Json, Report

CELL = 8 * len(FIGURES) - 1  # columns of a stage in the table of text


def name_of(row: Json) -> str:
    return ", ".join(part for part in (row["mesh"], row["mode"], row["kind"]) if part)


def number(value: Optional[float], form: str = ".3f", unit: str = "") -> str:
    return "-" if value is None else f"{value:{form}}{unit}"


def device_line(rows: list[Json]) -> str:
    """What "GPU" stands for in this report."""
    used = [row["gpu"] for row in rows if row["gpu"]]
    if not used or any(gpu["deformations"] == 0 for gpu in used):
        return "GPU: there was none to be used" + (", and those frames ran on the CPU as well" if used else "")
    return f"GPU: {used[0]['device']}"


def names_of(figures: Iterable[str]) -> list[str]:
    """As readers see them."""
    return [FIGURE_NAMES.get(name, name) for name in figures]


# --- as text ---

def cell(stage: Optional[Json]) -> str:
    if stage is None:
        return f"{'-':>{CELL}}"
    return " ".join(f"{stage[f'{name}_mm']:7.3f}" for name in FIGURES)


def table(rows: list[Json]) -> str:
    """The errors in mm: a line a row, the figures of each stage."""
    head = "mm: " + ", ".join(names_of(FIGURES))
    width = max(len(head), *(len(name_of(row)) for row in rows))
    lines = [f"{head:{width}}" + "".join(f" | {called:^{CELL}}" for called in STAGES.values()) +
             " | " + " ".join(f"{name:>6}" for name in names_of(RATIOS)) + " | ms CPU   GPU | GPU from CPU, max"]
    for row in rows:
        part, gpu = row["ratio"], row["gpu"]
        lines.append(f"{name_of(row):{width}}" + "".join(f" | {cell(row[stage])}" for stage in STAGES)
                     + " | " + " ".join(f"{number(part[name]):>6}" for name in RATIOS)
                     + f" | {row['cpu']['median_ms']:6.3f} {number(gpu and gpu['median_ms'], '5.3f'):>5}"
                     + f" | {number(gpu and gpu['difference']['max_mm'], '.2g', ' mm')}")
    return "\n".join(lines) + "\n" + device_line(rows) + "\n"


# --- as a page ---

STYLE = """
body { font: 16px/1.5 system-ui, sans-serif; margin: 2rem auto; max-width: 1200px; padding: 0 1rem; color: #1c2430; }
img { max-width: 100%; border-radius: 6px; }
table { border-collapse: collapse; font-variant-numeric: tabular-nums; font-size: 14px; }
th, td { padding: .35rem .7rem; text-align: right; border-bottom: 1px solid #dde2e8; }
th:first-child, td:first-child { text-align: left; }
.best { font-weight: 600; }
small { color: #5b6675; }
"""


def embedded(content: bytes, kind: str, text: str) -> str:
    code = base64.b64encode(content).decode("ascii")
    return f'<img alt="{html.escape(text)}" src="data:image/{kind};base64,{code}">'


def embedded_file(path: Path, text: str) -> str:
    return embedded(path.read_bytes(), path.suffix.lstrip("."), text)


def moving_picture(frames: list[Path]) -> Optional[bytes]:
    """The frames as one looping picture, WebP; none without frames, or without Pillow, which makes it."""
    try:
        from PIL import Image
    except ModuleNotFoundError:
        return None
    if not frames:
        return None
    pictures = [Image.open(path).convert("RGB") for path in frames]
    content = io.BytesIO()
    pictures[0].save(content, format="webp", save_all=True, append_images=pictures[1:], duration=83, loop=0, quality=80,
                     method=4)
    return content.getvalue()


def html_cells(stage: Optional[Json], best: bool = False) -> str:
    if stage is None:
        return "<td>-</td>" * len(FIGURES)
    mark = ' class="best"' if best else ""
    figures = ((stage[f"{name}_mm"], stage[f"{name}_percent"]) for name in FIGURES)
    return "".join(f"<td{mark}>{mm:.3f}<br><small>{number(percent, unit=' %')}</small></td>" for mm, percent in figures)


def html_times(row: Json) -> str:
    cells = [number(row[where] and row[where][figure])
             for where in ("cpu", "gpu") for figure in ("median_ms", "p99_ms")]
    cells.append(number(row["gpu"] and row["gpu"]["difference"]["max_mm"], ".2g", " mm"))
    return "".join(f"<td>{text}</td>" for text in cells)


def html_table(rows: list[Json]) -> str:
    head = "".join(f'<th colspan="{len(FIGURES)}">{called}</th>' for called in STAGES.values())
    names = "".join(f"<th>{name}</th>" for name in names_of(FIGURES)) * len(STAGES)
    parts = "".join(f"<th>{name}</th>" for name in names_of(RATIOS))
    lines = [f"<tr><th></th>{head}<th colspan='{len(RATIOS)}'>network, part of before</th>"
             "<th colspan='2'>CPU, ms a frame</th><th colspan='2'>GPU, ms a frame</th><th>GPU from CPU</th></tr>",
             f"<tr><th></th>{names}{parts}" + "<th>median</th><th>p99</th>" * 2 + "<th>max</th></tr>"]
    for row in rows:
        cells = "".join(html_cells(row[stage], stage == "network") for stage in STAGES)
        ratios = "".join(f"<td>{number(row['ratio'][name])}</td>" for name in RATIOS)
        lines.append(f"<tr><td>{html.escape(name_of(row))}</td>{cells}{ratios}{html_times(row)}</tr>")
    return "<table>" + "\n".join(lines) + "</table>"


def html_worst(rows: list[Json]) -> str:
    items = []
    for row in rows:
        worst, moves, trembles = row["network"]["worst"], row["jitter_mm"], row["errorJitter_mm"]
        text = (f"{html.escape(name_of(row))}: the network is worst at vertex {worst['vertex']} in frame "
                f"{worst['frame']}")
        if moves:
            text += (f"; jitter {moves['network']:.3f} mm, of the target {moves['target']:.3f} mm, "
                     f"of the skin {moves['skin']:.3f} mm; jitter of the error {trembles['network']['mean']:.4f} mm "
                     f"in the mean and {trembles['network']['max']:.3f} mm at most, of the skin's "
                     f"{trembles['skin']['mean']:.4f} mm and {trembles['skin']['max']:.3f} mm")
        items.append(f"<li>{text}</li>")
    return "<ul>" + "".join(items) + "</ul>"


def html_facts(rows: list[Json]) -> str:
    """What each mesh was trained with; a sentence once, however many rows say the same."""
    sentences = {f"{html.escape(row['mesh'] + ': ' if row['mesh'] else '')}{row['vertices']} vertices, "
                 f"{row['controls']} control values, {row['poses']} training poses, {row['epochs']} epochs"
                 for row in rows}
    return ". ".join(sorted(sentences)) + "."


def page(report: Report, rows: list[Json], moving: Optional[bytes], remark: str = "") -> str:
    """`remark`: a sentence, HTML, of what was asked for."""
    held_out = "motion" if report.is_motion else "poses"
    stills = "".join(f"<p>{embedded_file(path, path.stem)}<br><small>{html.escape(text)}</small></p>"
                     for path, text in report.pictures)
    losses = "".join(f"<h3>{html.escape(name_of(row))}</h3>"
                     + embedded_file(files.training / "loss.png", f"loss curves, {name_of(row)}")
                     for row, files in zip(rows, report.rows))
    preview = f"<p>{embedded(moving, 'webp', 'skin, target, neural and error, in motion')}</p>" if moving else ""
    title = html.escape(report.title)
    return f"""<!DOCTYPE html>
<html lang="en"><head><meta charset="utf-8"><title>{title}</title><style>{STYLE}</style></head>
<body>
<h1>{title}</h1>
{preview}
<p>{"A motion" if report.is_motion else "Poses"} that the networks have not seen: linear skinning, the target shapes,
the mesh that the deformer makes with a network, and the distance that is left. {html_facts(rows)}</p>
<h2>Errors on the held-out {held_out}, in mm and in % of the bounding box's diagonal</h2>
{html_table(rows)}
<p><small>skin: linear skinning alone. zero deltas: the deformer with a network that outputs zeros (in
surface mode the rest surface carried by smoothed frames, in offset mode the skin). basis: the best that the principal
shapes could do. network: the trained model, through the plug-in. The part of before is of the smaller of skin and zero
deltas. p99.99: one vertex of ten thousand, in all frames together, is further away. Jitter: the largest second
difference over three frames; that of the error is what trembles where the target does not. {remark}
{html.escape(device_line(rows))}. GPU from CPU: the largest distance of a vertex between the two.</small></p>
<h2>Where it is worst{", and how smooth" if report.is_motion else ""}</h2>
{html_worst(rows)}
<h2>Frames of the {held_out}</h2>
{stills}
<h2>Training</h2>
{losses}
</body></html>
"""


def write(report: Report, rows: list[Json], folder: Path, remark: str = "",
          more: Optional[dict[str, Any]] = None) -> None:
    """report.json (the numbers; `more` beside the rows), report.html, table.txt and, of a motion, preview.webp."""
    folder.mkdir(parents=True, exist_ok=True)
    moving = moving_picture(report.preview)
    if moving:
        write_bytes(folder / "preview.webp", moving)
    numbers = {"version": 1, "title": report.title, **(more or {}), "rows": rows}
    write_bytes(folder / "report.json", (json.dumps(numbers, indent=1) + "\n").encode())
    write_bytes(folder / "table.txt", table(rows).encode())
    write_bytes(folder / "report.html", page(report, rows, moving, remark).encode())
