import os
import sys

import pytest

sys.path.insert(0, os.path.join(os.path.dirname(os.path.dirname(__file__)), "bench"))
import compare  # noqa: E402


@pytest.mark.parametrize("flags, value, failed", [
    (["--check"], 2.0, True),  # a missed target fails the run
    (["--check"], 0.7, False),  # the aim, missed, is no target
    ([], 2.0, False),  # without --check the figures alone tell
])
def test_check_fails_the_run_on_a_missed_target(tmp_path, monkeypatch, capsys, flags, value,
                                                failed):
    (tmp_path / "x.py").write_bytes(b"x = 1\n")
    monkeypatch.setattr(compare, "MISSED", [])
    monkeypatch.setattr(compare, "run_comparison", lambda *options: compare.check(
        "a ratio", value, 1.0, aim=0.5, at_most=True))
    monkeypatch.setattr(sys, "argv", ["compare.py", str(tmp_path), *flags])
    try:
        compare.main()
        complaint = None
    except SystemExit as leaving:  # sys.exit with a message: status 1
        complaint = leaving.code
    assert ("NOT MET" in capsys.readouterr().out) == (value > 1.0)
    assert (complaint is not None) == failed and "a ratio" in (complaint or "a ratio")
