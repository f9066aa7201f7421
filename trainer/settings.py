# SPDX-License-Identifier: Apache-2.0
"""The settings of a training run: names, kinds, limits and defaults, as the node's `train` attributes have them."""

import math
from dataclasses import dataclass, fields, replace
from typing import Any, Callable

from .errors import TrainerError

ACTIVATIONS = ("Sigmoid", "Tanh", "ReLU", "LeakyReLU", "Linear",
               "SiLU")  # the last is not a label of the node's attribute
GUARDS = ("none", "clamp", "fade")
LABELS = {"activationFunction": ACTIVATIONS, "guard": GUARDS}

# settings by which the model does not change: where it goes, and where the data lies while it is trained
WITHOUT_EFFECT = ("outputModelName", "preloadData")


@dataclass(frozen=True)
class Settings:
    outputModelName: str = ""
    batchSize: int = 128
    epochs: int = 250
    learningRate: float = 0.0005
    validationRatio: float = 0.2
    hiddenLayerCount: int = 2
    neuronsPerLayer: int = 512
    activationFunction: str = "LeakyReLU"
    dropoutRatio: float = 0.0
    principalShapesEnabled: bool = False
    principalShapesLimit: int = 20
    principalShapesAccuracy: float = 0.8
    preloadData: bool = True
    linearPath: bool = False  # not an attribute of the node
    localNeurons: bool = False  # not an attribute of the node
    principalShapesHalf: bool = False  # not an attribute of the node
    principalShapesBudget: float = 0.0  # mm, 0 for none; not an attribute of the node
    guard: str = "none"  # not an attribute of the node
    guardWidth: float = 1.0  # not an attribute of the node
    patience: int = 50  # epochs without a better validation loss until the last phase; not an attribute of the node


MEANINGS = {
    "outputModelName": "name of the model, where -o gives none",
    "batchSize": "rows of a step",
    "epochs": "passes over the rows; the learning rate falls to 0 over them",
    "learningRate": "of Adam, at the start",
    "validationRatio": "part of the rows that is not trained on: half of it chooses the epoch, errors are told of the "
                       "other half",
    "hiddenLayerCount": "hidden layers",
    "neuronsPerLayer": "neurons of each hidden layer",
    "activationFunction": "one of " + ", ".join(ACTIVATIONS),
    "dropoutRatio": "part of the neurons left out in each step",
    "principalShapesEnabled": "learn coefficients of principal shapes, not the deltas themselves",
    "principalShapesLimit": "most principal shapes",
    "principalShapesAccuracy": "part of the deltas' sum of squares that the shapes hold; 0.99 and more looks right",
    "linearPath": "a straight line from the controls to the outputs beside the hidden layers, learned with them",
    "localNeurons": "three of four neurons of the first layer see only joints and sliders that move the same vertices",
    "principalShapesHalf": "keep principal shapes in half precision: half the size, and off by what is then said",
    "principalShapesBudget": "keep principal shapes as coarse, and as few, as an error of so many mm in the mean "
                             "allows, on the training rows; 0 keeps them as they are",
    "guard": "what becomes of controls beyond the ranges of the training rows, one of " + ", ".join(GUARDS),
    "guardWidth": "of --guard fade: how far beyond, in parts of a control's range, the outputs are 0",
    "preloadData": "hold the deltas in memory; the model is the same without",
    "patience": "after so many epochs without a better validation loss the rate falls to 0 within as many, and "
                "the training ends",
}
LIMITS: dict[str, tuple[float, float]] = {
    "batchSize": (1, 100000), "epochs": (1, 100000), "learningRate": (0, 1), "validationRatio": (0, 0.99),
    "hiddenLayerCount": (1, 100), "neuronsPerLayer": (1, 100000), "dropoutRatio": (0, 1),
    "principalShapesLimit": (1, 500), "principalShapesAccuracy": (0, 1), "patience": (1, 100000),
    "guardWidth": (0.001, 1000), "principalShapesBudget": (0, 1000),
}
KINDS: dict[str, type] = {field.name: field.type for field in fields(Settings)}
WORDS = {bool: "true or false", int: "a whole number", float: "a number", str: "a text"}


def described(name: str) -> str:
    """Meaning, limits and default of a setting, for a help text."""
    facts = [f"{LIMITS[name][0]} to {LIMITS[name][1]}"] if name in LIMITS else []
    default = getattr(Settings(), name)
    if default != "":
        facts.append(f"default {str(default).lower() if isinstance(default, bool) else default}")
    return MEANINGS[name] + (f" ({', '.join(facts)})" if facts else "")


def read_settings(train: object, where: str) -> Settings:
    """Settings from the "train" object of a data set; what it lacks has the defaults. `where` names it in errors."""
    if not isinstance(train, dict):
        raise TrainerError(f"{where} is {train!r}, not an object of settings")
    known = {name: train[name] for name in KINDS if name in train}
    return checked(known, lambda name: f"{where}.{name}")


def override(settings: Settings, changes: dict[str, Any], flag_of: Callable[[str], str]) -> Settings:
    """Settings with `changes`, a dictionary; `flag_of` gives the name by which an error calls a setting."""
    checked(changes, flag_of)
    changed = replace(settings, **normalised(changes))
    if changed.learningRate == 0:
        raise TrainerError("the learning rate is 0, with which nothing is learned: give one, such as "
                           "--learning-rate 0.001")
    if changed.dropoutRatio == 1:
        raise TrainerError("the dropout ratio is 1, which leaves no neuron to learn: give less, such as --dropout 0.1")
    return changed


def checked(values: dict[str, Any], name_of: Callable[[str], str]) -> Settings:
    for name, value in values.items():
        check_value(name, value, name_of(name))
    return Settings(**normalised(values))


def check_value(name: str, value: Any, called: str) -> None:
    kind = KINDS[name]
    fits = isinstance(value, (int, float) if kind is float else kind) and (kind is bool or not isinstance(value, bool))
    if not fits:
        raise TrainerError(f"{called} is {value!r}, not {WORDS[kind]}")
    if name in LABELS and value.lower() not in [label.lower() for label in LABELS[name]]:
        raise TrainerError(f"{called} is {value!r}, not one of {', '.join(LABELS[name])}")
    low, high = LIMITS.get(name, (-math.inf, math.inf))
    if kind in (int, float) and not low <= value <= high:
        raise TrainerError(f"{called} is {value}, not between {low} and {high}")


def normalised(values: dict[str, Any]) -> dict[str, Any]:
    """Labels with their capitals."""
    labels = {name: {label.lower(): label for label in labels} for name, labels in LABELS.items()}
    return {name: labels[name][value.lower()] if name in labels else value for name, value in values.items()}
