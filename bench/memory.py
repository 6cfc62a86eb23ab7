"""Retained memory: what the lists of lines of the whole corpus keep, per token, against the
TokenInfo lists of tokenize."""

import gc
import io
import os
import tokenize
import tracemalloc

from corpus import MB


def resident_bytes():
    with open("/proc/self/statm") as f:
        return int(f.read().split()[1]) * os.sysconf("SC_PAGE_SIZE")


def parse_corpus(parser, sources):
    lines = []
    for data in sources:
        try:
            lines.append(parser.GetLogicalLineList(io.BytesIO(data).readline))
        except ValueError:
            pass
    return lines


def tokenize_corpus(sources):
    held = []
    for data in sources:
        try:
            held.append(list(tokenize.tokenize(io.BytesIO(data).readline)))
        except (SyntaxError, tokenize.TokenError, UnicodeDecodeError, ValueError):
            pass
    return held


def measure_memory(corpus, parser, label, check_rss):
    """Retained bytes of the whole corpus's lines, before and after every fTokens is read.
    The RSS cross-check means something only for the first build: later ones reuse the memory
    that earlier ones freed."""
    sources = corpus.sources
    rss_parsed = None
    if check_rss:
        gc.collect()
        rss_before = resident_bytes()
        held = parse_corpus(parser, sources)
        gc.collect()
        rss_parsed = resident_bytes() - rss_before
        del held
        gc.collect()

    tracemalloc.start()
    base = tracemalloc.get_traced_memory()[0]
    held = parse_corpus(parser, sources)
    gc.collect()
    traced_parsed = tracemalloc.get_traced_memory()[0] - base
    for lines in held:
        for line in lines:
            line.fTokens
    gc.collect()
    traced_tokens = tracemalloc.get_traced_memory()[0] - base
    tracemalloc.stop()
    tokens = sum(line.fTokenCount for lines in held for line in lines)
    line_count = sum(map(len, held))
    del held
    gc.collect()
    return {
        "label": label, "tokens": tokens, "lines": line_count,
        "traced_parsed": traced_parsed, "traced_tokens": traced_tokens, "rss_parsed": rss_parsed,
    }


def traced_reads(read, sources):
    """What the lists that read(data) returns for every source keep, as tracemalloc sees it."""
    gc.collect()
    tracemalloc.start()
    base = tracemalloc.get_traced_memory()[0]
    held = []
    for data in sources:
        try:
            held.append(read(data))
        except ValueError:
            pass
    gc.collect()
    traced = tracemalloc.get_traced_memory()[0] - base
    tracemalloc.stop()
    del held
    gc.collect()
    return traced


def measure_record_text(corpus, parser):
    """Bytes per source byte that the records of whole reads keep of the text: a read through
    readline copies what it hands out, and a read of the bytes held refers to them, so the
    difference is the copy (with a bytes object's header per list)."""
    copied = traced_reads(lambda data: parser.GetLogicalLineList(io.BytesIO(data).readline),
                          corpus.sources)
    referred = traced_reads(parser.GetLogicalLineListFromBuffer, corpus.sources)
    return (copied - referred) / corpus.size


def measure_tokenize_memory(corpus):
    gc.collect()
    tracemalloc.start()
    base = tracemalloc.get_traced_memory()[0]
    held = tokenize_corpus(corpus.sources)
    gc.collect()
    traced = tracemalloc.get_traced_memory()[0] - base
    tracemalloc.stop()
    tokens = sum(map(len, held))
    del held
    gc.collect()
    return traced, tokens


def print_memory(corpus, measures, tokenize_traced, tokenize_tokens):
    print("tracemalloc sees everything the lines hold: their token arrays, positions and texts "
          "come from the interpreter's allocator too. The RSS growth of a first, untraced build "
          "is a cross-check.")
    print(f"{'what is held':<52} {'MB':>8} {'B/token':>8} {'B/src B':>8}")
    ll_tokens = measures[0]["tokens"]

    def row(name, retained, tokens):
        print(f"{name:<52} {retained / MB:>8.1f} {retained / tokens:>8.1f} "
              f"{retained / corpus.size:>8.2f}")

    for m in measures:
        row(f"{m['label']}, lines as parsed", m["traced_parsed"], m["tokens"])
        row(f"{m['label']}, after every fTokens read", m["traced_tokens"], m["tokens"])
        rss = m["rss_parsed"]
        rss_text = f"; RSS growth as parsed {rss / m['tokens']:.1f} B/token" if rss else ""
        print(f"    ({m['lines']:,} lines, {m['tokens']:,} tokens{rss_text})")
    row("tokenize, TokenInfo lists", tokenize_traced, tokenize_tokens)
    print(f"    ({tokenize_tokens:,} TokenInfo, counting NEWLINE, NL, INDENT, DEDENT, ENCODING "
          f"and ENDMARKER; {tokenize_traced / ll_tokens:.1f} B per logicalline token)")
