"""Companion of the logicalline module: a dump tool for logical lines, the decoding that it reads
files with, and the location of the C header that declares the module's direct function table."""

import os

from .reading import source_to_utf8

__all__ = ["logicalline_include", "source_to_utf8"]


def logicalline_include() -> str:
    """Return the directory that holds logicalline_direct.h, for building host extensions."""
    here = os.path.dirname(os.path.abspath(__file__))
    installed = os.path.join(here, "include")
    if os.path.exists(os.path.join(installed, "logicalline_direct.h")):
        return installed
    # Running from a source checkout: the header sits at the top of the tree.
    return os.path.join(os.path.dirname(os.path.dirname(here)), "include")
