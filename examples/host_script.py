"""A small host that uses every part of the logicalline API, type-checked with `mypy --strict`.

Run it as a script: it reads its own source, annotates the lines it finds, and prints a report.
"""
from __future__ import annotations

import copy
import io
import sys
from typing import TYPE_CHECKING

import logicalline

if TYPE_CHECKING:
    from logicalline import LogicalLine, LogicalLineParser

BLOCK_STARTS = (logicalline.kIfBeginning, logicalline.kElifBeginning, logicalline.kElseBeginning,
                logicalline.kWhileBeginning, logicalline.kForBeginning, logicalline.kTry,
                logicalline.kExcept, logicalline.kFinally, logicalline.kWith)
SIMPLE = (logicalline.kUnknown, logicalline.kStringExpression, logicalline.kPass,
          logicalline.kRaise, logicalline.kAssert, logicalline.kReturn, logicalline.kPrint,
          logicalline.kDelete, logicalline.kComment, logicalline.kBlankLine, logicalline.kBreak,
          logicalline.kContinue)
NAME_ID = logicalline.GetIdForTokenStart("name")  # token ids are learnt from sample texts


def read(parser: LogicalLineParser, source: bytes) -> list[LogicalLine]:
    return parser.GetLogicalLineList(io.BytesIO(source).readline, 0, -1)


def parameter_names(line: LogicalLine) -> list[str]:
    """Names at bracket depth 1 that follow "(" or "," (an illustration, not a full parser)."""
    names, depth, previous = [], 0, ""
    for index, (text, _position) in enumerate(line.fTokens):
        if text in ("(", "[", "{"):
            depth += 1
        elif text in (")", "]", "}"):
            depth -= 1
        if depth == 1 and previous in ("(", ",") and line.GetTokenType(index) == NAME_ID:
            names.append(text)
        previous = text
    return names


def annotate(line: LogicalLine, scope: str) -> None:
    line.SetScopeName(scope)
    if line.fType is logicalline.kFunctionDef:
        for name in parameter_names(line):
            line.AppendArgName(name)
            line.AppendArgTypeEquiv(name, "object")
    elif line.fType is logicalline.kClassDef:
        for name in parameter_names(line):
            line.AppendBaseClassName(name)
    elif line.fType in (logicalline.kImport, logicalline.kFromImport):
        line.AppendAttrib((line.GetTokenString(1), (logicalline.kImportedAttribKind, None)))
    elif line.fType is logicalline.kAssignment:
        line.AppendAttrib((line.GetTokenString(0), logicalline.kGenericAttribInfo))
        line.AppendTypeEquiv(line.GetTokenString(0), line.GetTokenString(line.fTokenCount - 1))
    line.SetParsed(True)


def describe(line: LogicalLine) -> str:
    kind = line.fType.decode()
    if line.fType in BLOCK_STARTS or line.fType in SIMPLE:
        kind = "statement: " + kind
    text = (line.fLineText or "").strip().splitlines()
    head = text[0] if text else ""
    facts = [f"{line.fFirstLine + 1}+{line.fLineCount}", f"indent {line.fIndentLevel}", kind]
    if line.fTabsInIndent or line.fSpacesInIndent:
        facts.append("tabs" if line.fTabsInIndent else "spaces")
    if line.fIncomplete:
        facts.append("incomplete")
    facts.append(f"names {list(line.fNamesDefined)}")
    for view in (line.fArgNames, line.fBaseClassNames, line.fImportRefs):
        if view:
            facts.append(f"{len(view)} annotations")
    facts.append(f"{len(line.fTypeEquivs) + len(line.fArgTypeEquivs)} type equivalences")
    return f"{' | '.join(facts)}: {head[:40]}"


def main() -> int:
    parser = logicalline.CreateLogicalLineParser(copy_strings=True, skip_whitespace_lines=True,
                                                 remove_comments=False, include_line_text=True)
    with open(__file__, "rb") as handle:
        source = handle.read()
    lines = read(parser, source)
    # A whole file in memory is read faster from the buffer: the same lines, no readline calls.
    same = parser.GetLogicalLineListFromBuffer(memoryview(source), 0, -1)
    assert [line.fTokens for line in same] == [line.fTokens for line in lines]
    for line in lines:
        annotate(line, line.fLocalScopeName or "<module>")
        print(describe(line))

    first = lines[0]
    twin = first.Copy()
    assert copy.deepcopy(first).fTokens == twin.fTokens and not twin.fParsed
    twin.SetLineRange(first.fFirstLine + 100, first.fLineCount)
    assert type(twin) is logicalline.LogicalLineType and twin.fScopeName == first.fScopeName
    position = twin.fTokens[0][1]
    print("copy starts at", twin.fFirstLine, "first token at", position)

    comments = [line for line in lines if line.fType is logicalline.kComment]
    ids = {line.GetTokenType(0, skip_error_prefix=1) for line in comments}
    assert ids <= {logicalline.COMMENT_TOKEN}
    print("first code unit of 'λx':", logicalline._GetFirstCodeUnit("λx"))
    print("capsule:", type(logicalline.GetDirectLogicalLineFunctionTable()).__name__)
    kinds = (logicalline.kClassAttribKind, logicalline.kFunctionAttribKind,
             logicalline.kClassAttribInfo, logicalline.kFunctionAttribInfo)
    print("attribute kinds:", kinds)

    # A create hook replaces LogicalLine objects for the rest of the process: install it last.
    def hook(indent: int, first_line: int, line_count: int, tokens: tuple[bytes, ...],
             positions: tuple[tuple[int, int], ...], spaces: int, tabs: int, incomplete: int,
             text: str | None) -> object:
        return (first_line, [token.decode() for token in tokens], positions[:1])

    logicalline.SetLogicalCreateFunction(hook)
    hooked = logicalline.CreateLogicalLineParser().GetLogicalLineList(
        io.BytesIO(b"x = 1\n").readline)
    print("hook made:", hooked)
    return 0


if __name__ == "__main__":
    sys.exit(main())
