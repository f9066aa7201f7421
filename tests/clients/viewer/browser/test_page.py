# SPDX-License-Identifier: Apache-2.0
"""A page of `quarn view` in a browser: what it shows has to be what quarn plays, it has to notice what is damaged, and
it may ask for nothing. NW_TEST_QUARN names the program."""

import base64
import io
import json
import os
import re
import tempfile
import unittest
from pathlib import Path
from typing import Any, Callable

import numpy as np
from PIL import Image

from chromium import Chromium, Page
from small_arm import FRAMES, HOSTILE, ROOT, SHAPES, TITLE, SmallArm

READY = "neuralWarp.ready.then(() => neuralWarp.error ?? true)"
HACKED = "window.hacked === undefined && !document.querySelector('img, [onmouseover]')"


class Made:
    """What all tests look at, made once."""

    arm: SmallArm
    page: Path
    browser: Chromium


def setUpModule() -> None:
    folder = tempfile.TemporaryDirectory()
    unittest.addModuleCleanup(folder.cleanup)
    Made.arm = SmallArm(Path(folder.name) / "an arm", os.environ["NW_TEST_QUARN"])
    Made.page = Made.arm.folder / "to send" / "the arm.html"
    Made.page.parent.mkdir()
    Made.arm.quarn("view", "motion.json", "-o", str(Made.page), "--title", TITLE, "--basis", "f32", "--quiet")
    Made.browser = Chromium()
    unittest.addModuleCleanup(Made.browser.close)


class PageTest(unittest.TestCase):
    def open(self, file: "Path | str" = "", **how: Any) -> Page:
        page = Made.browser.open(file or Made.page, **how)
        self.addCleanup(page.close)
        return page

    def ready(self, file: "Path | str" = "", **how: Any) -> Page:
        page = self.open(file, **how)
        self.assertIs(page.evaluate(READY), True)
        return page

    def changed(self, change: Callable[[str], str]) -> Path:
        """The page with another text."""
        path = Made.page.with_name("changed.html")
        path.write_text(change(Made.page.read_text()))
        return path


def points(page: Page, shape: str) -> np.ndarray:
    """[V, 3]."""
    return np.frombuffer(page.bytes_of(f"neuralWarp.points('{shape}')"), "<f4").reshape(-1, 3)


def drawn(page: Page) -> np.ndarray:
    """What is drawn of the character alone, [height, width, 4], without what the page shows on top."""
    canvas = page.evaluate("(neuralWarp.draw(), document.querySelector('#canvas canvas').toDataURL())")
    return np.asarray(Image.open(io.BytesIO(base64.b64decode(canvas.partition(",")[2]))).convert("RGBA")).astype(int)


def seen(page: Page) -> np.ndarray:
    return np.asarray(Image.open(io.BytesIO(page.screenshot())).convert("RGB")).astype(int)


def silhouette(picture: np.ndarray) -> np.ndarray:
    """Where something else is than in the upper left corner."""
    return np.asarray(np.abs(picture - picture[2, 2]).max(axis=2) > 12)


def with_block(text: str, name: str, change: Callable[[bytearray], bytes]) -> str:
    pattern = re.compile(rf'(<script[^>]*id="block-{re.escape(name)}"[^>]*>)([^<]*)')
    found = pattern.search(text)
    assert found, f"no block {name}"
    content = base64.b64encode(change(bytearray(base64.b64decode(found[2])))).decode()
    return text[:found.start(2)] + content + text[found.end(2):]


def manifest_of(text: str) -> Any:
    found = re.search(r'<script type="application/json" id="manifest">(.*?)</script>', text, re.S)
    assert found
    return json.loads(found[1])


def flipped(content: bytearray) -> bytes:
    return bytes(content[:-1]) + bytes([content[-1] ^ 1])


