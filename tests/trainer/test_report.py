# SPDX-License-Identifier: Apache-2.0
"""The report of `quarn run`: rows are called after what they were trained on, figures are those of the files, and what
does not go together is refused. The end-to-end test of the demo computes all figures once more."""

import json
import tempfile
import unittest
from pathlib import Path
from typing import Any

import numpy as np
import synthetic
from trainer import page, rows
from trainer.errors import TrainerError

FRAMES, VERTICES, FIRST = 4, 48, 101


class ReportTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        self.random = np.random.default_rng(3)

    def write(self, name: str, value: Any) -> str:
        (self.place / name).parent.mkdir(parents=True, exist_ok=True)
        (self.place / name).write_text(json.dumps(value))
        return name

    def row(self, mesh: str, principal: bool, **changes: Any) -> dict[str, Any]:
        """A row of quarn run, whose network leaves 1 mm at vertex 5 of frame 103 and 0.1 mm elsewhere."""
        target = self.random.normal(size=(FRAMES, VERTICES, 3)).astype("<f4").astype(float)
        away = np.zeros_like(target)
        away[..., 0], away[2, 5, 0] = 0.01, 0.1  # of a unit that is a centimetre
        for name, points in (("skin", target + 3 * away), ("target", target), ("cpu", target + away),
                             ("gpu", target + away)):
            (self.place / mesh).mkdir(exist_ok=True)
            np.save(self.place / mesh / f"{name}.npy", points)
        for name in ("set", "heldOut"):
            synthetic.make(self.place / mesh / name, frames=20, **changes)
        mean = (0.1 * (FRAMES * VERTICES - 1) + 1) / (FRAMES * VERTICES)
        played = {"medianMs": 2.0, "p99Ms": 3.0, "boxDiagonalMm": 100.0,
                  "before": {"mm": {"mean": 3 * mean, "max": 3.0}}, "distance": {"mm": {"mean": mean, "max": 1.0}},
                  "gpu": {"device": "D", "onGpu": 3, "fallbacks": 0}}
        stage: rows.Json = {name: {"mm": 2.0, "percentOfDiagonal": 2.0} for name in ("mean", "p99", "p9999", "max")}
        self.write(f"{mesh}/training/report.json", {"settings": {"principalShapesEnabled": principal}, "epochs": 7})
        (self.place / mesh / "training" / "loss.png").write_bytes(b"a picture")
        evaluate: rows.Json = {"base": {**stage, "worstFrame": FIRST, "worstVertex": 0}, "basis": None}
        return {"mesh": mesh, "evaluate": self.write(f"{mesh}/evaluate.json", evaluate),
                **{name: f"{mesh}/{name}" for name in ("set", "heldOut", "training")},
                **{name: f"{mesh}/{name}.npy" for name in ("skin", "target")},
                **{name: {"answer": self.write(f"{mesh}/{name}.json", played), "points": f"{mesh}/{name}.npy"}
                   for name in ("cpu", "gpu")}}

    def figures(self, given: list[dict[str, Any]], **changes: Any) -> list[rows.Json]:
        report = {"format": rows.FORMAT, "version": 1, "title": "a <hand>", "isMotion": True, "firstFrame": FIRST,
                  "rows": given, "pictures": [], "preview": [], **changes}
        self.report = rows.read_report(self.place / self.write("rows.json", report))
        return [rows.figures(row, self.report.is_motion, self.report.first_frame) for row in self.report.rows]

    def test_figures_and_names(self) -> None:
        no_gpu = {**self.row("eye", False, deltaMode=0), "gpu": None}
        arm, eye = self.figures([self.row("arm", True), no_gpu])
        self.assertEqual([page.name_of(row) for row in (arm, eye)], ["arm, surface, principal", "eye, offset, direct"])
        self.assertEqual(arm["network"]["worst"], {"frame": 103, "vertex": 5})
        for found, wanted in ((arm["network"]["max_mm"], 1), (arm["network"]["p9999_percent"], 0.983),
                              (arm["skin"]["max_mm"], 3), (arm["ratio"]["max"], 1 / 2),
                              (arm["jitter_mm"]["target"] > 1, 1), (arm["gpu"]["difference"]["max_mm"], 0),
                              (arm["errorJitter_mm"]["network"]["max"], 2 * (1 - 0.1)),
                              (arm["errorJitter_mm"]["network"]["mean"], (2 + 1) * (1 - 0.1) / (2 * VERTICES)),
                              (arm["errorJitter_mm"]["skin"]["max"], 6 * (1 - 0.1)),
                              (eye["ratio"]["mean"], arm["ratio"]["mean"])):
            self.assertAlmostEqual(found, wanted, 3)
        page.write(self.report, [arm, eye], self.place)
        text, shown = ((self.place / name).read_text() for name in ("table.txt", "report.html"))
        self.assertRegex(text, r"(?m)^eye, offset, direct .* \|  2\.000     - \| -$")
        self.assertIn("<h1>a &lt;hand&gt;</h1>", shown)
        self.assertEqual(json.loads((self.place / "report.json").read_text())["rows"], [arm, eye])

    def test_one_mesh_needs_no_name_and_poses_do_not_tremble(self) -> None:
        row, = self.figures([self.row("arm", True)], isMotion=False)
        self.assertEqual((page.name_of(row), row["jitter_mm"]), ("surface, principal", None))

    def test_what_does_not_go_together_is_refused(self) -> None:
        good = self.row("arm", True)
        np.save(self.place / "short.npy", np.zeros((FRAMES - 1, VERTICES, 3)))
        np.save(self.place / "other.npy", np.load(self.place / good["skin"]) + 1e-3)
        of_rows: list[tuple[dict[str, Any], str]] = [
            ({"skin": "short.npy"}, r"short\.npy has the shape \[3, 48, 3\], not \[4, 48, 3\]"),
            ({"skin": "other.npy"}, "skin: mean differs by .* from what quarn play measured"),
            ({"cpu": {**good["cpu"], "points": "other.npy"}}, "network: mean differs"),
            ({"cpu": None}, "does not say what a report is about"),
            ({"target": good["evaluate"]}, "not a NumPy array file")]
        of_reports: list[tuple[dict[str, Any], str]] = [
            ({"version": 2}, "version 2, not"), ({"rows": []}, "has no rows"),
            ({"rows": 5}, "does not say what a report is about")]
        for changes, sentence in of_rows:
            with self.subTest(sentence), self.assertRaisesRegex(TrainerError, sentence):
                self.figures([{**good, **changes}])
        for changes, sentence in of_reports:
            with self.subTest(sentence), self.assertRaisesRegex(TrainerError, sentence):
                self.figures([good], **changes)


if __name__ == "__main__":
    unittest.main()
