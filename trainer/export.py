# SPDX-License-Identifier: Apache-2.0
"""Writes the files of a model directory. They carry no time and no path: the same training gives the same bytes.

The network is written node by node (decision 0084).
"""

import io
import json
from pathlib import Path
from typing import Any, Optional, Union

import numpy as np
import onnx
import xxhash
from onnx import TensorProto, helper, numpy_helper
from torch import Tensor, nn

from . import __version__
from .dataset import Dataset
from .errors import TrainerError
from .files import write_bytes
from .guard import Guard, add_clamp, add_fade
from .budget import WholeNumbers
from .halves import Halves, by_vertex
from .network import Network, Normalisation
from .settings import WITHOUT_EFFECT, Settings

Packed = Union[Halves, WholeNumbers]
OPSET = 16
IR_VERSION = 8
METADATA_LIMIT, SHAPES_LIMIT = 64 << 20, 1 << 30  # bytes that the deformer reads
BYTES_OF_A_NUMBER = 14                            # of a float32 in a JSON list, at most about
METADATA_KEYS = ("deltaCount", "deltaMode", "smoothingIterations", "affectCount", "fullCount", "subsetState",
                 "componentTagExpression", "geometry")

# Below this more threads of the network's runtime gain less than they take from the deformer, as they spin after a run.
# A fixed size, because a model does not depend on the machine that trained it (decision 0060).
ONE_THREAD_BELOW = 16_000_000  # bytes of weights
ONE_THREAD = json.dumps({"session_options": {"intra_op_num_threads": 1}})

ACTIVATION_NODES = {nn.Sigmoid: "Sigmoid", nn.Tanh: "Tanh", nn.ReLU: "Relu"}


# --- model.onnx ---

def onnx_model(network: Network, normalisation: Normalisation, output_name: str,
               guard: Optional[Guard] = None) -> onnx.ModelProto:
    """The network from raw controls, float32 [C], to outputs, float32 [K]: one pose, as the deformer runs it."""
    graph = GraphWriter("controls")
    if guard is not None:
        add_clamp(graph, guard)
    clamped = graph.value
    graph.add("Sub", normalisation.center)
    graph.add("Mul", np.float32(1 / normalisation.deviation))
    controls = graph.value
    layers = list(network.chain)
    for layer in layers:
        if isinstance(layer, nn.Linear):
            scale = normalisation.unit if layer is layers[-1] else 1.0
            graph.add("MatMul", scaled(layer.weight, scale).T)
            graph.add("Add", scaled(layer.bias, scale))
        elif isinstance(layer, nn.LeakyReLU):
            graph.add("LeakyRelu", alpha=layer.negative_slope)
        elif type(layer) in ACTIVATION_NODES:
            graph.add(ACTIVATION_NODES[type(layer)])
        elif isinstance(layer, nn.SiLU):  # x sigmoid(x)
            before = graph.value
            graph.add("Sigmoid")
            graph.join("Mul", before)
    if network.line is not None:
        outputs = graph.value
        graph.value = controls
        graph.add("MatMul", scaled(network.line.weight, normalisation.unit).T)
        graph.join("Add", outputs)
    if guard is not None:
        add_fade(graph, guard, graph.input_name, clamped)
    return graph.finish(output_name, layers[0].in_features, layers[-1].out_features)


def scaled(parameter: Tensor, scale: float) -> np.ndarray:
    return (parameter.detach().numpy().astype(np.float64) * scale).astype(np.float32)


def zero_model(control_count: int, output_count: int) -> onnx.ModelProto:
    """A network of the right shapes whose outputs are 0."""
    graph = GraphWriter("controls")
    graph.add("MatMul", np.zeros((control_count, 1), np.float32))
    graph.add("MatMul", np.zeros((1, output_count), np.float32))
    return graph.finish("deltas", control_count, output_count)


