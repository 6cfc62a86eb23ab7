"""The host guide's and the README's examples: their sessions run, their typed snippets
type-check and run, the guide's C excerpts are quoted from the native example as it stands."""
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


def test_readme_examples(tmp_path, capsys):
    code = "\n".join(re.findall(r"^```python\n(.*?)^```$", (ROOT / "README.md").read_text(),
                                re.S | re.M))
    path = tmp_path / "readme.py"
    path.write_text(code)
    result = run_mypy(path)
    assert result.returncode == 0, result.stdout + result.stderr
    names = {"__name__": "readme"}
    exec(compile(code, str(path), "exec"), names)
    assert "('f', (0, 4))" in capsys.readouterr().out
    path.write_bytes(b"# coding: uft-8\nx = 'caf\xc3\xa9'\n")  # a refused declaration reads on
    assert names["read_source"](names["parser"], str(path))[0].fTokens[2][0] == "'café'"
