# --exhaustive: runs the token start comparison over every 3-byte input (about a minute).
# Chains any pytest_addoption defined above, so that each block here adds its own option.
_addoption_before_exhaustive = globals().get("pytest_addoption")


def pytest_addoption(parser):
    if _addoption_before_exhaustive is not None:
        _addoption_before_exhaustive(parser)
    parser.addoption("--exhaustive", action="store_true", default=False,
                     help="compare token starts on every 3-byte input")


# --full-stdlib: compares the model with the module on every .py file of the standard library.
_addoption_before_full_stdlib = globals().get("pytest_addoption")


def pytest_addoption(parser):
    if _addoption_before_full_stdlib is not None:
        _addoption_before_full_stdlib(parser)
    parser.addoption("--full-stdlib", action="store_true", default=False,
                     help="compare the reader with its model on every standard library file")
