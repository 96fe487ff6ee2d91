"""Builds the Python package: `pip install .` in this folder.

CMake compiles the module with our libraries inside it. The libraries that they use (GDAL, PROJ, GEOS,
expat, OpenMP) are those of the system.
"""

import os
import pathlib
import subprocess
import sys

from setuptools import Extension, setup
from setuptools.command.build_ext import build_ext

ROOT = pathlib.Path(__file__).resolve().parent


class BuildByCMake(build_ext):
    def build_extension(self, ext):
        target = pathlib.Path(self.get_ext_fullpath(ext.name)).resolve()
        tree = pathlib.Path(self.build_temp).resolve()
        options = [
            "-DCMAKE_BUILD_TYPE=Release",
            "-DCMAKE_POSITION_INDEPENDENT_CODE=ON",
            "-DBUILD_SHARED_LIBS=OFF",
            "-DKELM_TIN_BUILD_TESTS=OFF",
            "-DKELM_TIN_BUILD_EXAMPLES=OFF",
            "-DKELM_TIN_BUILD_PYTHON=ON",
            f"-DKELM_TIN_PYTHON={sys.executable}",
        ]
        subprocess.run(["cmake", "-S", ROOT, "-B", tree, *options], check=True)
        jobs = str(os.cpu_count() or 1)
        build = ["cmake", "--build", tree, "--parallel", jobs, "--target", "kelm_tin_python"]
        subprocess.run(build, check=True)
        target.parent.mkdir(parents=True, exist_ok=True)
        self.copy_file(str(tree / "python" / "kelm_tin" / target.name), str(target))


setup(ext_modules=[Extension("kelm_tin._native", [])], cmdclass={"build_ext": BuildByCMake})
