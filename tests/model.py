"""Pure-Python model of the logical line reader, to cross-check the native module with. Clarity
comes first; regular expressions only speed up plain ASCII runs."""
import bisect
import itertools
import re
from types import SimpleNamespace

NAME, NUMBER, STRING, NEWLINE, ERROR, COMMENT = 1, 2, 3, 4, 201, 202
# Line type constants in value order, with the bytes each holds.
LINE_TYPES = dict(zip(
    "kUnknown kClassDef kFunctionDef kStringExpression kAssignment kIfBeginning kElseBeginning "
    "kWhileBeginning kForBeginning kPass kRaise kTry kExcept kFinally kAssert kReturn kImport "
    "kFromImport kPrint kDelete kElifBeginning kComment kBlankLine kBreak kContinue kWith".split(),
    b"unknown,class definition,function definition,string expression,assignment,if statement "
    b"start,else statement start,while statement start,for statement start,pass,raise,try block "
    b"start,except block start,finally block start,assert,return,import,from import,print,delete,"
    b"elif block start,comment,blank line,break,continue,with block start".split(b",")))
UNKNOWN, CLASS_DEF, FUNCTION_DEF, STRING_EXPRESSION, ASSIGNMENT, COMMENT_LINE, BLANK_LINE = (
    0, 1, 2, 3, 4, 21, 22)

# Operator ids follow this order from 7; "<>" is a second spelling of "!=".
OPERATORS = dict(zip(b"( ) [ ] : , ; + - * / | & < > = . % ` { } == != <= >= ~ ^ << >> ** += "
                     b"-= *= /= %= &= |= ^= <<= >>= **= // //= @ -> ... :=".split(), range(7, 54)))
OPERATORS.update({b"<>": 29, b"\\": 203})
CANONICAL = {ident: text for text, ident in OPERATORS.items() if text != b"<>"}
ERROR_PREFIX, STRING_PLACEHOLDER, QUOTES = b"<errortoken> ", b"'<string>'", b"'\""
HEX_DIGITS = b"0123456789abcdefABCDEF"
BLANKS, ASCII_NAME_CHARS = re.compile(rb"[\t\x0b\x0c ]*"), re.compile(rb"[A-Za-z0-9_]*")

# Words that begin a new statement even on a line that continues an open one.
STATEMENT_KEYWORDS = set(b"assert break class continue def del elif except exec finally from "
                         b"global import pass raise return try while".split())
# The first word of a line and the line type it decides.
LINE_KEYWORDS = dict(zip(b"class def if else while for pass raise break try except finally "
                         b"return import assert from print del elif continue with".split(),
                         (1, 2, 5, 6, 7, 8, 9, 10, 23, 11, 12, 13, 15, 16, 14, 17, 18, 19, 20,
                          24, 25)))


def first_code_unit(b, p=0, end=None):
    """Low 16 bits of the first character's code point; 0 when it cannot be decoded."""
    end = len(b) if end is None else end
    b0 = b[p] if p < end else 0
    n = 1 if b0 < 0x80 else 0 if b0 < 0xC0 or b0 >= 0xF8 else 2 if b0 < 0xE0 else 3 if b0 < 0xF0 else 4
    tail = b[p + 1:p + n]
    if n < 2 or end - p < n or any(c & 0xC0 != 0x80 for c in tail):
        return b0 if n == 1 else 0
    unit = b0 & (0x1F, 0x0F, 0)[n - 2]  # a 4-byte lead's bits fall out of the 16-bit unit
    for c in tail:
        unit = unit << 6 | c & 0x3F
    return unit & 0xFFFF


def step_char(b, p, end):  # a malformed sequence stops before a byte that continues nothing
    stop = min(end, p + (1, 2, 3, 4, 3)[sum(b[p] >= bound for bound in (0x80, 0xE0, 0xF0, 0xF8))])
    p += 1
    while p < stop and b[p] & 0xC0 == 0x80:
        p += 1
    return p


def is_name_char(b, p, end, first=False):
    c = chr(b[p]) if b[p] < 0x80 else chr(first_code_unit(b, p, end))
    return b[p] == 0x5F or c.isalpha() or (not first and (c.isdigit() if b[p] < 0x80 else c.isnumeric()))


