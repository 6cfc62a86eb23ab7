"""Scaling: shapes of source that stretch one dimension each, timed against the ordinary
corpus per MB and per token."""

from contenders import best_of, floor_body, logicalline_body, logicalline_census, progress
from corpus import MB


def long_string_source():
    body = b"".join(b"text line %d\n" % i for i in range(199_999))
    return b'text = """\n' + body + b'"""\n'


def long_bracket_source():
    # 500,000 numbers and as many commas, 10 of each to a physical line
    rows = (b"    " + b" ".join(b"%d," % (i * 10 + k) for k in range(10)) + b"\n"
            for i in range(50_000))
    return b"values = [\n" + b"".join(rows) + b"]\n"


def long_physical_line_source():
    chunk = b"alpha_value + compute(beta_item, 'gamma text') * 23, "  # about ordinary token density
    count = 10_000_000 // len(chunk)
    return b"result = f(" + chunk * count + b"0)\n"


def many_statements_source():
    return b"".join(b"name_%d = %d\n" % (i, i) for i in range(100_000))


SCALING_CASES = [
    ("triple-quoted string, 200,000 lines", long_string_source),
    ("bracketed literal, 1,000,000 tokens", long_bracket_source),
    ("one physical line of 10 MB", long_physical_line_source),
    ("100,000 short statements", many_statements_source),
]


def run_scaling(parser, parse_reference, tokens_reference, buffer_reference, runs):
    """References are (seconds per MB, seconds per token) of the ordinary corpus: parsing
    through readline, the same plus fTokens, and parsing through the buffer entry point.
    Returns the worst per-MB ratio of each of the three columns; a case that fails counts as
    infinite in all three."""
    print(f"{'case':<38} {'MB':>5} {'tokens':>10} {'parse s':>8} {'per MB':>7} {'per tok':>7} "
          f"{'+fTokens s':>10} {'per MB':>7} {'per tok':>7} {'x floor':>7} {'buffer s':>8} "
          f"{'per MB':>7}")
    flagged = []
    worst = {"parse": 0.0, "tokens": 0.0, "buffer": 0.0}
    for name, make in SCALING_CASES:
        data = make()
        size = len(data) / MB
        try:
            tokens, failed, _ = logicalline_census(parser)([data])
            parse_s, _ = best_of(runs, logicalline_body(parser, False), [data])
            tokens_s, _ = best_of(runs, logicalline_body(parser, True), [data])
            floor_s, _ = best_of(runs, floor_body, [data])
            buffer_s, _ = best_of(runs, logicalline_body(parser, False, from_buffer=True), [data])
        except Exception as error:  # a case that breaks the module is a finding, not a crash
            print(f"{name:<38} {size:>5.1f} failed: {type(error).__name__}: {error}")
            flagged.append(name)
            worst = {path: float("inf") for path in worst}
            continue
        parse_mb = (parse_s / size) / parse_reference[0]
        tokens_mb = (tokens_s / size) / tokens_reference[0]
        buffer_mb = (buffer_s / size) / buffer_reference[0]
        parse_tok = (parse_s / max(tokens, 1)) / parse_reference[1]
        tokens_tok = (tokens_s / max(tokens, 1)) / tokens_reference[1]
        for column, ratio in (("parse", parse_mb), ("tokens", tokens_mb), ("buffer", buffer_mb)):
            worst[column] = max(worst[column], ratio)
        marks = "  <-- above 2x per MB" if max(parse_mb, tokens_mb, buffer_mb) > 2 else ""
        per_token = tokens >= 1000  # a few tokens carrying megabytes say nothing per token
        parse_tok = f"{parse_tok:>6.2f}x" if per_token else f"{'-':>7}"
        tokens_tok = f"{tokens_tok:>6.2f}x" if per_token else f"{'-':>7}"
        print(f"{name:<38} {size:>5.1f} {tokens:>10,} {parse_s:>8.3f} {parse_mb:>6.2f}x "
              f"{parse_tok} {tokens_s:>10.3f} {tokens_mb:>6.2f}x {tokens_tok} "
              f"{parse_s / floor_s:>6.2f}x {buffer_s:>8.3f} {buffer_mb:>6.2f}x{marks}")
        if failed:
            print("    logicalline rejected this case")
        if marks:
            flagged.append(name)
        progress(f"scaled {name}")
    print("(per MB, per tok: this case's seconds per MB, and per token, over the ordinary "
          "corpus's; parsing alone, then parsing plus fTokens. A case above 2x per MB but near "
          "1x per token is dense in tokens rather than slow to scale; x floor: parsing alone over "
          "the split-on-blanks floor on the same case, which pays the same per-line costs; "
          "buffer: parsing alone through GetLogicalLineListFromBuffer, per MB over the corpus "
          "read the same way)")
    print("cases above 2x per MB: " + (", ".join(flagged) if flagged else "none"))
    return worst
