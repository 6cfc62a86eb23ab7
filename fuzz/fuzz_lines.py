"""Fuzz target: the host's operations on LogicalLine objects, from Python and through the
direct function table, checked against a small model of what each operation must leave.

Input layout: byte 0 the parser options, byte 1 the length n of the operation program at the
end of the input, then the source, then n program bytes, taken two at a time (operation,
argument). A seed is two header bytes and a source file.
"""
import copy
import io
import sys

import atheris

import logicalline
import direct_table

DIRECT = direct_table.LoadTable()
CLASS_DEF, FUNCTION_DEF = logicalline.kClassDef, logicalline.kFunctionDef
IMPORTS = (logicalline.kImport, logicalline.kFromImport)


class Named:
    pass


OBJECTS = ("name", ("a", "info"), ("b",), (), None, b"raw", 5, Named(), "\udc80")
NUMBERS = (0, 1, -1, 5, 2**15, 40000, 70000, 2**31 - 1, -2**31, 2**31)


class Model:
    """What a line must show: its appended entries, scope name, parsed flag and range."""

    def __init__(self, line):
        self.names, self.equivs, self.arg_equivs = [], [], []
        self.scope, self.parsed = None, False
        self.first, self.count = line.fFirstLine, line.fLineCount

    def Check(self, line):
        kind = line.fType
        assert list(line.fArgNames) == (self.names if kind is FUNCTION_DEF else [])
        assert list(line.fBaseClassNames) == (self.names if kind is CLASS_DEF else [])
        assert list(line.fImportRefs) == (self.names if kind in IMPORTS else [])
        assert [tuple(p) for p in self.equivs] == list(line.fTypeEquivs)
        assert [tuple(p) for p in self.arg_equivs] == list(line.fArgTypeEquivs)
        assert line.fScopeName is self.scope and line.fParsed == self.parsed
        assert (line.fFirstLine, line.fLineCount) == (self.first, self.count)
        if kind not in (CLASS_DEF, FUNCTION_DEF):
            expected = [n[0] if type(n) is tuple and n else n for n in self.names]
            assert list(line.fNamesDefined) == expected
        assert DIRECT.GetArgNameCount(line) == (len(self.names) if kind is FUNCTION_DEF else 0)


def Expect(error, call, *args):
    """Runs call(*args); it must raise `error` when error is set, and succeed otherwise."""
    try:
        call(*args)
    except Exception as e:  # noqa: BLE001 - compared with what the operation must raise
        assert error is not None and isinstance(e, error), (call, args, e)
        return False
    assert error is None, (call, args)
    return True


def Append(line, model, which, obj, other, direct):
    kind = line.fType
    scope_start = kind in (CLASS_DEF, FUNCTION_DEF)
    rows = (  # method, direct entry, accepted, target list, pair
        ("AppendAttrib", DIRECT.AppendAttribDirect, not scope_start, model.names, False),
        ("AppendArgName", DIRECT.AppendArgNameDirect, kind is FUNCTION_DEF, model.names, False),
        ("AppendBaseClassName", DIRECT.AppendBaseClassNameDirect, kind is CLASS_DEF,
         model.names, False),
        ("AppendTypeEquiv", DIRECT.AppendTypeEquivDirect, True, model.equivs, True),
        ("AppendArgTypeEquiv", DIRECT.AppendArgTypeEquivDirect, kind is FUNCTION_DEF,
         model.arg_equivs, True),
    )
    name, entry, accepted, target, pair = rows[which % len(rows)]
    call = entry if direct else getattr(line, name)
    args = ((line,) if direct else ()) + ((obj, other) if pair else (obj,))
    if Expect(None if accepted else ValueError, call, *args):
        target.append((obj, other) if pair else obj)


def TokenIndex(line, arg):
    return arg % (line.fTokenCount + 4) - 2  # two below and two past the valid range