class OpeningTest(PageTest):
    def test_opens_from_a_folder_and_asks_for_nothing_else(self) -> None:
        self.assertIn(" ", str(Made.page))
        page = self.ready()
        for act in ("showFrame(3)", "setMode('split')", "setHeat('after')", "setMode('flip')", "draw()"):
            page.evaluate(f"(neuralWarp.{act}, 0)")
        self.assertEqual(page.requests, [Made.page.as_uri()])
        self.assertEqual(page.complaints, [])
        policy = page.evaluate("document.querySelector('meta[http-equiv=Content-Security-Policy]').content")
        self.assertIn("default-src 'none'", policy)
        page.evaluate("fetch('http://neuralwarp.invalid/').catch(() => 0)")
        page.wait_for(lambda: any("Content Security Policy" in said for said in page.complaints))

    def test_shows_names_as_they_are_and_runs_none(self) -> None:
        page = self.ready()
        self.assertTrue(page.evaluate(HACKED))
        self.assertIn(TITLE, page.evaluate("document.title"))
        text = page.evaluate("document.body.textContent")
        for name in (TITLE, *HOSTILE):
            self.assertIn(name, text)
        self.assertTrue(set(HOSTILE) <= {slider["name"].partition(".")[2] or slider["name"]
                                         for slider in page.evaluate("neuralWarp.sliders")})
        names = page.evaluate("neuralWarp.sliders.map((slider) => slider.name)")
        self.assertEqual(len(names), len(set(names)))

    def test_names_of_joints_and_files_are_texts_too(self) -> None:
        def spoilt(text: str) -> str:
            manifest = manifest_of(text)
            for slider in manifest["sliders"]:
                slider["name"] += HOSTILE[1]
                slider["group"] = HOSTILE[0] + slider["group"]
            for key in ("scene", "mesh", "quarn"):
                manifest[key] = HOSTILE[1] + key
            manifest["model"].update(name=HOSTILE[0], trainer=HOSTILE[1])
            written = json.dumps(manifest).replace("<", "\\u003c")
            head = '<script type="application/json" id="manifest">'
            start = text.index(head) + len(head)
            return text[:start] + written + text[text.index("</script>", start):]
        page = self.ready(self.changed(spoilt))
        self.assertTrue(page.evaluate(HACKED))
        self.assertTrue(page.evaluate("neuralWarp.verdict.same"))
        self.assertIn(HOSTILE[0] + "forearm", page.evaluate("document.body.textContent"))

    def test_fits_a_phone_and_turns_by_touch(self) -> None:
        page = self.ready(width=360, height=640, phone=True)
        self.assertLessEqual(page.evaluate("document.documentElement.scrollWidth"), 360)
        self.assertEqual(page.evaluate("""Array.from(document.querySelectorAll('button, input, select'))
            .filter((part) => part.getBoundingClientRect().width && part.getBoundingClientRect().right > 361
                              && !part.closest('[class*=scroll]')).length"""), 0)
        before = drawn(page)
        self.assertGreater(silhouette(before).mean(), 0.03)
        for kind, x in (("touchStart", 150), ("touchMove", 190), ("touchMove", 240)):
            page.call("Input.dispatchTouchEvent", type=kind, touchPoints=[{"x": x, "y": 200}])
        page.call("Input.dispatchTouchEvent", type="touchEnd", touchPoints=[])
        self.assertGreater((drawn(page) != before).any(axis=2).mean(), 0.02)

    def test_keys(self) -> None:
        page = self.ready()
        page.press("ArrowRight")
        self.assertEqual(page.evaluate("neuralWarp.frame"), 1)
        page.press("ArrowLeft")
        self.assertEqual(page.evaluate("neuralWarp.frame"), 0)
        page.press(" ")
        page.wait_for("neuralWarp.frame > 2")

    def test_a_rig_of_other_nodes_has_no_sliders_and_says_why(self) -> None:
        file = Made.arm.folder / "wave.html"
        wave = ROOT / "examples" / "wave" / "wave.json"
        Made.arm.quarn("view", str(wave), "-o", str(file), "--frames", "1-2", "--quiet")
        page = self.ready(file)
        self.assertEqual(page.evaluate("neuralWarp.sliders"), [])
        why = page.evaluate("neuralWarp.manifest.whyNoSliders")
        self.assertGreater(len(why), 20)
        self.assertIn(why, page.evaluate("document.body.innerText"))
        self.assertTrue(page.evaluate("neuralWarp.verdict.same"))
        self.assertGreater(silhouette(drawn(page)).mean(), 0.03)


