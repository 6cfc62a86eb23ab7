"""Builds the native_host example against the header that the installed logicalline ships.

The build imports logicalline_dump to find that header, so it must run in the environment where
logicalline is installed: pip install --no-build-isolation ./examples/native_host
"""
from setuptools import Extension, setup

from logicalline_dump import logicalline_include

setup(
    name="native_host",
    version="0.1.0",
    description="Example host extension calling logicalline's native function table",
    ext_modules=[Extension("native_host", ["native_host.c"],
                           include_dirs=[logicalline_include()])],
    python_requires=">=3.10",
)
