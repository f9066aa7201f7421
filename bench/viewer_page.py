# SPDX-License-Identifier: Apache-2.0
"""How long a page of `quarn view` takes to open, in headless Chromium: from the navigation to the first frame that is
drawn, and to the verdict of its check; and what a frame takes in it, in the median of as many as it has.

usage: viewer_page.py PAGE.html... [--runs N] [--raster]
"""

import argparse
import pathlib
import statistics
import sys
from typing import Dict, List

ROOT = pathlib.Path(__file__).resolve().parent.parent
sys.path.insert(0, str(ROOT / "tests" / "clients" / "viewer" / "browser"))

from chromium import Chromium  # noqa: E402

# milliseconds a frame, computed alone and computed and drawn; gl.finish has the picture done
FRAMES = """(() => {
    const gl = document.querySelector('#canvas canvas').getContext('webgl2');
    const pixel = new Uint8Array(4);
    const times = {compute: [], draw: []};
    for (let i = 0; i < neuralWarp.manifest.frames.length; ++i) {
        const start = performance.now();
        neuralWarp.showFrame(i);
        neuralWarp.points('neural');
        const computed = performance.now();
        neuralWarp.draw();
        gl?.readPixels(0, 0, 1, 1, gl.RGBA, gl.UNSIGNED_BYTE, pixel);
        times.compute.push(computed - start);
        times.draw.push(performance.now() - computed);
    }
    return times;
})()"""


def measured(browser: Chromium, address: str) -> Dict[str, float]:
    """Milliseconds of one opening, and of its frames."""
    page = browser.open(address, width=1280, height=800)
    if not page.evaluate("neuralWarp.ready.then(() => neuralWarp.verdict.same)"):
        sys.exit(f"viewer_page.py: {address}: {page.evaluate('neuralWarp.verdict?.text ?? neuralWarp.error')}")
    timings = page.evaluate("neuralWarp.timings")
    frames = page.evaluate(FRAMES)
    page.close()
    return {"first frame": timings["navigationToFirstFrameMs"], "verdict": timings["toVerdictMs"],
            "compute": statistics.median(frames["compute"]), "draw": statistics.median(frames["draw"])}


def row(address: str, file: pathlib.Path, runs: int) -> str:
    times: Dict[str, List[float]] = {}
    with Chromium() as browser:
        cold = measured(browser, address)
        for _ in range(runs):
            for name, time in measured(browser, address).items():
                times.setdefault(name, []).append(time)
    cells = [file.name, f"{file.stat().st_size / 1e6:.2f}"]
    for name in ("first frame", "verdict"):
        cells.append(f"{statistics.median(times[name]):.0f} ({min(times[name]):.0f}-{max(times[name]):.0f}; "
                     f"first {cold[name]:.0f})")
    return " | ".join(cells + [f"{statistics.median(times[name]):.2f}" for name in ("compute", "draw")])


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("pages", nargs="+", type=pathlib.Path, metavar="PAGE.html")
    parser.add_argument("--runs", type=int, default=5, help="openings, whose median is printed")
    parser.add_argument("--raster", action="store_true", help="without WebGL")
    arguments = parser.parse_args()
    print("page | MB | first frame, ms | verdict, ms | compute a frame, ms | draw a frame, ms")
    print("--- | --- | --- | --- | --- | ---")
    for file in arguments.pages:
        print(row(file.resolve().as_uri() + ("#raster" if arguments.raster else ""), file, arguments.runs))


if __name__ == "__main__":
    main()
