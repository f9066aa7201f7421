#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""pack_python.py PREFIX OUTPUT: from the tree that cmake --install made in PREFIX, a wheel and the add-on for Blender.

Both carry every library that the module needs and that is not a part of the C or C++ runtime, beside it, each with its
licence (decision 0200). The interpreter that runs this has to be of the version that the module was built for.
"""

import os
import shutil
import subprocess
import sys
import tempfile
import zipfile
from pathlib import Path
from sysconfig import get_config_var

ROOT = Path(__file__).resolve().parent.parent
ADD_ON = ROOT / "clients" / "blender" / "neuralwarp_blender"
VERSION = (ROOT / "VERSION").read_text().strip()
LONG_AGO = 315532800  # the first second of 1980, before which a zip knows no time: the same tree gives the same bytes

# what every Linux with a C++ runtime has
RUNTIME = {"libc.so.6", "libm.so.6", "libdl.so.2", "libpthread.so.0", "librt.so.1", "ld-linux-x86-64.so.2",
           "linux-vdso.so.1", "libgcc_s.so.1", "libstdc++.so.6"}
COMPILED_IN = ("pybind11-dev", "rapidjson-dev", "libxxhash-dev")  # packages of which only headers are used
DEBIAN = Path("/usr/share/doc")


def said(*command: "str | Path") -> str:
    """What a command says on standard output; its errors end the program."""
    done = subprocess.run(command, text=True, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                          env={**os.environ, "LC_ALL": "C"})
    if done.returncode:
        sys.exit(f"pack_python: {' '.join(map(str, command))}\n{done.stdout}")
    return done.stdout


def libraries_of(file: Path) -> dict[str, Path]:
    """Names and places of the libraries that the loader takes for this file, those of the runtime aside."""
    found = {}
    for line in said("ldd", file).splitlines():
        name, arrow, place = line.strip().partition(" => ")
        if not arrow or name in RUNTIME:
            continue
        if place == "not found":
            sys.exit(f"pack_python: {name}, which {file.name} needs, is not found")
        found[name] = Path(place.rpartition(" (")[0]).resolve()
    return found


def debian_package_of(library: Path) -> str:
    for line in said("dpkg-query", "-S", f"*/{library.name}").splitlines():
        package, _, place = line.partition(": ")
        if Path(place).exists() and library.samefile(place):
            return package.partition(":")[0]
    sys.exit(f"pack_python: no package of this system has {library}, and so nothing says under which licence it is")


def licence_of(library: Path, prefix: Path) -> "tuple[str, Path]":
    """A name and the text: of a library of the tree what was installed with it, of the system's that of its package."""
    if library.is_relative_to(prefix):
        beside = prefix / "share" / "doc" / "neuralWarp" / f"LICENSE.{library.name[3:].partition('.')[0]}"
        return (beside.name, beside) if beside.exists() else ("LICENSE", beside.with_name("LICENSE"))
    package = debian_package_of(library)
    return f"LICENSE.{package}", DEBIAN / package / "copyright"


def put_together(prefix: Path, folder: Path) -> None:
    """The package neuralwarp, complete: module, plug-in, libraries, kernels where the host looks for them, licences."""
    installed = prefix / "lib" / "python3" / "neuralwarp"
    modules = list(installed.glob(f"*{get_config_var('EXT_SUFFIX')}"))
    if not modules:
        sys.exit(f"pack_python: {installed} has no module for this interpreter, which is {sys.executable}")
    shutil.copytree(installed, folder, ignore=shutil.ignore_patterns("__pycache__"))
    shutil.copytree(prefix / "share" / "OpenQuarn" / "GPUBuiltInDeformer", folder / "resources" / "GPUBuiltInDeformer")
    licences = folder / "licences"
    licences.mkdir()
    for file in [*modules, installed / "neuralWarp.so"]:
        for name, place in libraries_of(file).items():
            shutil.copyfile(place, folder / name)
            title, text = licence_of(place, prefix.resolve())
            shutil.copyfile(text, licences / title)
    for header in COMPILED_IN:
        shutil.copyfile(DEBIAN / header / "copyright", licences / f"LICENSE.{header}")
    for file in folder.glob("*.so*"):
        said("strip", "--strip-unneeded", file)
        said("patchelf", "--set-rpath", "$ORIGIN", file)


def make_wheel(prefix: Path, package: Path, work: Path, output: Path) -> None:
    source = work / "distribution"
    shutil.copytree(prefix / "share" / "neuralWarp", source, ignore=shutil.ignore_patterns("examples", "__pycache__"))
    shutil.copytree(package, source / "neuralwarp")
    build = ("import os, sys; from setuptools import build_meta",
             "os.chdir(sys.argv[1])",
             "build_meta.build_wheel(sys.argv[2])")
    said(sys.executable, "-c", "; ".join(build), source, output)


def make_add_on(package: Path, output: Path) -> None:
    files = {Path(ADD_ON.name, file.relative_to(ADD_ON)): file for file in ADD_ON.rglob("*")
             if file.is_file() and "__pycache__" not in file.parts}
    files |= {Path(ADD_ON.name, "lib", package.name, file.relative_to(package)): file for file in package.rglob("*")
              if file.is_file()}
    with zipfile.ZipFile(output / f"{ADD_ON.name}-{VERSION}.zip", "w", zipfile.ZIP_DEFLATED) as archive:
        for name in sorted(files):
            entry = zipfile.ZipInfo(name.as_posix())
            entry.compress_type = zipfile.ZIP_DEFLATED
            entry.external_attr = 0o100644 << 16
            archive.writestr(entry, files[name].read_bytes())


def main() -> None:
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    prefix, output = Path(sys.argv[1]).resolve(), Path(sys.argv[2]).resolve()
    output.mkdir(parents=True, exist_ok=True)
    os.environ.setdefault("SOURCE_DATE_EPOCH", str(LONG_AGO))
    with tempfile.TemporaryDirectory() as name:
        work = Path(name)
        put_together(prefix, work / "neuralwarp")
        make_wheel(prefix, work / "neuralwarp", work, output)
        make_add_on(work / "neuralwarp", output)


main()
