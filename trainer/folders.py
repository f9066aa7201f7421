# SPDX-License-Identifier: Apache-2.0
"""Data sets below a folder, and what their models are called."""

import os
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Optional, Union

from .dataset import parse, read_bounded
from .errors import TrainerError
from .measure import before

DESCRIPTION = "dataset.json"  # only a complete data set has one


@dataclass(frozen=True)
class Work:
    """A data set that is to become a model."""

    folder: Path
    label: str            # how its folder is called from the one that was given
    name: Optional[str]   # of the model; None where the description cannot be read
    why: str = ""         # why it cannot


def sets_below(place: Union[str, Path]) -> list[Path]:
    """Data sets in the folders below, in order of their paths. None when the folder is one itself, or is no folder."""
    found: list[Path] = []
    if (Path(place) / DESCRIPTION).is_file():
        return found
    for folder, folders, files in os.walk(place):
        folders[:] = sorted(name for name in folders if not name.endswith(".part"))
        if DESCRIPTION in files:
            folders.clear()
            found.append(Path(folder))
    return found


def works_of(place: Union[str, Path], folders: list[Path]) -> list[Work]:
    """What is to be done with the data sets below `place`. Two that would become the same model are an error."""
    works = [work_of(folder, str(folder.relative_to(place))) for folder in folders]
    taken: dict[str, Work] = {}
    for work in works:
        other = taken.setdefault(work.name, work) if work.name else work
        if other is not work:
            raise TrainerError(f"{other.label} and {work.label} in {place} would both become {work.name}.nwrp: train "
                               "them one by one, each with its -o")
    return works


def work_of(folder: Path, label: str) -> Work:
    try:
        return Work(folder, label, name_of(parse(read_bounded(folder / DESCRIPTION), folder / DESCRIPTION), folder))
    except (TrainerError, OSError) as error:
        return Work(folder, label, None, str(error))


def name_of(description: dict[str, Any], folder: Path) -> str:
    """The one that the deformer looks for, or else the geometry's."""
    train = description.get("train")
    for name in (train.get("outputModelName") if isinstance(train, dict) else None, description.get("geometry")):
        if isinstance(name, str) and Path(name).name not in ("", ".."):
            return Path(name).name
    raise TrainerError(f"{folder / DESCRIPTION} names neither a model (train.outputModelName) nor a geometry")


def summary(label: str, errors: dict[str, Any], model: Path) -> str:
    """The line of a model: how far vertices were from where they should be, and are."""
    called, stage = before(errors)
    return (f"{label}: {stage['mean']['mm']:.4g} mm in the mean with {called}, "
            f"{errors['network']['mean']['mm']:.4g} mm with {model}")
