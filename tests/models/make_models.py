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


def write(name, nodes, inputs, outputs, constants=(), raw_constants=(), functions=()):
    """Writes a model without checking it: several are wrong on purpose."""
    initializers = [numpy_helper.from_array(np.asarray(value), key) for key, value in constants] + list(raw_constants)
    graph = helper.make_graph(nodes, "test", inputs, outputs, initializers)
    imports = [helper.make_opsetid("", 13)] + [helper.make_opsetid(function.domain, 1) for function in functions]
    model = helper.make_model(graph, opset_imports=imports, ir_version=8 if functions else 7,
                              producer_name="neuralWarp tests", functions=list(functions))
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
                        ("input_negative", [-1]), ("input_too_large", [2**31]), ("input_low_bits", [2**32 + 3]),
                        ("input_huge", [10**9])]:
        write("bad_" + name, identity, [tensor("x", shape)], [tensor("y", shape)])
    write("bad_input_shapeless", [node("Flatten", ["x"], ["f"]), node("Reshape", ["f", "s"], ["y"])],
          [tensor("x", None)], [tensor("y", [3])], [("s", np.array([3], np.int64))])
    double = TensorProto.DOUBLE
    write("bad_input_double", [node("Cast", ["x"], ["y"], to=FLOAT)], [tensor("x", [3], double)], [tensor("y", [3])])
    write("bad_output_double", [node("Cast", ["x"], ["y"], to=double)], [tensor("x", [3])], [tensor("y", [3], double)])

    # output shapes that depend on data, so that the declaration is all the runtime knows
    selected = [node("NonZero", ["x"], ["i"]), node("Cast", ["i"], ["y"], to=FLOAT)]
    for name, shape in [("symbolic", [1, "n"]), ("zero", [0, 3]), ("negative", [1, -1]), ("overflow", [65536, 32768])]:
        write("bad_output_" + name, selected, [tensor("x", [3])], [tensor("y", shape)])
    write("bad_output_huge", [node("Expand", ["x", "s"], ["y"])], [tensor("x", [1])], [tensor("y", [2 * 10**9])],
          [("s", np.array([2 * 10**9], np.int64))])
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


def loop(rounds, body):
    """Adds x to a sum in each round; `rounds` names their number, or nothing."""
    return [node("Loop", [rounds, "go", "zeros"], ["y"], body=body)]


def body(prefix, nodes=(), constants=()):
    """The round of a loop that adds x: with `nodes`, what they make is added in place of it."""
    added = prefix + "added" if nodes else "x"
    nodes = [*nodes, node("Add", [prefix + "v", added], [prefix + "w"]),
             node("Identity", [prefix + "c"], [prefix + "d"])]
    return helper.make_graph(
        nodes, prefix + "round",
        [tensor(prefix + "i", [], TensorProto.INT64), tensor(prefix + "c", [], TensorProto.BOOL),
         tensor(prefix + "v", [3])],
        [tensor(prefix + "d", [], TensorProto.BOOL), tensor(prefix + "w", [3])],
        [numpy_helper.from_array(np.asarray(value), key) for key, value in constants])


def loops():
    start = [("go", np.array(True)), ("zeros", np.zeros(3, np.float32))]
    ends = [tensor("x", [3])], [tensor("y", [3])]

    def constant(value):
        return [("n", np.array(value, np.int64))]

    write("loop", loop("n", body("")), *ends, start + constant(3))
    write("bad_loop_endless", loop("", body("")), *ends, start)
    write("bad_loop_long", loop("n", body("")), *ends, start + constant(10001))
    inner = helper.make_node("Loop", ["n", "go", "zeros"], ["added"], body=body("inner_"))
    write("bad_loop_nested", loop("n", body("", [inner])), *ends, start + constant(101))
    # the number is what the controls make of it, although a constant elsewhere has its name
    counted = [node("ReduceMax", ["x"], ["m"], keepdims=0), node("Cast", ["m"], ["n"], to=TensorProto.INT64)]
    write("bad_loop_computed", counted + loop("n", body("", constants=constant(3))), *ends, start)
    function = helper.make_function("own", "F", ["n", "go", "zeros", "x"], ["y"], loop("n", body("")),
                                    [helper.make_opsetid("", 13)])
    call = node("F", ["n", "go", "zeros", "x"], ["y"], domain="own")
    write("bad_loop_in_function", [call], *ends, start + constant(3), functions=[function])


def elsewhere(values, name):
    """A tensor whose data would be read from a file of the system."""
    there = numpy_helper.from_array(np.asarray(values, np.float32), name)
    there.ClearField("raw_data")
    there.data_location = TensorProto.EXTERNAL
    for key, value in (("location", "../../../../../../etc/hostname"), ("length", "12")):
        there.external_data.add(key=key, value=value)
    return there


def external():
    ends = [tensor("x", [3])], [tensor("y", [3])]
    add = [node("Add", ["x", "b"], ["y"])]
    there = elsewhere([1, 2, 3], "b")
    write("bad_external", add, *ends, raw_constants=[there])
    write("bad_external_constant", [node("Constant", [], ["b"], value=there), *add], *ends)
    branch = helper.make_graph([node("Add", ["x", "b"], ["t"])], "then", [], [tensor("t", [3])], [there])
    other = helper.make_graph([node("Identity", ["x"], ["e"])], "else", [], [tensor("e", [3])])
    write("bad_external_in_branch", [node("If", ["go"], ["y"], then_branch=branch, else_branch=other)], *ends,
          [("go", np.array(True))])


def block(field, content):
    """A part in the wire format of protocol buffers, of less than 16 KiB."""
    low, high = len(content) & 127, len(content) >> 7
    return bytes([field << 3 | 2] + ([low | 128, high] if high else [low])) + content


def damaged():
    deep = b""
    for _ in range(60):  # a graph in an attribute of a node of a graph
        deep = block(1, block(5, block(6, deep)))
    (FOLDER / "bad_nested_deep.onnx").write_bytes(block(7, deep))
    (FOLDER / "bad_protobuf.onnx").write_bytes(block(7, block(2, b"\xff\xfe")) + bytes([0, 0]))
    whole = (FOLDER / "direct.onnx").read_bytes()
    (FOLDER / "bad_truncated.onnx").write_bytes(whole[: len(whole) // 2])
    (FOLDER / "bad_empty.onnx").write_bytes(b"")
    (FOLDER / "bad_text.onnx").write_bytes(b"This is no network.\n")


if __name__ == "__main__":
    usable()
    failing_run()
    refused()
    loops()
    external()
    damaged()
