# SPDX-License-Identifier: Apache-2.0
"""A part of targets: prepares what a target program needs, asks it, checks what it wrote, and puts that into its place.
What the program is told and owes is on docs/run.md; it is the same as of quarn run --target-command."""

import argparse
import contextlib
import fcntl
import json
import os
import shlex
import shutil
import signal
import subprocess
import sys
import tempfile
from pathlib import Path
from types import FrameType
from typing import Any, Iterator, Optional

from .. import codes, facts, npy
from ..errors import FarmError, LockedByAnother
from ..plan import write_whole
from .target_scene import Scene, read_scene

GRACE = 10  # seconds between SIGTERM and SIGKILL


def main(words: Optional[list[str]] = None) -> int:
    """The program: one part, and the status of it."""
    own, program = split_program(sys.argv[1:] if words is None else words)
    options = parser().parse_args(own)
    options.program = program
    signal.signal(signal.SIGTERM, on_terminate)
    try:
        with lock_of(Path(f"{options.output}.part")) as folder:
            if not options.output.exists():
                Part(options, folder).make()
            shutil.rmtree(folder)
        return codes.DONE
    except (FarmError, OSError) as error:
        print(f"neuralwarp-farm: {error}", file=sys.stderr)
        return codes.LOCKED if isinstance(error, LockedByAnother) else codes.FAILED
    except KeyboardInterrupt:
        return codes.INTERRUPTED
    except Terminated:
        return codes.TERMINATED


def parser() -> argparse.ArgumentParser:
    made = argparse.ArgumentParser(prog="target_part", allow_abbrev=False)
    made.add_argument("--quarn", required=True)
    made.add_argument("--scene", required=True, type=Path)
    made.add_argument("--deformer", required=True)
    made.add_argument("--geometry", required=True)
    made.add_argument("--order", required=True)
    made.add_argument("--first", required=True, type=int)
    made.add_argument("--last", required=True, type=int)
    made.add_argument("--whole", required=True, type=int, nargs=2)
    made.add_argument("--preroll", required=True, type=int)
    made.add_argument("--seam", action="store_true")
    made.add_argument("--threads", required=True)
    made.add_argument("--output", required=True, type=Path)
    return made


def split_program(words: list[str]) -> tuple[list[str], list[str]]:
    """What stands before the first "--", and the program behind it, which may have a "--" of its own."""
    place = words.index("--")
    return words[:place], words[place + 1:]


class Terminated(BaseException):
    """The process was asked to end (SIGTERM)."""


def on_terminate(number: int, frame: Optional[FrameType]) -> None:
    raise Terminated


@contextlib.contextmanager
def lock_of(folder: Path) -> Iterator[Path]:
    """The folder of a part at work, this process' own until the end."""
    folder.mkdir(parents=True, exist_ok=True)
    with (folder / "lock").open("a+b") as file:
        try:
            fcntl.flock(file, fcntl.LOCK_EX | fcntl.LOCK_NB)
        except BlockingIOError:
            raise LockedByAnother(f"another process is writing {folder}; try again when it is done") from None
        yield folder