class SameTest(PageTest):
    def test_frames_are_those_that_quarn_plays(self) -> None:
        page = self.ready()
        manifest = page.evaluate("neuralWarp.manifest")
        mm = manifest["mmPerUnit"]
        played = {"neural": (Made.arm.play(), manifest["difference"]["largestMm"]),
                  # of which quarn's has other roundings, of a single precision's last bit
                  "skin": (Made.arm.play("--plug", "arm_skin.outputGeom[0]"), 2e-7 * manifest["diagonalMm"]),
                  "target": (Made.arm.play("--plug", "arm_target.outMesh"), manifest["targetErrorMm"])}
        self.assertLess(manifest["difference"]["largestMm"], 1e-6 * manifest["diagonalMm"])
        for frame in range(FRAMES):
            page.evaluate(f"(neuralWarp.showFrame({frame}), 0)")
            for shape, (wanted, limit) in played.items():
                distance = mm * np.linalg.norm(points(page, shape).astype(float) - wanted[frame], axis=1).max()
                self.assertLessEqual(distance, limit * (1 + 1e-6), f"{shape}, frame {frame}")

    def test_sliders_are_the_controls_of_the_scene(self) -> None:
        page = self.ready()
        limit = 1e-6 * page.evaluate("neuralWarp.manifest.diagonalMm / neuralWarp.manifest.mmPerUnit")
        names = page.evaluate("neuralWarp.sliders.map((slider) => slider.name)")
        # what the scene calls them, whatever the page does
        plugs = {"forearm__script_": "forearm__script_.rotate.rotateZ", "rotateX": "hand__script_.rotate.rotateX",
                 "hand__script_.rotateZ": "hand__script_.rotate.rotateZ", HOSTILE[0]: "arm_sliders.slider[0].value",
                 HOSTILE[1]: "arm_sliders.slider[1].value"}
        sliders = {plug: next(name for name in names if part in name) for part, plug in plugs.items()}
        self.assertEqual(sorted(sliders.values()), sorted(names))
        page.evaluate("(neuralWarp.showFrame(2), 0)")
        before = points(page, "neural")
        values = dict(zip(sliders, (1.7, -0.9, 0.35, 0.75, 0.15)))
        for count in (1, len(values)):
            some = dict(list(values.items())[:count])
            for plug, value in some.items():
                page.evaluate(f"(neuralWarp.setSlider({json.dumps(sliders[plug])}, {value}), 0)")
            self.assertGreater(np.abs(points(page, "neural") - before).max(), 100 * limit)
            self.assertLess(np.abs(points(page, "neural") - Made.arm.posed(3, some)).max(), limit)
        page.evaluate("(neuralWarp.showFrame(2), 0)")
        self.assertEqual(points(page, "neural").tobytes(), before.tobytes())

    def test_envelope_goes_from_skin_to_neural(self) -> None:
        page = self.ready()
        page.evaluate("(neuralWarp.showFrame(4), neuralWarp.setEnvelope(0), 0)")
        self.assertEqual(points(page, "neural").tobytes(), points(page, "skin").tobytes())
        page.evaluate("(neuralWarp.setEnvelope(0.5), 0)")
        half = points(page, "neural").astype(float)
        page.evaluate("(neuralWarp.setEnvelope(1), 0)")
        self.assertLess(np.abs(half - (points(page, "neural").astype(float) + points(page, "skin")) / 2).max(), 1e-7)