class GraphWriter:
    """Nodes, each fed by `value`, which is the one before, and at most one constant or other node."""

    def __init__(self, input_name: str) -> None:
        self.nodes: list[onnx.NodeProto] = []
        self.constants: list[onnx.TensorProto] = []
        self.input_name = self.value = input_name

    def add(self, kind: str, constant: Union[np.ndarray, np.floating, None] = None,
            **attributes: Any) -> None:
        name = f"{kind.lower()}{len(self.nodes)}"
        inputs = [self.value]
        if constant is not None:
            self.constants.append(numpy_helper.from_array(np.ascontiguousarray(constant, np.float32),
                                                          f"{name}_constant"))
            inputs.append(self.constants[-1].name)
        self.nodes.append(helper.make_node(kind, inputs, [name], name=name, **attributes))
        self.value = name

    def join(self, kind: str, other: str) -> None:
        """A node of the one before and of another before that."""
        name = f"{kind.lower()}{len(self.nodes)}"
        self.nodes.append(helper.make_node(kind, [self.value, other], [name], name=name))
        self.value = name

    def finish(self, output_name: str, input_count: int, output_count: int) -> onnx.ModelProto:
        self.nodes[-1].output[0] = output_name
        graph = helper.make_graph(
            self.nodes, "neuralWarp",
            [helper.make_tensor_value_info(self.input_name, TensorProto.FLOAT, [input_count])],
            [helper.make_tensor_value_info(output_name, TensorProto.FLOAT, [output_count])], self.constants)
        model = helper.make_model(graph, opset_imports=[helper.make_opsetid("", OPSET)], ir_version=IR_VERSION,
                                  producer_name="neuralWarp trainer", producer_version=__version__)
        if sum(len(constant.raw_data) for constant in self.constants) < ONE_THREAD_BELOW:
            helper.set_model_props(model, {"ort_config": ONE_THREAD})
        onnx.checker.check_model(model, full_check=True)
        return model


# --- metadata.json, principal_shapes.json, principal_shapes.npz ---

def metadata(dataset: Dataset, settings: Optional[Settings], seed: Optional[int]) -> dict[str, Any]:
    """What the deformer needs to know of the data set, and where the model comes from."""
    description = dataset.description
    result = {key: description[key] for key in METADATA_KEYS}
    if description["subsetState"] == "partial":
        result["affectMap"] = description["affectMap"]
    result["controlNames"] = description["controlNames"]
    result["trainer"] = f"neuralWarp trainer {__version__}"
    result["dataSet"] = f"sha256:{dataset.digest}"
    if settings is not None:
        result["seed"] = seed
        result["settings"] = {name: value for name, value in vars(settings).items() if name not in WITHOUT_EFFECT}
    return result


def check_shapes_size(shape_count: int, delta_count: int) -> None:
    size = BYTES_OF_A_NUMBER * 3 * shape_count * delta_count
    if size > SHAPES_LIMIT:
        raise TrainerError(f"{shape_count} principal shapes of {delta_count} vertices would take about "
                           f"{size / 1e9:.1f} GB of text, more than the {SHAPES_LIMIT / 1e9:.1f} GB that the deformer "
                           "reads: give fewer (--principal-limit)")


def write_model(folder: Path, model: onnx.ModelProto, metadata_: dict[str, Any],
                shapes: Optional[np.ndarray] = None, packed: Optional[Packed] = None) -> None:
    """Writes the files into an existing folder. shapes: float32 [S, 3 * D], in scene units, or none; packed: what they
    are decoded from."""
    text = json.dumps(metadata_, indent=1, allow_nan=False) + "\n"
    if len(text) > METADATA_LIMIT:
        raise TrainerError(f"metadata.json would have {len(text)} bytes, more than the {METADATA_LIMIT} that the "
                           "deformer reads: the partial subset has too many vertices")
    write_bytes(folder / "metadata.json", text.encode())
    write_bytes(folder / "model.onnx", model.SerializeToString(deterministic=True))
    if shapes is not None:
        write_shapes(folder, shapes, packed)


def write_shapes(folder: Path, shapes: np.ndarray, packed: Optional[Packed] = None) -> None:
    shapes = shapes + np.float32(0)  # readers take "-0" for 0
    # nine digits give a float32 back, also where a reader errs in a double's last places
    numbers = ",".join(["%.9g"] * shapes.shape[1])
    rows = ",\n".join("[" + numbers % tuple(shape.tolist()) + "]" for shape in shapes)
    text = (f'{{"principalShapeCount": {len(shapes)}, "principalVertCount": {shapes.shape[1] // 3}, '
            f'"principalShapes": [\n{rows}\n]}}\n').encode()
    write_bytes(folder / "principal_shapes.json", text)
    write_bytes(folder / "principal_shapes.npz", shapes_archive(text, shapes, packed))


def shapes_archive(text: bytes, shapes: np.ndarray, packed: Optional[Packed]) -> bytes:
    """The numbers of that JSON for readers in a hurry: they count while the JSON is the one of that sum."""
    numbers = packed.arrays() if packed else {"shapes": by_vertex(shapes, "<f4")}
    archive = io.BytesIO()
    write = np.savez_compressed if packed and packed.compressed else np.savez
    write(archive, json_xxh3_128=np.array(xxhash.xxh3_128_hexdigest(text).encode()), **numbers)
    return archive.getvalue()
