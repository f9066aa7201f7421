#!/usr/bin/env python3
"""Writes the network files that the model tests load, beside this script.

Needs the Python package onnx; the output is committed, so the tests do not. Weights are dyadic and small: outputs are
exact in float32 whatever the order of the sums. IR version and operator set are old enough for ONNX Runtime 1.16.
"""

from pathlib import Path

import numpy as np
from onnx import TensorProto, helper, numpy_helper

FOLDER = Path(__file__).resolve().parent
FLOAT = TensorProto.FLOAT


def tensor(name, shape, kind=FLOAT):
    return helper.make_tensor_value_info(name, kind, shape)


def write(name, nodes, inputs, outputs, constants=()):
    """Writes a model without checking it: several are wrong on purpose."""
    initializers = [numpy_helper.from_array(np.asarray(value), key) for key, value in constants]
    graph = helper.make_graph(nodes, "test", inputs, outputs, initializers)
    model = helper.make_model(graph, opset_imports=[helper.make_opsetid("", 13)], ir_version=7,
                              producer_name="neuralWarp tests")
    (FOLDER / f"{name}.onnx").write_bytes(model.SerializeToString())


def node(op, inputs, outputs, **attributes):
    return helper.make_node(op, inputs, outputs, **attributes)


def linear(inputs, outputs):
    """Weights [inputs, outputs]: (i + 1) / 8 - j / 4; bias: j / 2."""
    i, j = np.meshgrid(np.arange(inputs), np.arange(outputs), indexing="ij")
    return [("w", ((i + 1) / 8 - j / 4).astype(np.float32)), ("b", (np.arange(outputs) / 2).astype(np.float32))]


LINEAR = [node("MatMul", ["x", "w"], ["m"]), node("Add", ["m", "b"], ["y"])]


def usable():
    write("direct", LINEAR, [tensor("x", [7])], [tensor("y", [6])], linear(7, 6))
    write("coefficients", LINEAR, [tensor("x", [2])], [tensor("y", [1])], linear(2, 1))
    # shape [2, 3]: read in row-major order
    write("matrix_output", LINEAR[:1] + [node("Add", ["m", "b"], ["v"]), node("Reshape", ["v", "s"], ["y"])],
          [tensor("x", [7])], [tensor("y", [2, 3])], linear(7, 6) + [("s", np.array([2, 3], np.int64))])
    write("wide", [node("Expand", ["x", "s"], ["y"])], [tensor("x", [1])], [tensor("y", [3000])],
          [("s", np.array([3000], np.int64))])
    write("two_outputs", LINEAR + [node("Neg", ["y"], ["z"])], [tensor("x", [7])], [tensor("y", [6]), tensor("z", [6])],
          linear(7, 6))
    # the output is not computed by a kernel that could write into the caller's array
    write("identity", [node("Identity", ["x"], ["y"])], [tensor("x", [3])], [tensor("y", [3])])
    write("constant", [node("Constant", [], ["y"], value=numpy_helper.from_array(np.array([1, 2, 3], np.float32)))],
          [tensor("x", [3])], [tensor("y", [3])])
    write("initializer", [], [tensor("x", [3])], [tensor("y", [3])], [("y", np.array([1, 2, 3], np.float32))])
    # no declared output shape, but one that the runtime can infer
    write("inferred_output", LINEAR, [tensor("x", [7])], [tensor("y", None)], linear(7, 6))


def failing_run():
    # keeps the positive values: as many as declared only when all are
    write("data_dependent", [node("Greater", ["x", "zero"], ["c"]), node("Compress", ["x", "c"], ["y"], axis=0)],
          [tensor("x", [3])], [tensor("y", [3])], [("zero", np.array([0], np.float32))])


def refused():
    identity = [node("Identity", ["x"], ["y"])]
    for name, shape in [("input_scalar", []), ("input_rank2", [1, 3]), ("input_zero", [0]), ("input_symbolic", ["n"]),
                        ("input_negative", [-1]), ("input_too_large", [2**31]), ("input_low_bits", [2**32 + 3])]:
        write("bad_" + name, identity, [tensor("x", shape)], [tensor("y", shape)])
    write("bad_input_shapeless", [node("Flatten", ["x"], ["f"]), node("Reshape", ["f", "s"], ["y"])],
          [tensor("x", None)], [tensor("y", [3])], [("s", np.array([3], np.int64))])
    for name, kind in [("double", TensorProto.DOUBLE), ("int64", TensorProto.INT64)]:
        write("bad_input_" + name, [node("Cast", ["x"], ["y"], to=FLOAT)], [tensor("x", [3], kind)],
              [tensor("y", [3])])
        write("bad_output_" + name, [node("Cast", ["x"], ["y"], to=kind)], [tensor("x", [3])],
              [tensor("y", [3], kind)])

    # output shapes that depend on data, so that the declaration is all the runtime knows
    selected = [node("NonZero", ["x"], ["i"]), node("Cast", ["i"], ["y"], to=FLOAT)]
    for name, shape in [("symbolic", [1, "n"]), ("zero", [0, 3]), ("negative", [1, -1]), ("overflow", [65536, 32768])]:
        write("bad_output_" + name, selected, [tensor("x", [3])], [tensor("y", shape)])
    write("bad_output_scalar", [node("ReduceMax", ["x"], ["y"], keepdims=0)], [tensor("x", [3])], [tensor("y", [])])
    # which dimensions go depends on data, so the runtime cannot infer even their number
    write("bad_output_shapeless", selected[:1] + [node("Cast", ["i"], ["f"], to=FLOAT), node("Squeeze", ["f"], ["y"])],
          [tensor("x", [3])], [tensor("y", None)])
    sequence = helper.make_tensor_sequence_value_info("y", FLOAT, [3])
    write("bad_output_sequence", [node("SequenceConstruct", ["x"], ["y"])], [tensor("x", [3])], [sequence])

    write("bad_two_inputs", [node("Add", ["x", "w"], ["y"])], [tensor("x", [3]), tensor("w", [3])],
          [tensor("y", [3])])
    write("bad_no_input", [node("Identity", ["w"], ["y"])], [], [tensor("y", [3])], [("w", np.zeros(3, np.float32))])
    write("bad_no_output", identity, [tensor("x", [3])], [])
    write("bad_pass_through", [], [tensor("x", [3])], [tensor("x", [3])])
    write("bad_operator", [node("NoSuchOperator", ["x"], ["y"])], [tensor("x", [3])], [tensor("y", [3])])


def damaged():
    whole = (FOLDER / "direct.onnx").read_bytes()
    (FOLDER / "bad_truncated.onnx").write_bytes(whole[: len(whole) // 2])
    (FOLDER / "bad_empty.onnx").write_bytes(b"")
    (FOLDER / "bad_text.onnx").write_bytes(b"This is no network.\n")


if __name__ == "__main__":
    usable()
    failing_run()
    refused()
    damaged()
