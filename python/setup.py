# Builds metainfo._core with the library's own CMake build (the repository
# above this folder), target metainfo_py, and packages it with metainfo/.
import pathlib
import re
import shutil
import subprocess
import sys

from setuptools import Extension, setup
from setuptools.command.build_ext import build_ext

ROOT = pathlib.Path(__file__).resolve().parent.parent
VERSION = re.search(r'MM_VERSION_STRING "([0-9.]+)"', (ROOT / "include/metainfo/version.h").read_text())[1]


class CMakeBuild(build_ext):
    def build_extension(self, ext):
        build = pathlib.Path(self.build_temp).resolve() / "cmake"
        configure = ["cmake", "-S", str(ROOT), "-B", str(build), "-DCMAKE_BUILD_TYPE=Release"]
        configure += ["-DMETAINFO_TESTS=OFF", f"-DPython3_EXECUTABLE={sys.executable}"]
        subprocess.run(configure, check=True)
        subprocess.run(["cmake", "--build", str(build), "-j2", "--target", "metainfo_py"], check=True)
        built = next((build / "python" / "metainfo").glob("_core*.so"))
        target = pathlib.Path(self.get_ext_fullpath(ext.name))
        target.parent.mkdir(parents=True, exist_ok=True)
        shutil.copy(built, target)


setup(version=VERSION, ext_modules=[Extension("metainfo._core", sources=[])], cmdclass={"build_ext": CMakeBuild})
