#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""networks.py FOLDER: writes networks that a page is to compute, NAME.onnx, as the trainer writes them and others; and
some that it must refuse, each with a NAME.txt of what is said then."""

import itertools
import sys
from pathlib import Path
from typing import Any, Optional

import numpy as np
import onnx
import torch
from onnx import TensorProto, helper, numpy_helper

from trainer.export import onnx_model
from trainer.guard import Guard
from trainer.network import Normalisation, build
from trainer.settings import ACTIVATIONS, Settings

FOLDER = Path(sys.argv[1])
DIRECT, PRINCIPAL = 3 * 700, 40  # outputs: three for each vertex, and one for each shape
RANDOM = np.random.default_rng(1)


def numbers(*shape: int) -> np.ndarray:
    return RANDOM.uniform(-1, 1, shape).astype(np.float32)


def trained(name: str, outputs: int, guard: str = "none", controls: int = 23, local: bool = False,
            **changes: Any) -> None:
    """A network as it is before the training, with its normalisation."""
    settings = Settings(**changes)
    torch.manual_seed(len(name))
    seen = RANDOM.random((settings.neuronsPerLayer, controls)) < 0.3 if local else None
    network = build(settings, controls, outputs, np.arange(controls) == 2, seen=seen)
    if network.line is not None:
        network.line.weight.data.normal_()
    normalisation = Normalisation(numbers(controls), 0.4, 0.013, np.zeros(controls, bool))
    reach = np.full(controls, 0.5, np.float32) if guard == "fade" else None
    box = Guard(-np.abs(numbers(controls)), np.abs(numbers(controls)), reach) if guard != "none" else None
    model = onnx_model(network, normalisation, "deltas", box)
    (FOLDER / f"{name}.onnx").write_bytes(model.SerializeToString())


def written(name: str, nodes: list[onnx.NodeProto], constants: dict[str, np.ndarray], refused: Optional[str] = None,
            outputs: Optional[list[int]] = None) -> None:
    """A network from "x", 5 values, to "y"; `refused`: a part of what is said of it."""
    ends = [helper.make_tensor_value_info(end, TensorProto.FLOAT, shape) for end, shape in (("x", [5]), ("y", outputs))]
    graph = helper.make_graph(nodes, "test", ends[:1], ends[1:],
                              [numpy_helper.from_array(values, key) for key, values in constants.items()])
    model = helper.make_model(graph, opset_imports=[helper.make_opsetid("", 13)], ir_version=7)
    (FOLDER / f"{name}.onnx").write_bytes(model.SerializeToString())
    if refused is not None:
        (FOLDER / f"{name}.txt").write_text(refused)


def node(kind: str, *inputs: str, output: str = "y", **attributes: Any) -> onnx.NodeProto:
    return helper.make_node(kind, inputs, [output], name=f"the {kind}", **attributes)


def write_trained() -> None:
    for kind, line, local, outputs in itertools.product(ACTIVATIONS, (False, True), (False, True), (DIRECT, PRINCIPAL)):
        trained(f"{kind}_{line}_{local}_{outputs}", outputs, activationFunction=kind, linearPath=line, local=local,
                guard="clamp" if local else "none", neuronsPerLayer=61, hiddenLayerCount=1 + line)
    trained("hand", PRINCIPAL, controls=114, activationFunction="SiLU", linearPath=True, neuronsPerLayer=512)
    trained("deep", PRINCIPAL, controls=1, activationFunction="Tanh", neuronsPerLayer=1024, hiddenLayerCount=5)
    trained("fading", PRINCIPAL, guard="fade")
    (FOLDER / "fading.txt").write_text('the operator "ReduceMax" of node "reducemax')


def write_others() -> None:
    row, square, w = numbers(1, 5), numbers(5, 5), numbers(5, 7)
    begin = node("Add", "x", "row", output="r")  # of one row
    for number, (turned, alpha, beta, c) in enumerate(itertools.product(
            (0, 1), (1.0, -2.5), (1.0, 0.75, 0.0), (None, numbers(7), numbers(1, 7), numbers(1), numbers(1, 1)))):
        constants = {"row": row, "w": w.T if turned else w} | ({} if c is None else {"c": c})
        written(f"gemm{number}", [begin, node("Gemm", "r", "w", *["c"][:len(constants) - 2], transB=turned, alpha=alpha,
                                              beta=beta)], constants)
    written("gemm_vector", [begin, node("Gemm", "r", "w", "r", beta=0.5)], {"row": row, "w": square})
    written("column", [node("MatMul", "w", "x")], {"w": numbers(6, 5)})
    single = [node("MatMul", "x", "w", output="one")]  # one value that is combined with many
    for kind in ("Add", "Sub", "Mul"):
        for order, pair in enumerate((("x", "one"), ("one", "x"), ("x", "c"), ("c", "x"), ("one", "c"), ("x", "s"))):
            written(f"{kind}{order}", [*single, node(kind, *pair)],
                    {"w": numbers(5, 1), "c": numbers(5), "s": numbers()})
    bounds = {"low": np.array(-0.4, np.float32), "high": np.array(0.3, np.float32)}
    for name, ends in (("both", ("low", "high")), ("low", ("low",)), ("high", ("", "high")), ("free", ())):
        written(f"clip_{name}", [node("Clip", "x", *ends)], bounds)
    written("max", [node("Max", "c", "x")], {"c": numbers(5)})
    written("leaky", [node("LeakyRelu", "x")], {})
    values = numpy_helper.from_array(numbers(5))
    written("constant", [node("Constant", output="c", value=values), node("Constant", output="s", value_float=0.3),
                         node("Identity", "s", output="t"), node("Add", "x", "c", output="z"),
                         node("Mul", "z", "t")], {})
    written("unused", [node("Softmax", "x", output="z"), node("Tanh", "x")], {})


def write_refused() -> None:
    w, row = numbers(5, 5), numbers(1, 5)
    for kind, inputs in (("Gather", ("x", "w")), ("Softmax", ("x",)), ("Div", ("x", "w")), ("Pow", ("x", "w")),
                         ("Exp", ("x",)), ("Reshape", ("x", "w")), ("If", ("x",)), ("Constant", ())):
        written(f"no_{kind}", [node(kind, *inputs)], {"w": w},
                f'the operator "{kind}" of node "the {kind}" is none that')
    written("no_domain", [node("Tanh", "x", domain="com.example")], {}, '"com.example.Tanh" of node "the Tanh" is none')
    written("two", [node("MatMul", "x", "x")], {}, "multiplies two vectors")
    written("long", [node("MatMul", "x", "w")], {"w": numbers(6, 5)}, "multiplies 5 numbers by a matrix of 6 rows")
    written("no_vector", [node("Add", "x", "c")], {"c": numbers(5, 1)}, '"c", which is no vector')
    written("lengths", [node("Sub", "x", "c")], {"c": numbers(4)}, "combines 5 numbers with 4")
    written("int64", [node("Add", "x", "c")], {"c": np.arange(5)}, '"c", which is of int64 numbers and not of float32')
    written("attribute", [node("Add", "x", "c", axis=1)], {"c": numbers(5)}, '"axis", of which a page knows nothing')
    written("kind", [node("LeakyRelu", "x", alpha=1)], {}, '"alpha" of a kind that is not known')
    written("turned", [node("Add", "x", "r", output="z"), node("Gemm", "z", "w", transA=1)], {"r": row, "w": w},
            "column")
    written("outer", [node("Add", "x", "r", output="z"), node("MatMul", "w", "z")], {"r": row, "w": w},
            "one of one row")
    written("bounds", [node("Clip", "x", "x")], {}, "computed bounds")
    written("nan", [node("Clip", "x", "c")], {"c": np.array(np.nan, np.float32)}, "bound that is no number")
    written("early", [node("Add", "x", "z")], {}, 'takes "z", which nothing before it gives')
    written("twice", [node("Tanh", "x"), node("Relu", "x")], {}, 'the name "y" stands for two things')
    written("still", [node("Identity", "w")], {"w": w}, 'the output "y" does not come from the controls')
    written("constants", [node("Add", "w", "w")], {"w": w}, "computes with constants")
    written("said", [node("Tanh", "x")], {}, "the output has 5 values, and is said to have 6", outputs=[6])


if __name__ == "__main__":
    write_trained()
    write_others()
    write_refused()
