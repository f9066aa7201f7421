# SPDX-License-Identifier: Apache-2.0
"""A network that begins as another that was trained before: on fewer poses, most likely (decision 0191).

What the other model computes is written in the terms of the new one: its normalisation of controls and outputs, and its
principal shapes. What of the old shapes the new ones do not span is lost, and nothing else is.
"""

import hashlib
from pathlib import Path
from typing import Any, Callable, NamedTuple, Optional

import numpy as np
import torch
from torch import nn

from .dataset import Dataset
from .errors import TrainerError
from .evaluator import ModelDirectory, NumpyModel
from .network import Network, Normalisation
from .settings import Settings

SAME = ("hiddenLayerCount", "neuronsPerLayer", "activationFunction")


class Trained(NamedTuple):
    """A network as a model directory has it: float64, from raw controls to deltas or coefficients."""

    center: np.ndarray                           # [C]
    scale: float                                 # (controls - center) * scale goes in
    layers: list[tuple[np.ndarray, np.ndarray]]  # of each weights [inputs, outputs], and what is added
    line: Optional[np.ndarray]                   # [C, outputs]


def digest_of(folder: Path) -> str:
    """Of what a network takes from a model directory."""
    digest = hashlib.sha256()
    for name in ("model.onnx", "principal_shapes.json"):
        if (folder / name).is_file():
            digest.update((folder / name).read_bytes())
    return f"sha256:{digest.hexdigest()}"


def begin_as(folder: Path, network: Network, normalisation: Normalisation, shapes: Optional[np.ndarray],
             dataset: Dataset, settings: Settings) -> None:
    """Gives `network` the weights with which it computes what the model in `folder` does.

    shapes: float32 [S, 3 * D] that the new outputs are coefficients of; none where they are deltas"""
    model = ModelDirectory(folder, None)
    model.check_fits(dataset)
    check_settings(model.metadata.get("settings"), settings, folder)
    old = read_network(NumpyModel(folder / "model.onnx"), folder)
    linear = [layer for layer in network.chain if isinstance(layer, nn.Linear)]
    sizes = [weights.shape for weights, _ in old.layers]
    names = model.metadata.get("controlNames")
    inputs = len(names) if isinstance(names, list) else -1
    outputs = 3 * dataset.delta_count if model.shapes is None else len(model.shapes)
    wanted = [(inputs, linear[0].out_features), *((layer.in_features, layer.out_features) for layer in linear[1:-1]),
              (linear[-1].in_features, outputs)]
    line_fits = old.line is None or old.line.shape == (inputs, outputs)
    if sizes != wanted or old.center.shape != (inputs,) or not line_fits:
        raise TrainerError(f"{folder} has a network of another form than its settings say")
    places = places_of(names, dataset.description["controlNames"], folder)
    turn, shift = controls_between(old, normalisation, places)
    convert = outputs_between(model.shapes, shapes, normalisation.unit)

    layers = [(weights, bias) for weights, bias in old.layers]
    first, bias = layers[0]
    layers[0] = turn @ first, bias + shift @ first
    last, bias = layers[-1]
    if old.line is not None:
        bias = bias + shift @ old.line
    layers[-1] = convert(last), convert(bias)
    with torch.no_grad():
        for layer, (weights, bias) in zip(linear, layers):
            layer.weight.copy_(torch.from_numpy(weights.T.copy()))
            layer.bias.copy_(torch.from_numpy(bias))
        if network.line is not None:
            network.line.weight.zero_()
        if network.line is not None and old.line is not None:
            network.line.weight.copy_(torch.from_numpy(convert(turn @ old.line).T.copy()))


def check_settings(old: Any, settings: Settings, folder: Path) -> None:
    if not isinstance(old, dict):
        raise TrainerError(f"{folder} says nothing of its settings: it is of another program, and no network can begin "
                           "as it")
    for name in SAME:
        if old.get(name) != getattr(settings, name):
            raise TrainerError(f"no network can begin as {folder}: its {name} is {old.get(name)}, and this one's is "
                               f"{getattr(settings, name)}")
    if old.get("linearPath") and not settings.linearPath:
        raise TrainerError(f"no network can begin as {folder} without --linear-path, which that has")


def read_network(model: NumpyModel, folder: Path) -> Trained:
    """A network as export.py writes it, a guard around it left out."""
    nodes = list(model.graph.node)
    constants = [[model.constants[name].astype(np.float64) for name in node.input if name in model.constants]
                 for node in nodes]

    def first(kind: str) -> np.ndarray:
        return next(found[0] for node, found in zip(nodes, constants) if node.op_type == kind and found)

    try:
        layers, line = [], None
        for index, node in enumerate(nodes):
            if node.op_type == "MatMul" and nodes[index + 1].op_type == "Add" and constants[index + 1]:
                layers.append((constants[index][0], constants[index + 1][0]))
            elif node.op_type == "MatMul":
                line = constants[index][0]
        return Trained(first("Sub"), float(first("Mul")), layers, line)
    except (StopIteration, IndexError, TypeError, ValueError) as error:
        raise TrainerError(f"{folder} has a network that this trainer did not write") from error


def places_of(old: list[Any], new: list[str], folder: Path) -> list[int]:
    """Where each of the old controls is among the new ones."""
    found = {name: index for index, name in enumerate(new)}
    missing = [name for name in old if not isinstance(name, str) or name not in found]
    if missing:
        raise TrainerError(f"no network can begin as {folder}: its control {missing[0]} is none of this data set")
    if len(found) != len(new) or len(set(old)) != len(old):
        raise TrainerError(f"no network can begin as {folder}: two controls have one name")
    return [found[name] for name in old]


def controls_between(old: Trained, normalisation: Normalisation, places: list[int]) -> tuple[np.ndarray, np.ndarray]:
    """The old normalised controls, as a matrix [new C, old C] that the new ones are multiplied by, and an offset [old
    C]. A control that never moves in the new data is part of the offset."""
    center = normalisation.center.astype(np.float64)[places]
    turn = np.zeros((len(normalisation.center), len(places)))
    turn[places, np.arange(len(places))] = old.scale * normalisation.deviation
    turn[normalisation.still] = 0
    return turn, (center - old.center) * old.scale


def outputs_between(old: Optional[np.ndarray], new: Optional[np.ndarray],
                    unit: float) -> Callable[[np.ndarray], np.ndarray]:
    """Makes outputs [..., new K], in units of the new network, of outputs [..., old K] of the old model.

    For shapes these are the nearest coefficients: by the normal equations, as new shapes are orthogonal but for the
    rounding of their halves."""
    if old is None and new is None:
        return lambda outputs: outputs / unit
    before = None if old is None else old.astype(np.float64)
    if new is None:
        return lambda outputs: outputs @ before / unit
    wide = new.astype(np.float64)
    nearest = np.linalg.solve(wide @ wide.T, wide).T
    turn = nearest if before is None else before @ nearest
    return lambda outputs: outputs @ turn / unit
