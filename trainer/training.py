# SPDX-License-Identifier: Apache-2.0
"""Training: the loop over epochs. The same seed gives the same bits."""

import copy
import math
from dataclasses import dataclass, field
from typing import Callable, Optional

import numpy as np
import torch
from torch import nn

from .errors import TrainerError
from .schedule import Schedule
from .settings import Settings
from .split import Split

TargetsOf = Callable[[np.ndarray], np.ndarray]    # normalised outputs, float32 [n, K], for sorted rows


@dataclass
class History:
    train: list[float] = field(default_factory=list)       # mean loss of each epoch
    validation: list[float] = field(default_factory=list)  # empty without validation rows
    best_epoch: int = 0                             # from 1
    best_loss: float = math.inf
    interrupted: bool = False                       # by the user, who gets what was best until then


def make_deterministic(seed: int, threads: int) -> None:
    torch.manual_seed(seed)
    torch.use_deterministic_algorithms(True)
    torch.set_num_threads(threads)


def fit(network: nn.Module, inputs: np.ndarray, targets_of: TargetsOf, split: Split, settings: Settings, seed: int,
        on_epoch: Callable[[History], None], is_interrupted: Callable[[], bool]) -> History:
    """Trains `network` and leaves it with its best weights.

    inputs          float32 [F, C], normalised controls of all rows
    targets_of      gives float32 [n, K], normalised outputs, for an array of sorted rows
    split           rows to train on, rows to validate on (may be none: then the training loss decides)
    on_epoch        called with the History after each epoch; what it raises ends the training
    is_interrupted  asked before each step: a yes ends the training with what was best until then, and with
                    KeyboardInterrupt where no epoch was finished
    """
    rows, held = split.train, split.validation
    order = np.random.default_rng((seed, 1))
    optimizer = torch.optim.Adam(network.parameters(), lr=settings.learningRate)
    schedule = Schedule(settings.learningRate, settings.epochs, settings.patience)
    history, best, epoch = History(), None, 0
    while epoch < schedule.end:
        epoch += 1
        batches = cut(order.permutation(rows), settings.batchSize)
        loss = train_epoch(network, inputs, targets_of, batches, optimizer, schedule, epoch - 1, is_interrupted)
        if loss is None:
            history.interrupted = True
            break
        history.train.append(loss)
        if len(held):
            history.validation.append(mean_loss(network, inputs, targets_of, cut(held, settings.batchSize)))
        loss = (history.validation or history.train)[-1]
        if not math.isfinite(loss):
            raise TrainerError(f"the loss of epoch {epoch} is {loss}: the training has diverged; give a learning rate "
                               f"below {settings.learningRate:g}")
        if loss < history.best_loss:
            history.best_loss, history.best_epoch = loss, epoch
            best = copy.deepcopy(network.state_dict())
        on_epoch(history)
        schedule.note(epoch, history.best_epoch)
    if best is None:
        raise KeyboardInterrupt("before an epoch was finished: there is no network yet")
    network.load_state_dict(best)
    return history


def cut(rows: np.ndarray, size: int) -> list[np.ndarray]:
    """Batches, each in ascending order, in which rows are best read from a file."""
    return [np.sort(rows[first:first + size]) for first in range(0, len(rows), size)]


def train_epoch(network: nn.Module, inputs: np.ndarray, targets_of: TargetsOf, batches: list[np.ndarray],
                optimizer: torch.optim.Optimizer, schedule: Schedule, epoch: int,
                is_interrupted: Callable[[], bool]) -> Optional[float]:
    """The mean loss; None where the epoch was not finished."""
    network.train()
    total = 0.0
    for index, batch in enumerate(batches):
        if is_interrupted():
            return None
        optimizer.param_groups[0]["lr"] = schedule.at(epoch * len(batches) + index, len(batches))
        optimizer.zero_grad()
        loss = batch_loss(network, inputs, targets_of, batch)
        loss.backward()
        optimizer.step()
        total += float(loss.detach()) * len(batch)
    return total / sum(map(len, batches))


def mean_loss(network: nn.Module, inputs: np.ndarray, targets_of: TargetsOf, batches: list[np.ndarray]) -> float:
    network.eval()
    with torch.no_grad():
        total = sum(float(batch_loss(network, inputs, targets_of, batch)) * len(batch) for batch in batches)
    return total / sum(map(len, batches))


def batch_loss(network: nn.Module, inputs: np.ndarray, targets_of: TargetsOf, batch: np.ndarray) -> torch.Tensor:
    return torch.nn.functional.mse_loss(network(torch.from_numpy(inputs[batch])), torch.from_numpy(targets_of(batch)))
