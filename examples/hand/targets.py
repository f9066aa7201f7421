#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Makes target shapes that linear skinning cannot reach: the posed skin, relaxed as an elastic surface that keeps its
volume where it bends. Frames in, as many frames out; the result does not depend on --jobs."""

import argparse
import os
import signal
import sys
import tempfile
from typing import BinaryIO

# a process is one thread: sums are made in one order, and jobs stay out of each other's way
for variable in ("OMP_NUM_THREADS", "OPENBLAS_NUM_THREADS", "MKL_NUM_THREADS"):
    os.environ[variable] = "1"

from concurrent.futures import ProcessPoolExecutor  # noqa: E402
from concurrent.futures.process import BrokenProcessPool  # noqa: E402

import numpy as np  # noqa: E402
from relaxation import Relaxation  # noqa: E402
from skinned_mesh import BadInput, SkinnedMesh, read_skinned_mesh  # noqa: E402

CHUNK = 8  # frames that a process takes at once
LINES = 20  # of progress, where there is no terminal


def main() -> None:
    arguments = parse_arguments()
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(143))
    try:
        mesh = read_skinned_mesh(arguments.scene, arguments.mesh)
        skin = open_skin(arguments.skin, mesh)
        write_targets(mesh, arguments.skin, len(skin), arguments)
    except BadInput as error:
        sys.exit(f"targets.py: {error}")
    except OSError as error:
        sys.exit(f"targets.py: {error.filename or arguments.output}: {error.strerror}")
    except BrokenProcessPool:
        sys.exit("targets.py: one of the processes was ended from outside; fewer --jobs need less memory")
    except KeyboardInterrupt:
        sys.exit(130)


def parse_arguments() -> argparse.Namespace:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("scene", metavar="SCENE", help="scene file with the mesh at rest and its skinCluster")
    parser.add_argument("skin", metavar="SKIN.npy", help="the posed skin, [frames, vertices, 3] float32, object space")
    parser.add_argument("-o", "--output", metavar="TARGETS.npy", required=True, help="the file to write, shaped alike")
    parser.add_argument("--mesh", metavar="NAME", help="which mesh, where the scene has several skinned ones")
    parser.add_argument("--jobs", metavar="N", type=positive, default=len(os.sched_getaffinity(0)),
                        help="processes; default one a core")
    parser.add_argument("--quiet", action="store_true", help="no progress, no summary")
    return parser.parse_args()


def positive(text: str) -> int:
    if not text.isdecimal() or int(text) == 0:
        raise argparse.ArgumentTypeError(f"'{text}' is not a whole number of at least 1")
    return int(text)


def open_skin(path: str, mesh: SkinnedMesh) -> np.memmap:
    """The file as an array that is read as it is used. Raises BadInput where it does not fit the mesh."""
    try:
        skin = np.load(path, mmap_mode="r", allow_pickle=False)
    except (ValueError, EOFError) as error:
        raise BadInput(f"{path}: not a NumPy array file, or cut short ({error})") from error
    if skin.ndim != 3 or skin.shape[2] != 3 or skin.dtype.str != "<f4":
        raise BadInput(f"{path}: has the shape {list(skin.shape)} of {skin.dtype.str}, "
                       "not [frames, vertices, 3] of <f4")
    if skin.shape[1] != len(mesh.points):
        raise BadInput(f"{path}: has {skin.shape[1]} vertices, but mesh '{mesh.name}' has {len(mesh.points)}; "
                       "bake the skin from the same scene")
    if len(skin) == 0:
        raise BadInput(f"{path}: has no frames")
    return skin


# --- the processes ---

class Worker:
    """What a process keeps between its chunks."""

    relaxation: Relaxation
    skin: np.memmap


def start_worker(mesh: SkinnedMesh, path: str) -> None:
    signal.signal(signal.SIGINT, signal.SIG_IGN)  # the process that has started this one ends it
    signal.signal(signal.SIGTERM, signal.SIG_DFL)
    Worker.relaxation = Relaxation(mesh)
    Worker.skin = open_skin(path, mesh)


def relax_chunk(first: int) -> tuple[np.ndarray, float, float]:
    """The relaxed frames from `first` on; of the distances that vertices moved the sum and the largest."""
    skin = np.array(Worker.skin[first:first + CHUNK], dtype=float)
    if not np.isfinite(skin).all():
        bad = first + int(np.argmin(np.isfinite(skin).all(axis=(1, 2))))
        raise BadInput(f"{Worker.skin.filename}: frame {bad} (counted from 0) has positions that are not finite")
    relaxed = np.stack([Worker.relaxation.relax(frame) for frame in skin])
    distances = np.linalg.norm(relaxed - skin, axis=2)
    return relaxed.astype("<f4"), distances.sum(), distances.max()


# --- the file ---

def write_targets(mesh: SkinnedMesh, skin_path: str, frame_count: int, arguments: argparse.Namespace) -> None:
    """The output appears when it is complete, or not at all."""
    folder, name = os.path.split(os.path.abspath(arguments.output))
    if not os.path.isdir(folder):
        raise BadInput(f"{folder}: there is no such folder")
    handle, part = tempfile.mkstemp(prefix=f".{name}.", suffix=".part", dir=folder)
    try:
        with os.fdopen(handle, "wb") as file:
            shape = (frame_count, len(mesh.points), 3)
            np.lib.format.write_array_header_1_0(file, {"descr": "<f4", "fortran_order": False, "shape": shape})
            total, largest = write_frames(file, mesh, skin_path, frame_count, arguments)
        os.chmod(part, 0o666 & ~current_umask())
        os.replace(part, arguments.output)
    finally:
        if os.path.exists(part):
            os.unlink(part)
    if not arguments.quiet:
        mean = total / frame_count / len(mesh.points)
        print(f"{arguments.output}: {frame_count} frames of {len(mesh.points)} vertices, {mean:.3g} from the skin "
              f"in the mean, {largest:.3g} at most (scene units)")


def write_frames(file: BinaryIO, mesh: SkinnedMesh, skin_path: str, frame_count: int,
                 arguments: argparse.Namespace) -> tuple[float, float]:
    total, largest, done = 0.0, 0.0, 0
    pool = ProcessPoolExecutor(arguments.jobs, initializer=start_worker, initargs=(mesh, skin_path))
    try:
        for frames, distance_sum, distance_max in pool.map(relax_chunk, range(0, frame_count, CHUNK)):
            file.write(frames.tobytes())
            total, largest, done = total + distance_sum, max(largest, distance_max), done + len(frames)
            show_progress(done, frame_count, arguments.quiet)
    finally:
        pool.shutdown(cancel_futures=True)
    return total, largest


def show_progress(done: int, count: int, quiet: bool) -> None:
    """On a terminal one line that changes, elsewhere about twenty."""
    if not quiet and sys.stderr.isatty():
        print(f"\rrelaxing: {done} of {count}", end="\n" if done == count else "", file=sys.stderr, flush=True)
    elif not quiet and (done * LINES // count > (done - CHUNK) * LINES // count or done == count):
        print(f"relaxing: {done} of {count}", flush=True)


def current_umask() -> int:
    mask = os.umask(0)
    os.umask(mask)
    return mask


if __name__ == "__main__":
    main()
