# SPDX-License-Identifier: Apache-2.0
"""A small character with everything that a page shows, made without training: the arm of examples/arm with fewer
vertices, a texture, two morph targets and a motion; its model is made by hand. Its names are what nobody should call
anything."""

import copy
import io
import json
import subprocess
import sys
from pathlib import Path

import numpy as np
from PIL import Image

ROOT = Path(__file__).resolve().parents[4]
sys.path[:0] = [str(ROOT / "examples" / folder) for folder in ("arm", "wave")]

import arm_shape  # noqa: E402

arm_shape.RINGS, arm_shape.AROUND = 36, 20

import write_arm  # noqa: E402
from make import block, number, vector  # noqa: E402

HOSTILE = ["</script><script>window.hacked=1</script>", "\" onmouseover='window.hacked=2' <img src=x onerror=hacked=3>"]
TITLE = "the arm </title></script><img src=x onerror='window.hacked=4'> &amp; \"co\""
FRAMES = 9
CONTROLS = 14  # six numbers of each of two joints, and two weights
SHAPES = 4  # the last of which no frame uses


def tensor(name: str, array: np.ndarray) -> bytes:
    sizes = b"".join(number(1, size) for size in array.shape)
    return block(5, sizes + number(2, 1) + block(8, name) + block(9, array.astype("<f4").tobytes()))


def node(kind: str, inputs: str, output: str) -> bytes:
    return block(1, b"".join(block(1, name) for name in inputs.split()) + block(2, output) + block(4, kind))


def network() -> bytes:
    """SiLU between two layers, as an ONNX file."""
    draw = np.random.default_rng(19)
    second = draw.normal(0, 0.5, (8, SHAPES))
    second[:, -1] = 0
    graph = (node("MatMul", "controls first", "a") + node("Add", "a bias", "b") + node("Sigmoid", "b", "s")
             + node("Mul", "b s", "h") + node("MatMul", "h second", "coefficients") + block(2, "arm")
             + tensor("first", draw.normal(0, 0.7, (CONTROLS, 8))) + tensor("bias", draw.normal(0, 0.2, 8))
             + tensor("second", second) + block(11, vector("controls", CONTROLS))
             + block(12, vector("coefficients", SHAPES)))
    return number(1, 7) + block(7, graph) + block(8, number(2, 13))


def texture() -> bytes:
    """Red towards the shoulder, green towards the hand; blue on the side that is away from the viewer at first."""
    picture = Image.new("RGB", (8, 8), (200, 30, 30))
    picture.paste((30, 170, 40), (4, 0, 8, 4))
    picture.paste((30, 40, 200), (0, 4, 8, 8))
    file = io.BytesIO()
    picture.save(file, "PNG")
    return file.getvalue()


def write_character(path: Path) -> None:
    description, binary = copy.deepcopy(write_arm.character())

    def add_view(content: bytes) -> int:
        nonlocal binary
        binary += b"\0" * (-len(binary) % 4)
        description["bufferViews"].append({"buffer": 0, "byteOffset": len(binary), "byteLength": len(content)})
        binary += content
        return len(description["bufferViews"]) - 1

    points = arm_shape.arm_points()[write_arm.with_seam()[0]]
    deltas = [points * [0, 0.3, 0] * arm_shape.bump(points[:, :1], 0.1, 0.06),
              points * [0, 0, 0.5] * arm_shape.bump(points[:, :1], 0.36, 0.06)]
    targets = []
    for delta in deltas:
        view = add_view(delta.astype("<f4").tobytes())
        description["accessors"].append({"bufferView": view, "componentType": write_arm.FLOAT, "count": len(delta),
                                         "type": "VEC3", "min": delta.min(0).tolist(), "max": delta.max(0).tolist()})
        targets.append({"POSITION": len(description["accessors"]) - 1})
    mesh = description["meshes"][0]
    mesh["primitives"][0]["targets"] = targets
    mesh["weights"] = [0, 0]
    mesh["extras"] = {"targetNames": HOSTILE}
    description["images"] = [{"bufferView": add_view(texture()), "mimeType": "image/png"}]
    description["textures"] = [{"source": 0}]
    description["materials"][0]["pbrMetallicRoughness"].update(baseColorTexture={"index": 0},
                                                               baseColorFactor=[1, 1, 1, 1])
    for joint in description["nodes"][2:]:
        joint["name"] += "</script>"
    description["buffers"][0]["byteLength"] = len(binary)
    body = write_arm.chunk(b"JSON", json.dumps(description).encode(), b" ") + write_arm.chunk(b"BIN\0", binary, b"\0")
    path.write_bytes(write_arm.struct.pack("<4sII", b"glTF", 2, 12 + len(body)) + body)


