# SPDX-License-Identifier: Apache-2.0
"""Runs models: with quarn, as the deformer would, or with NumPy, which needs no quarn and is nobody's contract."""

import io
import json
import os
import shutil
import subprocess
import tempfile
from contextlib import contextmanager
from functools import partial
from pathlib import Path
from typing import Callable, Iterator, Optional, Union

import numpy as np
import onnx
from onnx import numpy_helper

from .dataset import Dataset
from .errors import TrainerError
from .files import write_bytes

BUILT = Path(__file__).resolve().parent.parent / "build" / "release" / "quarn" / "quarn"


def find_quarn(wanted: Optional[str]) -> Optional[str]:
    """Path of the executable: `wanted` ("none" for none), $QUARN, the release build, the PATH; or None."""
    for name, called in ((wanted, "--quarn"), (os.environ.get("QUARN"), "$QUARN")):
        if name == "none":
            return None
        if name:
            found = shutil.which(name)
            if not found:
                raise TrainerError(f"{called} names {name}, which is not a program")
            return found
    return str(BUILT) if os.access(BUILT, os.X_OK) else shutil.which("quarn")


def run_with_quarn(quarn: str, model: Path, controls: np.ndarray) -> np.ndarray:
    """Outputs float32 [rows, K] of a model directory for controls [rows, C]."""
    with tempfile.TemporaryDirectory(prefix="neuralWarp-") as folder:
        given, answer = Path(folder) / "controls.npy", Path(folder) / "outputs.npy"
        rows = io.BytesIO()
        np.save(rows, np.ascontiguousarray(controls, "<f4"))
        write_bytes(given, rows.getvalue())
        command = [quarn, "info", str(model), "--run", str(given), "--outputs", str(answer)]
        done = subprocess.run(command, stdin=subprocess.DEVNULL, capture_output=True, text=True, errors="replace",
                              check=False)
        if done.returncode:
            said = (done.stderr or done.stdout).strip().splitlines() or [f"status {done.returncode}"]
            raise TrainerError(f"quarn could not run {model}: {said[-1]}")
        return read_answer(answer, len(controls), model)


@contextmanager
def model_link(folder: Path, name: str) -> Iterator[Path]:
    """A model directory that is still called something else, under its own name."""
    with tempfile.TemporaryDirectory(prefix="neuralWarp-") as place:
        link = Path(place) / name
        link.symlink_to(folder.resolve(), target_is_directory=True)
        yield link


def read_answer(path: Path, rows: int, model: Path) -> np.ndarray:
    try:
        outputs = np.load(path, allow_pickle=False)
    except (OSError, ValueError) as error:
        raise TrainerError(f"quarn gave no outputs of {model}: {error}") from error
    if outputs.ndim != 2 or len(outputs) != rows:
        raise TrainerError(f"quarn gave outputs of shape {list(outputs.shape)} for {rows} rows of controls of {model}")
    return outputs.astype(np.float32, copy=False)


class NumpyModel:
    """A network of the nodes that this trainer writes."""

    STEPS: dict[str, Callable[..., np.ndarray]] = {
        "Sub": np.subtract, "Mul": np.multiply, "Add": np.add, "MatMul": np.matmul, "Tanh": np.tanh,
        "Max": np.maximum, "Min": np.minimum, "ReduceMax": lambda x: x.max(axis=-1, keepdims=True),
        "Relu": lambda x: np.maximum(x, 0), "Sigmoid": lambda x: 0.5 + 0.5 * np.tanh(0.5 * x),
    }

    def __init__(self, path: Path) -> None:
        try:
            self.graph = onnx.load(str(path)).graph
        except Exception as error:  # protobuf has no common base of its errors
            raise TrainerError(f"{path} is not an ONNX file: {error}") from error
        self.constants = {tensor.name: numpy_helper.to_array(tensor) for tensor in self.graph.initializer}
        self.path = path
        if len(self.graph.input) != 1:
            raise TrainerError(f"{path} has {len(self.graph.input)} inputs, not 1")

    def run(self, controls: np.ndarray) -> np.ndarray:
        values = {self.graph.input[0].name: controls.astype(np.float32)}
        for node in self.graph.node:
            try:
                arguments = [values[name] if name in values else self.constants[name] for name in node.input]
                values[node.output[0]] = self.step(node)(*arguments).astype(np.float32)
            except (KeyError, TypeError, ValueError) as error:
                raise TrainerError(f"{self.path}: node {node.name} ({node.op_type}) cannot be run without quarn: "
                                   f"{error}") from error
        return values[self.graph.output[0].name]

    def step(self, node: onnx.NodeProto) -> Callable[..., np.ndarray]:
        if node.op_type == "LeakyRelu":
            slope = np.float32(node.attribute[0].f if node.attribute else 0.01)
            return lambda x: np.where(x < 0, slope * x, x)
        return self.STEPS[node.op_type]


class ModelDirectory:
    """A model directory as the deformer sees it: deltas for controls."""

    def __init__(self, folder: Union[str, Path], quarn: Optional[str]) -> None:
        self.folder = Path(folder)
        try:
            self.metadata = json.loads((self.folder / "metadata.json").read_bytes())
            shapes = self.folder / "principal_shapes.json"
            self.shapes: Optional[np.ndarray] = None
            if shapes.exists():
                self.shapes = np.array(json.loads(shapes.read_bytes())["principalShapes"], np.float32)
        except FileNotFoundError as error:
            raise TrainerError(f"{folder} is not a model directory: it has no metadata.json") from error
        except (OSError, ValueError, KeyError, TypeError) as error:
            raise TrainerError(f"{folder} is not a model directory: {error}") from error
        if not isinstance(self.metadata, dict) or (self.shapes is not None and self.shapes.ndim != 2):
            raise TrainerError(f"{folder} is not a model directory: a file in it is of another form")
        self.run: Callable[[np.ndarray], np.ndarray]  # outputs for controls
        if quarn:
            self.run = partial(run_with_quarn, quarn, self.folder)
        else:
            self.run = NumpyModel(self.folder / "model.onnx").run

    def check_fits(self, dataset: Dataset) -> None:
        for key in ("fullCount", "affectCount", "subsetState", "deltaMode", "smoothingIterations"):
            if self.metadata.get(key) != dataset.description[key]:
                raise TrainerError(f"{self.folder} has {key} {self.metadata.get(key)!r} and {dataset.folder} has "
                                   f"{dataset.description[key]!r}: they do not belong together")
        if self.metadata.get("affectMap") != dataset.description.get("affectMap") and (
                dataset.description["subsetState"] == "partial"):
            raise TrainerError(f"{self.folder} moves other vertices than {dataset.folder} has deltas of")

    def deltas(self, controls: np.ndarray) -> np.ndarray:
        """float32 [rows, 3 * D], in scene units."""
        outputs = self.run(controls)
        return outputs if self.shapes is None else outputs @ self.shapes