def find_operator(b, p, end):  # the longest operator at p that lies wholly before end
    return next((b[p:p + n] for n in (3, 2, 1) if p + n <= end and b[p:p + n] in OPERATORS), None)


def string_start(b, p, end, newest=False):
    """(position after the opening quotes, quote, triple), or None if no string starts at p.
    The newest reading drops the u and r pair, which Python 3 never had; t-strings it reads are
    beyond the model."""
    l1, l2, l3 = (b[i] | 0x20 if i < end and 0x41 <= b[i] <= 0x5A else b[i] if i < end else 0
                  for i in (p, p + 1, p + 2))
    pairs = (b"rb", b"rf", b"br", b"fr") + (() if newest else (b"ru", b"ur"))
    if l1 in b"rbuf" and l2 in QUOTES:
        p += 1
    elif l3 in QUOTES and bytes((l1, l2)) in pairs:
        p += 2
    if p >= end or b[p] not in QUOTES:
        return None
    q = b[p]
    triple = p + 2 < end and b[p + 1] == q == b[p + 2]
    return p + (3 if triple else 1), q, triple


def token_id_for_start(b, p=0, end=None, newest=False):
    end = len(b) if end is None else end
    if string_start(b, p, end, newest):
        return STRING
    op = find_operator(b, p, end) if p < end else None
    c = b[p] if p < end else None
    return (ERROR if c is None else NAME if is_name_char(b, p, end, first=True) else
            NEWLINE if c in b"\r\n" else
            NUMBER if 0x30 <= c <= 0x39 or c == 0x2E and b[p + 1:p + 2].isdigit() and p + 1 < end
            else COMMENT if c == 0x23 else OPERATORS[op] if op else ERROR)


def escaped(b, k, stop):  # an odd run of backslashes ends just before k, from stop on
    return (k - stop - len(b[stop:k].rstrip(b"\\"))) % 2 == 1


def scan_string_body(b, st, frm, end):
    q, p = st.quote, b.find(st.quote, frm, end)
    while p >= 0:
        k = p - 2 if st.triple else p
        if k >= frm and b[k] == q == b[k + st.triple] and not escaped(b, k, frm):
            st.complete = 1
            return p + 1
        p = b.find(q, p + 1, end)
    if st.triple or end <= frm or b[end - 1] not in b"\r\n":
        st.complete = 0
        return end
    term = end - 2 if end - 2 >= frm and b[end - 2:end] == b"\r\n" else end - 1
    if escaped(b, term, frm):
        st.complete = 0                 # backslash-newline: the string runs on
        return end
    st.tok, st.complete = ERROR, 1      # unterminated; its terminator follows as a newline
    return term


def scan_number(b, p, end):
    p += 1
    while p < end and (b[p] in b".0123456789ABCDEFabcdefJjLlOoXx"
                       or (b[p] in b"+-" and b[p - 1] in b"Ee")
                       or (b[p] == 0x5F and p + 1 < end and b[p - 1] in HEX_DIGITS + b"OoXx"
                           and b[p + 1] in HEX_DIGITS)):
        p += 1
    return p


def scan_next_token(b, st, pos, end, newest=False):
    """Scans the token at pos into st; returns the position after it, or None at the end."""
    if pos >= end:
        return None
    if st.tok == STRING and not st.complete:   # the line begins inside an open string
        pos = scan_string_body(b, st, pos, end)
    else:
        pos = BLANKS.match(b, pos, end).end()
        if pos >= end:
            return None
        st.tok, st.start, st.complete = token_id_for_start(b, pos, end, newest), pos, 1
        if st.tok == NAME:
            pos = step_char(b, pos, end)
            while pos < end:
                pos = ASCII_NAME_CHARS.match(b, pos, end).end()
                if pos >= end or b[pos] < 0x80 or not is_name_char(b, pos, end):
                    break
                pos = step_char(b, pos, end)
        elif st.tok == NUMBER:
            pos = scan_number(b, pos, end)
        elif st.tok == STRING:
            pos, st.quote, st.triple = string_start(b, pos, end, newest)
            pos = scan_string_body(b, st, pos, end)
        elif st.tok == NEWLINE:
            pos += 2 if b[pos:min(pos + 2, end)] == b"\r\n" else 1
        elif st.tok == ERROR:
            pos = step_char(b, pos, end)
        elif st.tok == COMMENT:
            pos = end
        else:
            pos += len(find_operator(b, pos, end))
    pos = min(pos, end)
    if st.complete or pos == end:
        st.end = pos
    return pos