class ProofTest(PageTest):
    def verdict(self, page: Page) -> Any:
        verdict = page.evaluate("neuralWarp.verdict")
        for sentence in ("native", "deformer"):
            self.assertIn(verdict[sentence], page.evaluate("document.body.innerText"))
        return verdict

    def test_says_that_it_is_whole(self) -> None:
        page = self.ready()
        verdict = self.verdict(page)
        self.assertEqual((verdict["same"], verdict["checks"], verdict["damagedBlocks"]), (True, [True] * 5, []))
        limit = page.evaluate("neuralWarp.manifest.difference.limitMm")
        self.assertAlmostEqual(float(re.findall(r"([\d.e-]+) mm", verdict["deformer"])[-1]), limit, delta=limit / 100)

    def test_finds_a_bit_where_no_frame_looks(self) -> None:
        def in_unused_shape(content: bytearray) -> bytes:
            values = np.frombuffer(content, "<f4").reshape(-1, SHAPES, 3).copy()
            values[300, SHAPES - 1, 1:2].view("u4")[0] ^= 1
            return values.tobytes()
        page = self.ready(self.changed(lambda text: with_block(text, "basis.values", in_unused_shape)))
        verdict = self.verdict(page)
        self.assertEqual((verdict["same"], verdict["checks"], verdict["damagedBlocks"]),
                         (False, [True] * 5, ["basis.values"]))
        self.assertIn("basis.values", verdict["text"])

    def test_finds_a_bit_in_every_block(self) -> None:
        names = [block["name"] for block in manifest_of(Made.page.read_text())["blocks"] if block["bytes"]]
        self.assertGreater(len(names), 30)

        def spoilt(text: str) -> str:
            for name in names:
                text = with_block(text, name, flipped)
            return text
        page = self.open(self.changed(spoilt))
        page.evaluate(READY)
        self.assertEqual(self.verdict(page)["damagedBlocks"], names)

    def test_finds_numbers_that_differ_under_right_sums(self) -> None:
        def other_sum(text: str) -> str:
            manifest = manifest_of(text)
            block = next(block for block in manifest["blocks"] if block["name"] == "check.sums")
            changed = with_block(text, "check.sums", lambda content: bytes([content[0] ^ 1, *content[1:]]))
            found = re.search(r'id="block-check.sums">([^<]*)', changed)
            assert found
            return changed.replace(block["sum"], fnv64(base64.b64decode(found[1])))
        verdict = self.verdict(self.ready(self.changed(other_sum)))
        self.assertEqual((verdict["same"], verdict["checks"], verdict["damagedBlocks"]),
                         (False, [False] + [True] * 4, []))

    def test_a_damaged_page_says_so_and_is_not_blank(self) -> None:
        text = Made.page.read_text()
        damages = {"a block cut short": with_block(text, "frames.matrices", lambda content: bytes(content[:-48])),
                   "no base64": text.replace('id="block-mesh.rest">', 'id="block-mesh.rest">%'),
                   "a block that is not there": text.replace('id="block-skin.points"', 'id="block-skin.pints"'),
                   "cut off": text[:text.index('id="block-skin.weights"') + 200]}
        for what, damaged in damages.items():
            Made.page.with_name("damaged.html").write_text(damaged)
            page = self.open(Made.page.with_name("damaged.html"))
            page.evaluate("window.neuralWarp?.ready")
            shown = page.evaluate("document.body.innerText")
            self.assertRegex(shown, r"(?i)(block|file|page)[^.]*\b(damaged|incomplete|missing|cut|not there)\b", what)
            self.assertGreater(seen(page).std(), 5, what)


def fnv64(content: bytes) -> str:
    """FNV-1a of 64 bits, http://www.isthe.com/chongo/tech/comp/fnv/"""
    value = 0xcbf29ce484222325
    for byte in content:
        value = (value ^ byte) * 0x100000001b3 % 2 ** 64
    return f"{value:016x}"