class Part:
    def __init__(self, options: argparse.Namespace, folder: Path) -> None:
        self.options, self.folder = options, folder
        self.scene: Scene = read_scene(options.scene, options.deformer, options.geometry)
        first, last = options.whole
        # what a program may look at that carries something from frame to frame, and the frame behind the seam
        self.first_seen = max(first, options.first - options.preroll)
        self.last_asked = min(last, options.last + 1) if options.seam else options.last

    def make(self) -> None:
        self.prepare()
        for left in self.folder.glob("scratch.*"):
            shutil.rmtree(left, ignore_errors=True)
        # of an own name: a program that outlived its parent writes into a folder that is gone
        scratch = Path(tempfile.mkdtemp(prefix="scratch.", dir=self.folder))
        try:
            answer = scratch / "targets.npy"
            request = scratch / "request.json"
            request.write_text(json.dumps(self.request(answer)) + "\n", encoding="utf-8")
            self.run([*self.options.program, str(request)], scratch)
            self.take(answer)
        finally:
            shutil.rmtree(scratch, ignore_errors=True)

    # --- what the program needs ---

    def prepare(self) -> None:
        """The posed skin, the mesh at rest and the skeleton with a key a frame, by the commands that quarn run uses."""
        span = f"{self.first_seen}-{self.last_asked}"
        mesh = ["--no-model", "--deformer", self.options.deformer, "--geometry", self.options.geometry, "--order",
                self.options.order, "--threads", self.options.threads, "--quiet"]
        scene = str(self.options.scene)
        self.quarn("skin.npy", ["play", scene, "--plug", self.scene.skin, "--frames", span, *mesh], "-o")
        self.quarn("rest.npy", ["play", scene, "--plug", self.scene.rest, "--frames",
                                f"{self.first_seen}-{self.first_seen}", *mesh], "-o")
        self.quarn("skeleton.glb", ["pose", scene, "--frames", span, "--quiet"], "--write")

    def quarn(self, name: str, words: list[str], flag: str) -> None:
        """Makes a file where an earlier attempt has not: quarn writes whole ones."""
        if (self.folder / name).exists():
            return
        self.run([self.options.quarn, *words, flag, str(self.folder / name)], self.folder)

    def request(self, answer: Path) -> dict[str, Any]:
        skin = npy.read_head(self.folder / "skin.npy")
        return {"format": "neuralWarp target request", "version": 1,
                "mesh": self.options.geometry, "character": self.scene.character,
                "skeleton": {"file": str(self.folder / "skeleton.glb"), "format": "glb"},
                "scene": str(self.options.scene),
                "skin": {"file": str(skin.path), "format": "npy <f4", "shape": [skin.frames, skin.vertices, 3],
                         "firstFrame": self.first_seen, "metersPerUnit": self.scene.meters_per_unit,
                         "axes": "as in the character's file", "order": self.options.order,
                         "rest": str(self.folder / "rest.npy")},
                "frames": list(range(self.options.first, self.last_asked + 1)), "write": str(answer)}

    # --- the program ---

    @staticmethod
    def run(words: list[str], folder: Path) -> None:
        """In a group of its own, which ends as a whole with this process."""
        try:
            process = subprocess.Popen(words, cwd=folder, stdin=subprocess.DEVNULL, start_new_session=True)
        except OSError as error:
            raise FarmError(f"{words[0]} could not be started: {error.strerror}") from error
        try:
            status = process.wait()
        except BaseException:
            end_group(process)
            raise
        if status != 0:
            how = f"was ended by signal {-status}" if status < 0 else f"ended with status {status}"
            kind = LockedByAnother if status == codes.LOCKED else FarmError  # no licence is free, say
            raise kind(f"{words[0]} {how}; what it said is above")

    # --- what came of it ---

    def take(self, answer: Path) -> None:
        if not answer.is_file() or answer.is_symlink():
            raise FarmError(f"{self.options.program[0]} ended with status 0, and has not written the file that it was "
                            "asked for")
        cache, skin = npy.read_head(answer), npy.read_head(self.folder / "skin.npy")
        asked = self.last_asked - self.options.first + 1
        if (cache.frames, cache.vertices) != (asked, skin.vertices):
            raise FarmError(f"{self.options.program[0]} wrote an array of [{cache.frames}, {cache.vertices}, 3], and "
                            f"was asked for [{asked}, {skin.vertices}, 3]")
        points, sums = self.folder / "points.npy", []
        frames = self.options.last - self.options.first + 1
        with points.open("wb") as file:
            npy.write_head(file, frames, cache.vertices)
            for number, row in enumerate(npy.rows(cache)):
                if number in (0, frames):
                    sums.append(npy.sum_of(row))
                if number < frames:
                    file.write(row)
            file.flush()
            os.fsync(file.fileno())
        record = json.dumps(self.record(*sums), indent=1) + "\n"
        write_whole(Path(f"{self.options.output}.part.json"), record)  # before what says that the part is done
        os.replace(points, self.options.output)

    def record(self, first_sum: str, next_sum: Optional[str] = None) -> dict[str, Any]:
        options = self.options
        setup = {"scene": npy.sum_of(options.scene.read_bytes()), "deformer": options.deformer,
                 "geometry": options.geometry, "order": options.order, "program": shlex.join(options.program),
                 "preroll": str(options.preroll)}
        build = facts.build_of(options.quarn)
        return {"format": "neuralWarp part", "version": 1, "build": build.build, "quarn": build.version,
                "instructionSet": build.instruction_set, "frames": f"{options.first}-{options.last}",
                "of": "{}-{}".format(*options.whole), "firstSum": first_sum, "nextSum": next_sum,
                "setupSum": npy.sum_of(json.dumps(setup, sort_keys=True).encode()), "setup": setup}


def end_group(process: "subprocess.Popen[bytes]") -> None:
    """SIGTERM, and SIGKILL for what is left of it then."""
    with contextlib.suppress(ProcessLookupError, subprocess.TimeoutExpired):
        os.killpg(process.pid, signal.SIGTERM)
        process.wait(GRACE)
    with contextlib.suppress(ProcessLookupError):
        os.killpg(process.pid, signal.SIGKILL)
    process.wait()


if __name__ == "__main__":
    sys.exit(main())
