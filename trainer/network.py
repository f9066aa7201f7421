# SPDX-License-Identifier: Apache-2.0
"""The network: dense layers, and a straight line beside them where it is asked for, from normalised controls to
normalised outputs, and what normalises them."""

from dataclasses import dataclass
from typing import Optional

import numpy as np
import torch
from torch import nn

from .errors import TrainerError
from .guard import Guard
from .line import Line
from .settings import Settings

WEIGHT_BYTES_LIMIT = 1_500_000_000  # an ONNX file of one piece ends at 2 GiB
LEAKY_SLOPE = 0.01
AT_THE_START = 0.1  # of their usual size: weights of the last layer beside a line, which they are to correct
CONSTANT = 1e-6  # a control whose deviation is below this part of the common one counts as never moved

MODULES = {"Sigmoid": nn.Sigmoid, "Tanh": nn.Tanh, "ReLU": nn.ReLU, "LeakyReLU": lambda: nn.LeakyReLU(LEAKY_SLOPE),
           "Linear": None, "SiLU": nn.SiLU}


class Network(nn.Module):
    """A chain of layers, and what a straight line from the controls adds to its outputs."""

    def __init__(self, chain: nn.Sequential, line: Optional[nn.Linear]) -> None:
        super().__init__()
        self.chain = chain
        self.line = line

    def forward(self, controls: torch.Tensor) -> torch.Tensor:
        outputs = self.chain(controls)
        return outputs if self.line is None else outputs + self.line(controls)


@dataclass(frozen=True)
class Normalisation:
    """(controls - center) / deviation goes in, outputs * unit come out. One deviation and one unit for all of them
    (decision 0086): with one for each channel, noise of channels that hardly move would count as much as motion."""

    center: np.ndarray   # float32 [C]
    deviation: float
    unit: float
    still: np.ndarray    # bool [C]: controls that never move

    def normalised(self, controls: np.ndarray) -> np.ndarray:
        return (controls - self.center) * np.float32(1 / self.deviation)


def measure_controls(controls: np.ndarray, unit: float) -> Normalisation:
    """Normalisation for the rows of `controls` [rows, C] and outputs whose root mean square is `unit`."""
    variances = np.var(controls, axis=0, dtype=np.float64)
    deviation = float(np.sqrt(np.mean(variances))) or 1.0
    center = np.mean(controls, axis=0, dtype=np.float64).astype(np.float32)
    return Normalisation(center, deviation, unit, np.sqrt(variances) <= CONSTANT * deviation)


def layer_sizes(settings: Settings, inputs: int, outputs: int) -> list[tuple[int, int]]:
    sizes = [inputs] + [settings.neuronsPerLayer] * settings.hiddenLayerCount + [outputs]
    return list(zip(sizes[:-1], sizes[1:]))


def parameter_count(settings: Settings, inputs: int, outputs: int) -> int:
    chain = sum((before + 1) * after for before, after in layer_sizes(settings, inputs, outputs))
    return chain + (inputs * outputs if settings.linearPath else 0)


def check_size(settings: Settings, inputs: int, outputs: int) -> None:
    """Refuses a network that no model file could hold, before anything is allocated."""
    size = 4 * parameter_count(settings, inputs, outputs)
    if size <= WEIGHT_BYTES_LIMIT:
        return
    advice = "give fewer neurons (--neurons) or layers (--hidden-layers)"
    if not settings.principalShapesEnabled:
        advice = f"train principal shapes instead (--principal-shapes), or {advice}"
    raise TrainerError(f"the network's weights would take {size / 1e9:.2f} GB, more than the "
                       f"{WEIGHT_BYTES_LIMIT / 1e9} GB a model may have: {advice}")


def build(settings: Settings, inputs: int, outputs: int, still: np.ndarray, line: Optional[Line] = None,
          seen: Optional[np.ndarray] = None) -> Network:
    """The network, initialised by torch's generator.

    still  bool [inputs]: controls that must have no influence
    line   where the straight line beside the layers begins, for settings that have one; at 0 where none is given
    seen   bool [neurons, inputs]: controls that each neuron of the first layer sees; all where it is not given
    """
    layers: list[nn.Module] = []
    for before, after in layer_sizes(settings, inputs, outputs):
        layers.append(nn.Linear(before, after))
        if MODULES[settings.activationFunction]:
            layers.append(MODULES[settings.activationFunction]())
        if settings.dropoutRatio > 0:
            layers.append(nn.Dropout(settings.dropoutRatio))
    while not isinstance(layers[-1], nn.Linear):  # nothing follows the last layer
        layers.pop()
    chain = nn.Sequential(*layers)
    beside = nn.Linear(inputs, outputs, bias=False) if settings.linearPath else None
    with torch.no_grad():
        if seen is not None:
            narrow(chain[0], torch.from_numpy(seen))
        # their input is 0 all through the training, so the weights would stay as random as they began
        chain[0].weight[:, torch.from_numpy(still)] = 0
        if beside is not None:
            beside.weight.zero_()
        if beside is not None and line is not None:
            beside.weight.copy_(torch.from_numpy(line.weights))
            chain[-1].weight.mul_(AT_THE_START)
            chain[-1].bias.copy_(torch.from_numpy(line.offset))
    return Network(chain, beside)


def narrow(layer: nn.Linear, seen: torch.Tensor) -> None:
    """Leaves each neuron the inputs that it is to see, bool [neurons, inputs], now and through the training."""
    mask = seen.to(layer.weight.dtype)
    counts = mask.sum(dim=1, keepdim=True)
    layer.weight.mul_(mask * torch.sqrt(layer.in_features / counts.clamp(min=1)))  # sums as large as those of all
    layer.weight.register_hook(lambda gradient: gradient * mask.to(gradient.device))


def predict(network: Network, normalisation: Normalisation, controls: np.ndarray,
            guard: Optional[Guard] = None) -> np.ndarray:
    """Outputs of the network, float32 [rows, K] in units of the model, for raw controls [rows, C]."""
    if guard is not None:
        return predict(network, normalisation, guard.clamped(controls)) * guard.factor(controls)
    network.eval()
    with torch.no_grad():
        return network(torch.from_numpy(normalisation.normalised(controls))).numpy() * np.float32(normalisation.unit)