def nesting_delta(text):
    return (text[:1] in (b"(", b"[", b"{")) - (text[:1] in (b")", b"]", b"}"))


class Builder:
    """Working state of one logical line: its text, scanner state and token list."""

    def __init__(self, copy_strings, remove_comments, newest):
        self.copy_strings, self.remove_comments, self.newest = copy_strings, remove_comments, newest
        self.text, self.line_starts, self.tokens, self.positions = b"", [], [], []
        # Scanner state; complete is 0 while a string runs on to the next physical line.
        self.scan = SimpleNamespace(tok=0, start=-1, end=-1, complete=0, quote=0, triple=0)
        self.line_index = self.nesting = self.tabs = self.spaces = 0
        self.indent = -1

    def position(self, start):
        # Placed on the physical line, as read, that holds the token's first byte.
        i = bisect.bisect_right(self.line_starts, start) - 1
        return i, start - self.line_starts[i]

    def add_line(self, line, measure=False):
        line_start = len(self.text)
        self.line_starts.append(line_start)
        b = self.text = self.text + line
        st, pos = self.scan, line_start
        while (pos := scan_next_token(b, st, pos, len(b), self.newest)) is not None:
            if measure and self.indent < 0:  # measured at the first token, even if dropped
                self.indent = 0
                for c in b[line_start:st.start]:
                    if c == 0x09:
                        self.indent, self.tabs = self.indent + 8 - self.indent % 8, 1
                    elif c == 0x20:
                        self.indent, self.spaces = self.indent + 1, 1
            if not st.complete or st.tok == NEWLINE or (st.tok == COMMENT and self.remove_comments):
                continue
            text = (STRING_PLACEHOLDER if st.tok == STRING and not self.copy_strings else
                    ERROR_PREFIX + b[st.start:st.end] if st.tok == ERROR else
                    b[st.start:st.end] if st.tok in (NAME, NUMBER, STRING, COMMENT) else
                    CANONICAL[st.tok])
            self.append(text, self.position(st.start))

    def append(self, text, position):
        self.tokens.append(text), self.positions.append(position)
        self.nesting += nesting_delta(text)

    def hand_back(self, k):
        self.nesting -= sum(map(nesting_delta, self.tokens[k:]))
        del self.tokens[k:], self.positions[k:]
        self.text = self.text[:self.line_starts.pop()]
        self.scan.complete = 1  # a string the handed-back line opened is not ours to report

    def trailing_backslash(self):
        return self.tokens[-1] == b"\\" and self.positions[-1][0] == self.line_index

    def is_open(self):
        if self.scan.tok == STRING and not self.scan.complete:
            return True
        return bool(self.tokens) and (self.trailing_backslash() or self.nesting > 0)

    def starts_new_statement(self, k, depth_before):
        t, toks = self.tokens[k], self.tokens
        if t[:1] == b"@":
            return True
        if depth_before <= 0 and k > 0 and toks[k - 1] == b"\\":
            return False
        if depth_before <= 0 and t == b"for":
            return True
        if t == b"if":  # unless a conditional expression or a comprehension goes on
            return not (len(toks) >= 50 or self.trailing_backslash() or self.nesting > 0
                        or b"else" in toks[k + 1:] or b"for" in toks[:k])
        if t == b"else":
            return k < 50 and (k == 0 or b"if" not in toks[:k])
        if self.newest and t == b"lazy":  # a lazy import
            return toks[k + 1:k + 2] in ([b"import"], [b"from"])
        return t in STATEMENT_KEYWORDS


class Source:
    """What readline hands out, plus the one physical line that the builder handed back."""

    def __init__(self, chunks):
        self.chunks, self.pending, self.at_end = iter(chunks), b"", False
        first = next(self.chunks, b"")  # a byte-order mark opening the input is no source
        first = first[3:] if first.startswith(b"\xef\xbb\xbf") else first
        self.chunks = itertools.chain([first] if first else [], self.chunks)

    def read(self, lineno):
        if self.pending:
            line, self.pending = self.pending, b""
            return line
        line = next(self.chunks, b"")
        self.at_end = not line
        if b"\0" in line:
            raise ValueError(f"Binary data encountered at lineno {lineno} while tokenizing")
        return line


