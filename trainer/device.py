# SPDX-License-Identifier: Apache-2.0
"""Where a network is trained. Whatever comes from there or goes there passes through here (decision 0191)."""

import os
from typing import Any

import numpy as np
import torch

from .errors import TrainerError

DEVICES = ("cpu", "cuda", "auto")


class Device:
    """A processor or a CUDA device. With the same one, the same software and the same seed a training gives the same
    bits; two kinds of them do not."""

    def __init__(self, name: str) -> None:
        """`name`: one of DEVICES; auto is cuda where PyTorch can have one, and cpu elsewhere."""
        if name not in DEVICES:
            raise TrainerError(f"--device is {name!r}, not one of {', '.join(DEVICES)}")
        # products on CUDA have the same bits only with a workspace of this size, asked for before the first of them
        os.environ.setdefault("CUBLAS_WORKSPACE_CONFIG", ":4096:8")
        has_cuda = name != "cpu" and torch.cuda.is_available()
        if name == "cuda" and not has_cuda:
            why = "is made without CUDA" if torch.version.cuda is None else "finds no CUDA device"
            raise TrainerError(f"--device is cuda, and PyTorch {torch.__version__} {why}: give cpu, or auto")
        self.device = torch.device("cuda" if has_cuda else "cpu")

    @property
    def kind(self) -> str:
        """cpu, or the name that the driver has for the device."""
        return "cpu" if self.device.type == "cpu" else str(torch.cuda.get_device_name(self.device))

    def tensor(self, array: np.ndarray) -> torch.Tensor:
        """On the processor it shares the array's memory."""
        return torch.from_numpy(array).to(self.device)

    def random_state(self) -> np.ndarray:
        """uint8: of the generator that dropout draws from."""
        state = torch.get_rng_state() if self.device.type == "cpu" else torch.cuda.get_rng_state(self.device)
        return state.numpy()

    def set_random_state(self, state: np.ndarray) -> None:
        if self.device.type == "cpu":
            torch.set_rng_state(torch.from_numpy(state))
        else:
            torch.cuda.set_rng_state(torch.from_numpy(state), self.device)


def array_of(tensor: Any) -> np.ndarray:
    """On the processor it shares the tensor's memory."""
    return tensor.detach().cpu().numpy()
