# SPDX-License-Identifier: Apache-2.0
"""What pyproject.toml cannot say: the module neuralwarp is packed where `./run package` has put it together with its
libraries, beside this file. Elsewhere, as in a checkout or in share/neuralWarp, the trainer is alone."""

from pathlib import Path

from setuptools import Distribution, setup

has_module = (Path(__file__).resolve().parent / "neuralwarp").is_dir()


class OfOnePlatform(Distribution):
    def has_ext_modules(self) -> bool:
        return has_module


setup(
    packages=["neuralwarp_trainer", *(["neuralwarp"] if has_module else [])],
    package_dir={"neuralwarp_trainer": "trainer"},
    package_data={"neuralwarp": ["**/*"]},
    distclass=OfOnePlatform,
)