def write_model(folder: Path, rest: np.ndarray) -> None:
    folder.mkdir(parents=True)
    along = rest[:, :1]
    outwards = rest * [0, 1, 1]
    shapes = np.stack([outwards * arm_shape.bump(along, place, 0.08) for place in (0.1, 0.27, 0.4, 0.55)])
    (folder / "model.onnx").write_bytes(network())
    (folder / "principal_shapes.json").write_text(json.dumps({
        "principalShapeCount": SHAPES, "vertCount": len(rest),
        "principalShapes": shapes.reshape(SHAPES, -1).tolist()}))
    (folder / "metadata.json").write_text(json.dumps({
        "deltaMode": 1, "smoothingIterations": 3, "fullCount": len(rest), "affectCount": len(rest),
        "deltaCount": len(rest), "subsetState": "complete", "componentTagExpression": "*", "geometry": "arm"}))


class SmallArm:
    """The character in a folder: its scene with motion, targets and a model, and what quarn says of it."""

    def __init__(self, folder: Path, quarn: str) -> None:
        self.folder, self.program, self.scene = folder, quarn, folder / "motion.json"
        folder.mkdir()
        write_character(folder / "arm.glb")
        weights = [f"arm_sliders.{name}" for name in HOSTILE]
        joints = [f"{name}</script>" for name in ("forearm", "hand")]
        (folder / "limits.json").write_text(json.dumps({
            joints[0]: {"rotateZ": [0, 120]}, joints[1]: {"rotateX": [-60, 60], "rotateZ": [-40, 40]},
            **{name: [0, 1] for name in weights}}))
        self.quarn("import", "arm.glb", "-o", "arm.json", "--neural-warp", "--limits", "limits.json", "--no-animation")
        keys: "dict[str, list[float]]" = {
            "forearm__script_.rotateZ": [0, 90, 30], "hand__script_.rotateX": [0, -50, 50],
            "hand__script_.rotateZ": [0, -30, 20], **{name: [0, 1, 0.5] for name in weights}}
        (folder / "keys.json").write_text(json.dumps({
            "unit": "degrees", "interpolation": "smooth",
            "keys": {name: list(zip((1, 5, FRAMES), values)) for name, values in keys.items()}}))
        self.quarn("pose", "arm.json", "-o", "motion.json", "--keys", "keys.json")
        skin = self.play("--plug", "arm_skin.outputGeom[0]")
        swell = 0.01 * np.sin(40 * skin[0, :, :1]) * np.linspace(0, 1, FRAMES)[:, None, None]
        np.save(folder / "target.npy", (skin + swell * [0, 1, 0]).astype("<f4"))
        self.quarn("target", "motion.json", "--cache", "target.npy", "--anyway", "-o", "motion.json")
        write_model(folder / "models" / "arm.nwrp", skin[0].astype(float))

    def quarn(self, *words: str) -> str:
        """What it says on standard output."""
        done = subprocess.run([self.program, *words], cwd=self.folder, text=True, stdout=subprocess.PIPE,
                              stderr=subprocess.PIPE)
        if done.returncode:
            raise AssertionError(f"quarn {' '.join(words)}: status {done.returncode}\n{done.stdout}{done.stderr}")
        return done.stdout

    def play(self, *words: str, scene: str = "motion.json") -> np.ndarray:
        """Points, [F, V, 3]."""
        self.quarn("play", scene, "-o", "played.npy", "--quiet", *words)
        return np.load(self.folder / "played.npy")

    def posed(self, frame: int, values: "dict[str, float]") -> np.ndarray:
        """Points, [V, 3], at a frame with plugs that are set, whatever moved them before."""
        moved = {target: source for source, target in json.loads(self.scene.read_text())["connections"]}
        lines = ["file -open motion.json"]
        for plug, value in values.items():
            lines += [f"disconnectAttr {moved[plug]} {plug}", f"setAttr {plug} {value!r}"]
        (self.folder / "set.txt").write_text("\n".join([*lines, "file -saveAs set.json", ""]))
        self.quarn("exec", "set.txt")
        return self.play("--frames", f"{frame}-{frame}", scene="set.json")[0]
