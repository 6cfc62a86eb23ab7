# Opt-in runs that take minutes; the normal suite stays fast.

OPTIONS = [
    ("--exhaustive", "compare token starts on every 3-byte input (about a minute)"),
    ("--full-stdlib", "check every standard library file against the model"),
]


def pytest_addoption(parser):
    for name, help_text in OPTIONS:
        parser.addoption(name, action="store_true", default=False, help=help_text)
