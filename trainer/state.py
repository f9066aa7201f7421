# SPDX-License-Identifier: Apache-2.0
"""All that a training is between two of its steps, so that it can go on from there as if nothing had happened."""

import copy
import math
from dataclasses import asdict, dataclass, field
from typing import Any, Optional

import numpy as np
import torch

from .device import Device, array_of
from .network import Network
from .schedule import Schedule
from .settings import Settings


@dataclass
class History:
    train: list[float] = field(default_factory=list)       # mean loss of each epoch
    validation: list[float] = field(default_factory=list)  # empty without validation rows
    best_epoch: int = 0                             # from 1
    best_loss: float = math.inf
    interrupted: bool = False                       # by the user, who gets what was best until then


class State:
    """Changes with every step. The order of the rows is none of it: it follows from the seed and the epoch."""

    def __init__(self, network: Network, settings: Settings, device: Device) -> None:
        self.network = network.to(device.device)
        self.device = device
        self.optimizer = torch.optim.Adam(network.parameters(), lr=settings.learningRate)
        self.schedule = Schedule(settings.learningRate, settings.epochs, settings.patience)
        self.history = History()
        self.best: Optional[dict[str, torch.Tensor]] = None  # weights of the best epoch
        self.batch = 0      # steps done of the epoch at hand
        self.total = 0.0    # sum of the losses of its rows

    @property
    def epoch(self) -> int:
        """Epochs that are done."""
        return len(self.history.train)

    def note_loss(self, train: float, validation: Optional[float]) -> None:
        """To be called when an epoch is done."""
        self.batch, self.total = 0, 0.0
        self.history.train.append(train)
        if validation is not None:
            self.history.validation.append(validation)
        loss = train if validation is None else validation
        if loss < self.history.best_loss:
            self.history.best_loss, self.history.best_epoch = loss, self.epoch
            self.best = copy.deepcopy(self.network.state_dict())
        self.schedule.note(self.epoch, self.history.best_epoch)

    # --- for a checkpoint ---

    def numbers(self) -> dict[str, Any]:
        """What is no array; restore() takes it."""
        return {"history": asdict(self.history), "landing": self.schedule.landing, "batch": self.batch,
                "total": self.total, "adamSteps": self.adam_steps(), "hasBest": self.best is not None}

    def adam_steps(self) -> int:
        return max((int(one["step"]) for one in self.optimizer.state.values()), default=0)

    def arrays(self, has_best: bool) -> dict[str, np.ndarray]:
        """Weights, Adam's moments, random state: by their names, in the memory where they are. With `has_best` those of
        the best epoch; where there is none yet, arrays like them."""
        network = self.network.state_dict()
        parts = {f"network.{name}": array_of(value) for name, value in network.items()}
        if has_best:
            parts.update((f"best.{name}", array_of(value)) for name, value in (self.best or network).items())
        for index, parameter in enumerate(self.network.parameters()):
            moments = self.optimizer.state.get(parameter, {})
            for name in MOMENTS:
                parts[f"{name}.{index}"] = array_of(moments.get(name, torch.zeros_like(parameter)))
        return {**parts, "random": self.device.random_state()}

    def restore(self, numbers: dict[str, Any], arrays: dict[str, np.ndarray]) -> None:
        """Both as they were. KeyError, TypeError or ValueError where they are of another form."""
        self.history = history_of(numbers["history"])
        self.schedule.landing = None if numbers["landing"] is None else int(numbers["landing"])
        self.batch, self.total = int(numbers["batch"]), float(numbers["total"])
        if self.batch < 0 or (self.schedule.landing or 0) > self.epoch:
            raise ValueError("its counts do not go together")
        self.network.load_state_dict(self.named(arrays, "network"))
        self.best = self.named(arrays, "best") if numbers["hasBest"] else None
        if numbers["adamSteps"] > 0:
            for index, parameter in enumerate(self.network.parameters()):
                moments = {name: self.device.tensor(arrays[f"{name}.{index}"]) for name in MOMENTS}
                self.optimizer.state[parameter] = {"step": torch.tensor(float(numbers["adamSteps"])), **moments}
        self.device.set_random_state(arrays["random"])

    def named(self, arrays: dict[str, np.ndarray], kind: str) -> dict[str, torch.Tensor]:
        return {name: self.device.tensor(arrays[f"{kind}.{name}"]) for name in self.network.state_dict()}


MOMENTS = ("exp_avg", "exp_avg_sq")  # as Adam calls them


def history_of(value: dict[str, Any]) -> History:
    history = History([float(loss) for loss in value["train"]], [float(loss) for loss in value["validation"]],
                      int(value["best_epoch"]), float(value["best_loss"]))
    if len(history.validation) not in (0, len(history.train)) or not 0 <= history.best_epoch <= len(history.train):
        raise ValueError("its history does not go together")
    return history
