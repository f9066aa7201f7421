# SPDX-License-Identifier: Apache-2.0
"""Whether a training goes on from a checkpoint, and what has to be the same for that."""

import hashlib
from contextlib import suppress
from pathlib import Path
from typing import Any, Callable, Optional

import numpy as np
import torch

from . import __version__
from .checkpoint import Checkpoints, check_identity, is_there, read_description
from .dataset import Dataset
from .errors import TrainerError
from .files import sibling
from .settings import WITHOUT_EFFECT, Settings
from .training import Split, TargetsOf

ANEW, RESUME, IF_FITS = "anew", "resume", "if fits"
EVERY = 60.0     # seconds from one checkpoint to the next, where nobody says otherwise
LOOKED_AT = 64   # rows of the targets that tell these from others


def checkpoint_path(model: Path) -> Path:
    return model.with_suffix(".checkpoint")


def discard(model: Path) -> None:
    """The checkpoint of a model that is done."""
    path = checkpoint_path(model)
    for one in (path, sibling(path, ".part")):
        with suppress(OSError):
            one.unlink()


def open_checkpoints(path: Path, identity: dict[str, Any], every: float, wish: str,
                     say: Callable[[str], None]) -> Checkpoints:
    """Where checkpoints go, and whether the training goes on from the one there, for a wish: one of those above."""
    there = is_there(path)
    resumed = wish != ANEW and there and fits(path, identity, wish, say)
    if wish == RESUME and not there:
        say(f"there is no {path} to go on from: the training begins anew")
    if wish == ANEW and there:
        say(f"{path} is of a training that was interrupted, and this one takes its place; --resume would go on with "
            "that one")
    return Checkpoints(path, identity, every, say, resumed)


def fits(path: Path, identity: dict[str, Any], wish: str, say: Callable[[str], None]) -> bool:
    try:
        check_identity(read_description(path).get("identity"), identity, path)
    except TrainerError as error:
        if wish == RESUME:
            raise TrainerError(f"{error}; without --resume the training begins anew") from error
        say(f"the training begins anew, as {error}")
        return False
    return True


def identity_of(dataset: Dataset, validation: Optional[Dataset], settings: Settings, seed: int, threads: int,
                device: str, first: Optional[str]) -> dict[str, Any]:
    """What a training is asked for, in the order in which a user would look for a difference.

    validation: another data set for that; device: as Device.kind; first: what the network begins with, if not with
    random numbers"""
    held = None if validation is None else f"sha256:{validation.digest}"
    return {"data set": f"sha256:{dataset.digest}", "validation set": held, "seed": seed,
            **{name: value for name, value in vars(settings).items() if name not in WITHOUT_EFFECT},
            "number of threads": threads, "device": device, "first network": first, "trainer": __version__,
            "PyTorch": str(torch.__version__), "NumPy": np.__version__}


def digest_of(inputs: np.ndarray, targets_of: TargetsOf, split: Split) -> str:
    """Of what the network learns. Shapes of another processor are others: in their last bits, or altogether."""
    digest = hashlib.sha256()
    for array in (inputs, split.train, split.again, split.validation, targets_of(split.train[:LOOKED_AT])):
        digest.update(np.ascontiguousarray(array).data)
    return digest.hexdigest()
