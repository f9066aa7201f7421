# SPDX-License-Identifier: Apache-2.0
"""Training: the loop over epochs. The same seed gives the same bits."""

import math
import signal
from typing import Callable

import numpy as np
import torch

from .checkpoint import Checkpoints
from .device import Device
from .errors import Terminated, TrainerError
from .network import Network
from .settings import Settings
from .split import Split
from .state import History, State

TargetsOf = Callable[[np.ndarray], np.ndarray]    # normalised outputs, float32 [n, K], for sorted rows


def make_deterministic(seed: int, threads: int) -> None:
    torch.manual_seed(seed)
    torch.use_deterministic_algorithms(True)
    torch.set_num_threads(threads)


def fit(network: Network, inputs: np.ndarray, targets_of: TargetsOf, split: Split, settings: Settings, seed: int,
        on_epoch: Callable[[History], None], ended_by: Callable[[], int], device: Device,
        checkpoints: Checkpoints) -> History:
    """Trains `network` and leaves it, on the processor, with its best weights.

    inputs       float32 [F, C], normalised controls of all rows
    targets_of   gives float32 [n, K], normalised outputs, for an array of sorted rows
    split        rows to train on, rows to validate on (may be none: then the training loss decides)
    on_epoch     called with the History after each epoch; what it raises ends the training
    ended_by     asked before each step for the number of a signal that came, or 0. SIGINT ends the training with what
                 was best until then, and with KeyboardInterrupt where no epoch was finished; SIGTERM with Terminated.
                 A checkpoint is written before
    checkpoints  where they go, and whether the training goes on from the one that is there
    """
    rows, held = np.concatenate([split.train, split.again]), split.validation
    state = State(network, settings, device)
    if checkpoints.resumed:
        checkpoints.restore(state)
    order = np.random.default_rng((seed, 1))
    for _ in range(state.epoch):
        order.permutation(rows)
    history = state.history
    while state.epoch < state.schedule.end:
        batches = cut(order.permutation(rows), settings.batchSize)
        if not train_epoch(state, inputs, targets_of, batches, ended_by, checkpoints):
            history.interrupted = True
            break
        loss = state.total / len(rows)
        validation = mean_loss(state, inputs, targets_of, cut(held, settings.batchSize)) if len(held) else None
        for value in (loss, validation):
            if value is not None and not math.isfinite(value):
                raise TrainerError(f"the loss of epoch {state.epoch + 1} is {value}: the training has diverged; give a "
                                   f"learning rate below {settings.learningRate:g}")
        state.note_loss(loss, validation)
        on_epoch(history)
    if state.best is None:
        raise KeyboardInterrupt("before an epoch was finished: there is no network yet")
    network.load_state_dict(state.best)
    network.cpu()
    return history


def cut(rows: np.ndarray, size: int) -> list[np.ndarray]:
    """Batches, each in ascending order, in which rows are best read from a file."""
    return [np.sort(rows[first:first + size]) for first in range(0, len(rows), size)]


def train_epoch(state: State, inputs: np.ndarray, targets_of: TargetsOf, batches: list[np.ndarray],
                ended_by: Callable[[], int], checkpoints: Checkpoints) -> bool:
    """The steps of an epoch that are not done yet. False where the user has ended it."""
    state.network.train()
    for batch in batches[state.batch:]:
        signalled = ended_by()
        if signalled or checkpoints.is_due():
            checkpoints.save(state)
        if signalled == signal.SIGTERM:
            raise Terminated
        if signalled:
            return False
        state.optimizer.param_groups[0]["lr"] = state.schedule.at(state.epoch * len(batches) + state.batch,
                                                                  len(batches))
        state.optimizer.zero_grad()
        loss = batch_loss(state, inputs, targets_of, batch)
        loss.backward()
        state.optimizer.step()
        state.total += float(loss.detach()) * len(batch)
        state.batch += 1
    return True


def mean_loss(state: State, inputs: np.ndarray, targets_of: TargetsOf, batches: list[np.ndarray]) -> float:
    state.network.eval()
    with torch.no_grad():
        total = sum(float(batch_loss(state, inputs, targets_of, batch)) * len(batch) for batch in batches)
    return total / sum(map(len, batches))


def batch_loss(state: State, inputs: np.ndarray, targets_of: TargetsOf, batch: np.ndarray) -> torch.Tensor:
    to = state.device.tensor
    return torch.nn.functional.mse_loss(state.network(to(inputs[batch])), to(targets_of(batch)))
