"""The host guide's examples: its sessions run, its typed snippets type-check, its C excerpts are
quoted from the native example as it stands."""
import doctest
import pathlib
import re

from test_type_stub import run_mypy

ROOT = pathlib.Path(__file__).resolve().parent.parent
GUIDE = ROOT / "docs" / "host_guide.md"


def test_examples(monkeypatch, tmp_path):
    monkeypatch.chdir(ROOT)  # the guide opens a file of this repository by its relative path
    result = doctest.testfile(str(GUIDE), module_relative=False, optionflags=doctest.ELLIPSIS)
    assert result.attempted > 40 and result.failed == 0
    blocks = {language: re.findall(rf"^```{language}\n(.*?)^```$", GUIDE.read_text(), re.S | re.M)
              for language in ("python", "c")}
    for number, code in enumerate(code for code in blocks["python"] if ">>>" not in code):
        path = tmp_path / f"snippet_{number}.py"
        path.write_text(code)
        result = run_mypy(path)
        assert result.returncode == 0, result.stdout + result.stderr
        exec(compile(code, str(path), "exec"), {"__name__": "snippet"})
    source = (ROOT / "examples" / "native_host" / "native_host.c").read_text()
    assert len(blocks["c"]) >= 2 and all(excerpt in source for excerpt in blocks["c"])
