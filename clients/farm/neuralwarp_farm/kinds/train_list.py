# SPDX-License-Identifier: Apache-2.0
"""LIST.json: what is to be trained, with seeds and lists that multiply out."""

import itertools
import json
import os
import re
from pathlib import Path
from typing import Any, Iterator, NamedTuple

from ..errors import FarmError
from ..fields import Fields
from ..plan import ID

LARGEST = 10_000          # models of a list
KEY = re.compile(r"\{([A-Za-z][A-Za-z0-9_]*)\}")
NUMBER = re.compile(r"[0-9.eE+-]+")
# what the farm itself says: a place that a task finds again, and cores that it was given
OWN = ("-o", "--output", "--report", "--resume", "--resume-if-fits", "--threads", "--json", "--progress", "--quarn")


class Training(NamedTuple):
    name: str
    dataset: Path            # absolute
    words: tuple[str, ...]   # further ones, for the trainer


def read_list(path: Path) -> list[Training]:
    """Throws FarmError with the entry that is wrong, and where two models would have one name."""
    try:
        content: Any = json.loads(path.read_bytes())
    except OSError as error:
        raise FarmError(f"{path} could not be read: {error.strerror}") from None
    except (ValueError, RecursionError) as error:
        raise FarmError(f"{path} is no list of trainings: {error}") from None
    trainings: dict[str, Training] = {}
    for training in multiplied(Fields({"trainings": content}, str(path)), path.parent):
        if training.name in trainings:
            raise FarmError(f"{path}: two models are called {training.name}")
        if len(trainings) == LARGEST:
            raise FarmError(f"{path} multiplies out to more than {LARGEST} trainings")
        trainings[training.name] = training
    if not trainings:
        raise FarmError(f"{path} has no training")
    return list(trainings.values())


def multiplied(content: Fields, folder: Path) -> Iterator[Training]:
    for entry in content.objects("trainings", LARGEST):
        name, dataset = entry.text("name"), entry.text("dataset")
        arguments = list(entry.texts("arguments", LARGEST)) if entry.has("arguments") else []
        lists = lists_of(entry)
        entry.check_all_taken()
        for own in OWN:
            if any(word == own or word.startswith(own + "=") for word in arguments):
                raise entry.error("arguments", f"has {own}, which the farm sets by itself")
        if "seed" in lists:
            arguments += ["--seed", "{seed}"]
        name += "".join(f".{{{key}}}" for key in lists if f"{{{key}}}" not in name)
        for values in itertools.product(*lists.values()):
            chosen = dict(zip(lists, values))
            yield Training(name_of(entry, filled(entry, name, chosen)),
                           folder_of(entry, filled(entry, dataset, chosen), folder),
                           tuple(whole_path(filled(entry, word, chosen), folder) for word in arguments))


def lists_of(entry: Fields) -> dict[str, list[str]]:
    """What is multiplied: "each", an object of lists, and "seeds"."""
    lists: dict[str, list[str]] = {}
    if entry.has("each"):
        each = entry.object("each")
        for key in each.content:
            if not KEY.fullmatch(f"{{{key}}}"):
                raise each.error(repr(key), "is no name that can stand in braces")
            lists[key] = [str(value) for value in scalars(each, key)]
    if entry.has("seeds"):
        if "seed" in lists:
            raise entry.error("seeds", "is there beside a list of its own that is called seed")
        lists["seed"] = [str(value) for value in scalars(entry, "seeds")]
    return lists


def scalars(entry: Fields, key: str) -> list[Any]:
    values = entry.entries(key, LARGEST)
    for value in values:
        if isinstance(value, bool) or not isinstance(value, (str, int, float)):
            raise entry.error(key, f"has {value!r}, and a list holds texts or numbers")
    if not values:
        raise entry.error(key, "is empty: nothing would be trained")
    return values


def filled(entry: Fields, text: str, values: dict[str, str]) -> str:
    for key in KEY.findall(text):
        if key not in values:
            raise entry.error(repr(text), f"names {{{key}}}, and there is no such list")
    return KEY.sub(lambda found: values[found[1]], text)


def name_of(entry: Fields, name: str) -> str:
    if not ID.fullmatch(name) or name.endswith(".nwrp"):
        raise entry.error("name", f"makes {name!r}: letters, digits, '.', '_' and '-' only, not ending with .nwrp")
    return name


def folder_of(entry: Fields, dataset: str, folder: Path) -> Path:
    path = folder / dataset
    if not (path / "dataset.json").is_file():
        raise entry.error("dataset", f"is {dataset}, and {path / 'dataset.json'} is not there")
    return Path(os.path.abspath(path))


def whole_path(word: str, folder: Path) -> str:
    """A word that names a file or a folder beside the list, with its whole path: tasks run elsewhere."""
    is_place = word and not NUMBER.fullmatch(word) and (folder / word).exists()
    return os.path.abspath(folder / word) if is_place else word
