# SPDX-License-Identifier: Apache-2.0
"""Reads a training data set, and believes none of it until it is checked."""

import hashlib
import json
import mmap
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Iterator, Optional, Union

import numpy as np

from .errors import LockedByAnother, TrainerError
from .files import is_claimed
from .sequence import drawn_rows
from .settings import Settings, read_settings

FORMAT, VERSION = "neuralWarp training data", 1
BLOCK_BYTES = 64 << 20  # what is read of a file at once
DESCRIPTION_LIMIT = 1 << 30
LARGEST_COUNT = 2**31 - 1


@dataclass(frozen=True)
class Dataset:
    """A data set whose description and arrays agree. Lengths are in scene units."""

    folder: Path
    description: dict[str, Any]  # dataset.json
    settings: Settings     # its "train"
    controls: np.ndarray   # float32 [F, C]
    deltas: np.ndarray     # float32 [F, 3 * D], mapped from the file
    frames: np.ndarray     # int32 [F]
    digest: str            # SHA-256 of the description and these three files
    drawn: np.ndarray      # bool [F]: rows that are independent of their neighbours; the others are a motion's
    skin: Optional[np.ndarray] = None  # float32 [F, D], mapped: how far the skin is from the target; older sets lack it

    @property
    def frame_count(self) -> int:
        return self.controls.shape[0]

    @property
    def control_count(self) -> int:
        return self.controls.shape[1]

    @property
    def delta_count(self) -> int:
        return self.deltas.shape[1] // 3

    def vertex(self, slot: int) -> int:
        """Index in the whole mesh of the vertex that a slot of the deltas belongs to."""
        return self.description["affectMap"][slot] if self.description["subsetState"] == "partial" else slot

    def blocks(self, rows: np.ndarray, size: Optional[int] = None) -> Iterator[tuple[np.ndarray, np.ndarray]]:
        """The deltas of `rows` in blocks of `size` bytes: pairs of row indices and float32 [rows, 3 * D]."""
        step = max(1, (size or BLOCK_BYTES) // (4 * max(1, self.deltas.shape[1])))
        for first in range(0, len(rows), step):
            part = rows[first:first + step]
            yield part, np.asarray(self.deltas[part])
            release(self.deltas)


def load_dataset(place: Union[str, Path]) -> Dataset:
    folder = Path(place)
    path = folder / "dataset.json"
    if not path.is_file() and is_claimed(Path(f"{folder}.part")):
        raise LockedByAnother(f"{folder} is not complete yet, and another process is writing it: wait for it")
    if not path.is_file():
        raise TrainerError(f"{folder} is not a training data set: it has no dataset.json"
                           + (" (only a complete one has)" if folder.is_dir() else ""))
    text = read_bounded(path)
    description = parse(text, path)
    check_description(description, path)
    frames, controls = description["frameCount"], description["controlCount"]
    deltas = description["deltaCount"]
    arrays = {name: open_array(array_path(description, folder, name, path), kind, shape) for name, kind, shape in (
        ("controls", "<f4", (frames, controls)), ("deltas", "<f4", (frames, deltas, 3)), ("frames", "<i4", (frames,)))}
    digest = hashlib.sha256(text)
    for name in ("controls", "deltas", "frames"):
        check_and_digest(arrays[name], folder / description["files"][name], arrays["frames"], digest)
    numbers, frame_of = np.array(arrays["controls"]), np.array(arrays["frames"])
    return Dataset(folder, description, read_settings(description.get("train", {}), f"{path}: train"), numbers,
                   arrays["deltas"].reshape(frames, -1), frame_of, digest.hexdigest(),
                   drawn_rows(description, numbers, frame_of, path), open_skin(description, folder, frame_of, path))


# --- dataset.json ---

def read_bounded(path: Path) -> bytes:
    if path.stat().st_size > DESCRIPTION_LIMIT:
        raise TrainerError(f"{path} has {path.stat().st_size} bytes, more than the {DESCRIPTION_LIMIT} it may have")
    return path.read_bytes()


def parse(text: bytes, path: Path) -> dict[str, Any]:
    try:
        description = json.loads(text)
    except (ValueError, RecursionError) as error:
        raise TrainerError(f"{path} is not JSON: {error}") from error
    if not isinstance(description, dict):
        raise TrainerError(f"{path} is not a JSON object")
    return description


def check_description(description: dict[str, Any], path: Path) -> None:
    def require(fits: bool, key: str, wanted: str) -> None:
        if not fits:
            value = repr(description.get(key, "missing"))
            shown = value if len(value) < 60 else value[:57] + "..."
            raise TrainerError(f"{path}: {key} is {shown}, not {wanted}")

    def is_count(value: object, low: int, high: int) -> bool:
        return isinstance(value, int) and not isinstance(value, bool) and low <= value <= high

    def is_number(value: object) -> bool:
        return isinstance(value, (int, float)) and not isinstance(value, bool) and 0 <= value < float("inf")

    get = description.get
    require(get("format") == FORMAT, "format", repr(FORMAT))
    require(get("version") == VERSION, "version", f"{VERSION}, the one this trainer reads")
    for key, low in (("frameCount", 1), ("controlCount", 1), ("deltaCount", 0), ("affectCount", 0), ("fullCount", 0)):
        require(is_count(get(key), low, LARGEST_COUNT), key, f"a whole number from {low}")
    require(is_count(get("deltaMode"), 0, 1), "deltaMode", "0 (Offset) or 1 (Surface)")
    require(is_count(get("smoothingIterations"), 0, LARGEST_COUNT), "smoothingIterations", "a whole number from 0")
    require(get("subsetState") in ("complete", "partial", "empty"), "subsetState", "complete, partial or empty")
    require(get("affectCount") == get("deltaCount"), "affectCount", f"the {get('deltaCount')} of deltaCount")
    if get("subsetState") == "empty":
        require(get("deltaCount") == 0, "deltaCount", "0, which an empty subset has")
    if get("subsetState") == "complete":
        require(get("deltaCount") == get("fullCount"), "deltaCount",
                f"the {get('fullCount')} of fullCount, which a complete subset has")
    if get("subsetState") == "partial":
        check_affect_map(get("affectMap"), get("deltaCount"), get("fullCount"), path)
    for key in ("geometry", "componentTagExpression"):
        require(isinstance(get(key), str), key, "a text")
    for key in ("metersPerUnit", "boundingBoxDiagonal"):
        require(is_number(get(key)), key, "a number from 0")
    names = get("controlNames")
    require(isinstance(names, list) and len(names) == get("controlCount") and all(isinstance(n, str) for n in names),
            "controlNames", f"a list of {get('controlCount')} texts")
    require(isinstance(get("files"), dict), "files", "an object that names the three arrays")


def check_affect_map(indices: object, delta_count: Any, full_count: Any, path: Path) -> None:
    if not isinstance(indices, list) or len(indices) != delta_count:
        found = f"has {len(indices)} entries" if isinstance(indices, list) else "is not a list"
        raise TrainerError(f"{path}: affectMap {found}, and a partial subset has the {delta_count} of deltaCount")
    for slot, index in enumerate(indices):
        if not isinstance(index, int) or isinstance(index, bool) or not 0 <= index < full_count:
            raise TrainerError(f"{path}: affectMap[{slot}] is {index!r}, not a vertex below fullCount {full_count}")
    if len(set(indices)) != len(indices):
        raise TrainerError(f"{path}: affectMap names a vertex twice")


# --- the arrays ---

def release(array: Any) -> None:
    """Gives back the memory of what was read of a mapped file; the system may still have it at hand."""
    for part in getattr(array, "parts", (array,)):
        mapped = getattr(part, "_mmap", None)
        if mapped is not None:
            mapped.madvise(mmap.MADV_DONTNEED)


def array_path(description: dict[str, Any], folder: Path, name: str, path: Path) -> Path:
    value = description["files"].get(name)
    if not isinstance(value, str) or not value or Path(value).name != value:
        raise TrainerError(f"{path}: files.{name} is {value!r}, not the name of a file beside it")
    return folder / value


def open_array(path: Path, kind: str, shape: tuple[int, ...]) -> np.memmap:
    """The array of a .npy file, mapped. Only that kind and shape in C order, and not a byte more or less."""
    if not path.is_file():
        raise TrainerError(f"{path} is missing")
    try:
        array = np.load(path, mmap_mode="r", allow_pickle=False)
    except (ValueError, EOFError, OSError, OverflowError, SyntaxError) as error:
        raise TrainerError(f"{path} is not a whole .npy file: {error}") from error
    if not isinstance(array, np.memmap) or array.dtype != np.dtype(kind) or not array.flags.c_contiguous:
        raise TrainerError(f"{path} holds {getattr(array, 'dtype', 'no array')}, not {np.dtype(kind)} in C order")
    if array.shape != shape:
        raise TrainerError(f"{path} has the shape {list(array.shape)}, not the {list(shape)} of dataset.json")
    surplus = path.stat().st_size - array.offset - array.nbytes
    if surplus:
        raise TrainerError(f"{path} has {surplus} bytes after its array")
    return array


def open_skin(description: dict[str, Any], folder: Path, frames: np.ndarray, path: Path) -> Optional[np.memmap]:
    """The distances of the skin, which no model depends on: they are in no digest."""
    if "skin" not in description["files"]:
        return None
    place = array_path(description, folder, "skin", path)
    skin = open_array(place, "<f4", (description["frameCount"], description["deltaCount"]))
    check_and_digest(skin, place, frames, hashlib.sha256())
    return skin


def check_and_digest(array: np.ndarray, path: Path, frames: np.ndarray, digest: "hashlib._Hash") -> None:
    """Adds the array's bytes to the digest, a block at a time, and looks for numbers that are none."""
    row_bytes = max(1, array.nbytes // len(array))
    step = max(1, BLOCK_BYTES // row_bytes)
    for first in range(0, len(array), step):
        block = np.ascontiguousarray(array[first:first + step])
        digest.update(block.data)
        release(array)
        if not np.isfinite(block).all():
            row, *where = np.argwhere(~np.isfinite(block))[0]
            names = ("vertex", "axis") if len(where) == 2 else ("control",)
            place = ", ".join(f"{name} {at}" for name, at in zip(names, where))
            raise TrainerError(f"{path}: frame {frames[first + row]} (row {first + row}), {place} is "
                               f"{block[(row, *where)]}, not a finite number")
