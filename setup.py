# SPDX-License-Identifier: MIT
"""Builds the Python package by the project's CMake; all else stands in pyproject.toml."""
import os
import pathlib
import re
import subprocess
import sys

from setuptools import Extension, setup
from setuptools.command.build_ext import build_ext

root = pathlib.Path(__file__).resolve().parent
version = re.search(r"project\(LumraAlgo VERSION ([\d.]+)", (root / "CMakeLists.txt").read_text()).group(1)


class BuildWithCMake(build_ext):
    def build_extension(self, extension):
        """The module, which holds the library."""
        package = pathlib.Path(self.get_ext_fullpath(extension.name)).resolve().parent
        build = pathlib.Path(self.build_temp).resolve() / "cmake"
        only_python = [f"-DLUMRA_{part}=OFF" for part in ("TOOLS", "TESTS", "EXAMPLES")]
        subprocess.run(["cmake", "-S", root, "-B", build, "-G", "Ninja", "-DCMAKE_BUILD_TYPE=Release", "-DLUMRA_PYTHON=ON",
                        f"-DPython_EXECUTABLE={sys.executable}", "-DLUMRA_PYTHON_DIR=.", *only_python], check=True)  # fmt: skip
        jobs = str(self.parallel or len(os.sched_getaffinity(0)))
        subprocess.run(["cmake", "--build", build, "--target", "lumra_python", "-j", jobs], check=True)
        subprocess.run(["cmake", "--install", build, "--component", "python", "--prefix", package.parent], check=True)


setup(
    version=version,
    packages=["lumra"],
    package_dir={"": "python"},
    package_data={"lumra": ["py.typed", "*.pyi"]},
    ext_modules=[Extension("lumra._lumra", [])],
    cmdclass={"build_ext": BuildWithCMake},
    zip_safe=False,
)
