"""A small module to show what logicalline makes of Python source."""
import os
from collections import (OrderedDict,
                         defaultdict)

GREETING = "hello, " \
           "world"


@staticmethod
class Registry(dict):
    """Keeps named entries."""

    def register(self, name, value=None,
                 *, replace=False):
        if name in self and not replace:
            raise KeyError(name)
        self[name] = value  # last one wins
        return value

    async def load(self, path):
        with open(path) as handle:
            for line in handle:
                key, _, value = line.partition("=")
                self.register(key.strip(), value.strip(), replace=True)


def half_typed(a, b,
def complete(x):
    return [y for y in x
            if y]
