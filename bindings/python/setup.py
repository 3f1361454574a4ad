"""What pyproject.toml cannot say: a wheel that has the libraries is for one kind of machine.

The Python code runs with every Python 3, whatever the machine; a wheel that is built from the
source archive has no libraries, and uses those that the system has.
"""

import glob

from setuptools import Distribution, setup
from wheel.bdist_wheel import bdist_wheel

HAS_LIBRARIES = bool(glob.glob("kzsdk/_libraries/*"))


class Package(Distribution):
    def has_ext_modules(self):
        return HAS_LIBRARIES


class Wheel(bdist_wheel):
    def get_tag(self):
        python, abi, platform = super().get_tag()
        return ("py3", "none", platform) if HAS_LIBRARIES else (python, abi, platform)


setup(cmdclass={"bdist_wheel": Wheel}, distclass=Package)