class DrawingTest(PageTest):
    def test_what_is_seen(self) -> None:
        page = self.ready()
        self.assertEqual(page.evaluate("neuralWarp.renderer"), "webgl2")
        plain = drawn(page)
        self.look_at(plain)
        red, green, blue = ((np.argmax(plain[..., :3], axis=2) == colour) & (np.ptp(plain[..., :3], axis=2) > 60)
                            for colour in range(3))
        self.assertGreater(min(red.mean(), green.mean()), 0.005, "the texture is not seen")
        self.assertLess(blue.mean(), min(red.mean(), green.mean()), "the texture is upside down")
        self.assertGreater(seen(page).std(), 5)
        light = seen(page).mean()
        self.assertGreater(light - seen(self.ready(dark=True)).mean(), 60)

    def look_at(self, picture: np.ndarray) -> None:
        """The subject is large enough, in the middle, and shaded."""
        subject = silhouette(picture)
        self.assertTrue(0.02 < subject.mean() < 0.8, f"{subject.mean():.1%} of the picture")
        rows, columns = np.nonzero(subject)
        for place, size in ((rows, subject.shape[0]), (columns, subject.shape[1])):
            self.assertTrue(0.3 * size < (place.min() + place.max()) / 2 < 0.7 * size, f"from {place.min()} on")
            self.assertTrue(place.min() > 0 and place.max() < size - 1, "it is cut off")
        self.assertGreater(picture[subject].std(), 8)

    def test_modes_and_heat(self) -> None:
        for address in ("", "#raster"):
            page = self.ready(Made.page.as_uri() + address, width=1000, height=700)
            page.evaluate("(neuralWarp.showFrame(4), neuralWarp.draw(), 0)")
            page.press("a")  # fits it into the picture
            pictures = {}
            for mode in ("skin", "target", "neural"):
                page.evaluate(f"(neuralWarp.setMode('{mode}'), 0)")
                pictures[mode] = drawn(page)
                self.look_at(pictures[mode])
            page.evaluate("(neuralWarp.setMode('split'), neuralWarp.setSplit(0.5), 0)")
            split, middle = drawn(page), pictures["skin"].shape[1] // 2
            halves = {"skin": np.s_[:, :middle - 3], "neural": np.s_[:, middle + 3:]}
            for mode, half in halves.items():
                self.assertEqual(np.abs(split[half] - pictures[mode][half]).max(), 0, f"{address} {mode}")
                self.assertGreater((pictures["skin"][half] != pictures["neural"][half]).mean(), 0.002)
            page.evaluate("(neuralWarp.setMode('neural'), 0)")
            for heat in ("before", "after"):
                page.evaluate(f"(neuralWarp.setHeat('{heat}'), 0)")
                pictures[heat] = drawn(page)
                self.look_at(pictures[heat])
            for one, other in (("neural", "after"), ("before", "after")):
                different = np.abs(pictures[one] - pictures[other]).max(axis=2) > 20
                self.assertGreater(different.mean(), 0.02, f"{address} {one} {other}")

    def test_without_webgl_the_same_is_seen(self) -> None:
        webgl = self.ready(width=700, height=500)
        none = "HTMLCanvasElement.prototype.getContext = ((of) => function (kind, ...more) { return" \
               " /webgl/.test(kind) ? null : of.call(this, kind, ...more); })(HTMLCanvasElement.prototype.getContext)"
        webgl.evaluate("(neuralWarp.setTextures(false), 0)")  # which the processor does not draw
        pictures = [drawn(webgl)]
        for how in ({"file": Made.page.as_uri() + "#raster"}, {"script": none}):
            page = self.ready(width=700, height=500, **how)
            self.assertEqual(page.evaluate("neuralWarp.renderer"), "raster")
            self.assertEqual(page.complaints, [])
            pictures.append(drawn(page))
            one, other = silhouette(pictures[0]), silhouette(pictures[-1])
            self.assertEqual(one.shape, other.shape)
            self.assertGreater((one & other).sum() / (one | other).sum(), 0.95)
            both = one & other
            self.assertLess(np.abs(pictures[0] - pictures[-1])[both].mean(), 25)

    def test_a_thousand_frames_take_no_memory(self) -> None:
        page = self.ready(width=400, height=300)
        play = """(() => { for (let i = 0; i < %d; ++i) {
            neuralWarp.showFrame(i %% neuralWarp.manifest.frames.length);
            if (i %% 7 === 0) neuralWarp.setSlider(neuralWarp.sliders[i %% 3].name, 0.1);
            neuralWarp.setMode(['neural', 'skin', 'target', 'split'][i %% 4]);
            neuralWarp.setHeat(['off', 'before', 'after'][i %% 3]);
            neuralWarp.draw();
        } })()"""
        page.evaluate(play % 240)  # until the browser has compiled what it will
        before, heap = page.evaluate("neuralWarp.memory()"), page.heap_bytes()
        self.assertGreater(min(before.values()), 0)
        page.evaluate(play % 1000)
        self.assertEqual(page.evaluate("neuralWarp.memory()"), before)
        self.assertLess(page.heap_bytes() - heap, 5e5)


if __name__ == "__main__":
    unittest.main()