def build_logical_line(src, lineno, copy_strings, skip_whitespace_lines, remove_comments,
                       include_line_text, newest):
    """Returns (line dict or None, the number of the next physical line)."""
    bld, first = Builder(copy_strings, remove_comments, newest), lineno
    line = src.read(lineno)
    if line:
        bld.add_line(line, measure=True)
    lineno += 1
    is_open = bld.is_open()
    while is_open and not src.at_end:
        depth_before, k = bld.nesting, len(bld.tokens)
        line = src.read(lineno)
        if src.at_end:
            break
        bld.line_index += 1
        bld.add_line(line)
        if len(bld.tokens) > k and bld.starts_new_statement(k, depth_before):
            bld.hand_back(k)
            src.pending = line
            break
        lineno += 1
        is_open = bld.is_open()
    st = bld.scan
    if st.start != -1 and not st.complete:  # the input ended inside a string
        end = st.end if st.end > st.start else len(bld.text)
        bld.append(ERROR_PREFIX + bld.text[st.start:end], bld.position(st.start))
        is_open = True
    if not bld.tokens or (skip_whitespace_lines and all(t[:1] == b"#" for t in bld.tokens)):
        return None, lineno
    if first > 2**31 - 1:  # line numbers are counted wide but stored in 32 bits
        raise OverflowError("Line number does not fit in 32 bits")
    line_type, name = classify(bld.tokens, newest)
    return dict(
        type=line_type, local_scope_name=name, first_line=first, line_count=lineno - first,
        indent=bld.indent, tabs=bld.tabs, spaces=bld.spaces, incomplete=int(is_open),
        tokens=bld.tokens, positions=bld.positions,
        line_text=bld.text if include_line_text else None), lineno


OPTIONS = ("copy_strings", "skip_whitespace_lines", "remove_comments", "include_line_text")


def model_lines(physical_lines, copy_strings=True, skip_whitespace_lines=True,
                remove_comments=True, include_line_text=True, first_line=0, line_count=-1,
                newest=False):
    """The logical lines of the source that readline hands out as physical_lines, read as by
    default or, with `newest`, as the newest Python reads code without f-strings or t-strings."""
    if first_line < 0:
        raise ValueError("first line must be >= 0")
    if line_count < -1:
        raise ValueError("line count must be >= 0, or -1 for no limit")
    opts = (copy_strings, skip_whitespace_lines, remove_comments, include_line_text)
    stop = first_line + line_count  # never wraps: counted wider than the arguments
    stop = None if line_count == -1 else stop
    src, lineno, result = Source(physical_lines), first_line, []
    while (stop is None or lineno < stop) and not src.at_end:
        line, lineno = build_logical_line(src, lineno, *map(bool, opts), newest)
        if line is not None:
            result.append(line)
    return result


def classify(tokens, newest=False):
    """(line type, defined name or None), from the token texts alone."""
    key = next((i for i, t in enumerate(tokens) if t not in (b"\\", b"async")), None)
    if key is None:
        return BLANK_LINE, None
    after = [t for t in tokens[key + 1:] if t != b"\\"][:1]
    if newest and tokens[key] == b"lazy" and after in ([b"import"], [b"from"]):
        return LINE_KEYWORDS[after[0]], None  # a lazy import
    line_type = LINE_KEYWORDS.get(tokens[key])
    if line_type in (CLASS_DEF, FUNCTION_DEF):
        name = next((t for t in tokens[key + 1:] if t[:1] in (b"(", b")", b":") or
                     token_id_for_start(t) == NAME and t != b"async"), b"(")
        return (UNKNOWN, None) if name[:1] in (b"(", b")", b":") else (line_type, name.decode(
            "utf-8", "replace"))
    if line_type is not None or len(tokens) == 1 and tokens[0][:1] == b"#":
        return (COMMENT_LINE if line_type is None else line_type), None
    depth, all_strings = 0, True
    for t in tokens:
        if t == b"=" and depth == 0:
            return ASSIGNMENT, None
        # Only unprefixed and r/u-prefixed literals count as strings here.
        if t == b"\\" or t[:1] in (b'"', b"'") or (t[:1] in b"RUru" and t[1:2] in (b'"', b"'")):
            continue
        depth += nesting_delta(t)
        all_strings = False
    return (STRING_EXPRESSION if all_strings else UNKNOWN), None