def Operate(lines, models, op, arg):
    index = arg % len(lines)
    line, model = lines[index], models[index]
    obj, other = OBJECTS[arg % len(OBJECTS)], OBJECTS[(arg >> 4) % len(OBJECTS)]
    valid = 0 <= TokenIndex(line, arg) < line.fTokenCount
    op %= 14
    if op == 0:
        Expect(None if valid else IndexError, line.GetTokenType, TokenIndex(line, arg), arg & 1)
    elif op == 1:
        Expect(None if valid else IndexError, line.GetTokenString, TokenIndex(line, arg), arg & 1)
    elif op == 2:
        Expect(None if valid else IndexError, DIRECT.GetTokenTypeDirect, line,
               TokenIndex(line, arg), arg & 1)
    elif op in (3, 4):
        Append(line, model, arg, obj, other, direct=op == 4)
    elif op == 5:
        first, count = NUMBERS[arg % len(NUMBERS)], NUMBERS[(arg >> 4) % len(NUMBERS)]
        fits = all(-2**31 <= n < 2**31 for n in (first, count))
        if Expect(None if fits else OverflowError, line.SetLineRange, first, count):
            model.first, model.count = first, count
    elif op == 6:
        line.SetParsed(obj)
        model.parsed = bool(obj)
    elif op == 7:
        line.SetScopeName(obj)
        model.scope = obj
    elif op == 8:  # a copy keeps everything but the parsed flag, and a range it cannot build
        buildable = model.first >= 0 and model.count >= 1 and line.fIndentLevel >= 0
        copier = line.Copy if arg & 1 else lambda: copy.deepcopy(line)
        if Expect(None if buildable else SystemError, copier):
            duplicate = copier()
            twin = Model(duplicate)
            twin.names, twin.equivs, twin.arg_equivs = (list(model.names), list(model.equivs),
                                                        list(model.arg_equivs))
            twin.scope = model.scope
            # The copy is classified afresh: an empty record (kUnknown) comes back blank.
            kind = line.fType if line.fTokenCount else logicalline.kBlankLine
            assert duplicate.fTokens == line.fTokens and duplicate.fType is kind
            lines.append(duplicate)
            models.append(twin)
    elif op == 9:
        has_name = line.fType is FUNCTION_DEF
        in_range = 0 <= arg % 8 - 2 < len(model.names)
        error = None if has_name and in_range else (IndexError if has_name else ValueError)
        if Expect(error, DIRECT.GetArgName, line, arg % 8 - 2):
            assert DIRECT.GetArgName(line, arg % 8 - 2) is model.names[arg % 8 - 2]
    elif op == 10:
        DIRECT.ClearAppended(line)
        model.names, model.equivs, model.arg_equivs = [], [], []
    elif op == 11:
        text = OBJECTS[arg % len(OBJECTS)]
        error = None if type(text) in (str, bytes) and text != "\udc80" else (
            UnicodeEncodeError if text == "\udc80" else TypeError)
        Expect(error, DIRECT.GetStringTokenTypeDirect, text, arg & 1)
    elif op == 12:
        lines.append(DIRECT.CreateEmptyLogical())
        models.append(Model(lines[-1]))
    elif op == 13 and len(lines) > 1:
        del lines[index], models[index]
    model.Check(line)
    for attribute in ("fTokens", "fNamesDefined", "fLocalScopeName", "fIndentLevel"):
        getattr(line, attribute)


def TestOneInput(data):
    if len(data) < 2:
        return
    program_length = data[1] * 2
    source, program = data[2:len(data) - program_length], data[len(data) - program_length:]
    if len(data) - 2 < program_length or b"\0" in source:
        return
    parser = logicalline.CreateLogicalLineParser(*(data[0] >> bit & 1 for bit in range(4)))
    lines = parser.GetLogicalLineList(io.BytesIO(source).readline)
    lines.append(DIRECT.CreateEmptyLogical())
    models = [Model(line) for line in lines]
    for i in range(0, len(program) - 1, 2):
        Operate(lines, models, program[i], program[i + 1])


def main():
    atheris.Setup(sys.argv, TestOneInput)
    atheris.Fuzz()


if __name__ == "__main__":
    main()
