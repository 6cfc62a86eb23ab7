# Type stub of the logicalline extension module.
#
# LogicalLine, LogicalLineParser and CreateHook exist for type checking only: the module does
# not publish the two types under these names, so `from logicalline import LogicalLine` fails
# at run time. Import them under `if TYPE_CHECKING:` and annotate with them there or in string
# annotations. At run time the line type is LogicalLineType, and a parser comes only from
# CreateLogicalLineParser.

from collections.abc import Callable
from typing import Final, Protocol, final, overload, type_check_only

from typing_extensions import Buffer

# Line types: the value of LogicalLine.fType is the identical bytes object.
kUnknown: Final[bytes]
kClassDef: Final[bytes]
kFunctionDef: Final[bytes]
kStringExpression: Final[bytes]
kAssignment: Final[bytes]
kIfBeginning: Final[bytes]
kElseBeginning: Final[bytes]
kWhileBeginning: Final[bytes]
kForBeginning: Final[bytes]
kPass: Final[bytes]
kRaise: Final[bytes]
kTry: Final[bytes]
kExcept: Final[bytes]
kFinally: Final[bytes]
kAssert: Final[bytes]
kReturn: Final[bytes]
kImport: Final[bytes]
kFromImport: Final[bytes]
kPrint: Final[bytes]
kDelete: Final[bytes]
kElifBeginning: Final[bytes]
kComment: Final[bytes]
kBlankLine: Final[bytes]
kBreak: Final[bytes]
kContinue: Final[bytes]
kWith: Final[bytes]

# Attribute kinds and (kind, None) infos, for the host's own attribute entries.
kClassAttribKind: Final[str]
kFunctionAttribKind: Final[str]
kGenericAttribKind: Final[str]
kImportedAttribKind: Final[str]
kClassAttribInfo: Final[tuple[str, None]]
kFunctionAttribInfo: Final[tuple[str, None]]
kGenericAttribInfo: Final[tuple[str, None]]

LogicalLineType: Final[type[LogicalLine]]
COMMENT_TOKEN: Final[int]
# The newest (major, minor) that feature_version reads as that version does; later ones read
# as it does.
kNewestFeatureVersion: Final[tuple[int, int]]
# The release, as the package metadata gives it: "0.2.0".
__version__: Final[str]

@final
@type_check_only
class LogicalLine:
    @property
    def fType(self) -> bytes: ...
    @property
    def fParsed(self) -> bool: ...
    @property
    def fTabsInIndent(self) -> bool: ...
    @property
    def fSpacesInIndent(self) -> bool: ...
    @property
    def fIncomplete(self) -> bool: ...
    @property
    def fIndentLevel(self) -> int: ...
    @property
    def fFirstLine(self) -> int: ...
    @property
    def fLineCount(self) -> int: ...
    @property
    def fTokenCount(self) -> int: ...
    @property
    def fNamesDefined(self) -> tuple[object, ...]: ...
    @property
    def fTypeEquivs(self) -> tuple[tuple[object, object], ...]: ...
    @property
    def fArgNames(self) -> tuple[object, ...]: ...
    @property
    def fArgTypeEquivs(self) -> tuple[tuple[object, object], ...]: ...
    @property
    def fBaseClassNames(self) -> tuple[object, ...]: ...
    @property
    def fLocalScopeName(self) -> str | None: ...
    # (text, (line index within the logical line, column in bytes)) per token, true values at
    # any size; the position is None on a line that carries no positions.
    @property
    def fTokens(self) -> tuple[tuple[str, tuple[int, int] | None], ...]: ...
    @property
    def fLineText(self) -> str | None: ...
    @property
    def fScopeName(self) -> object: ...
    @property
    def fImportRefs(self) -> tuple[object, ...]: ...
    def Copy(self) -> LogicalLine: ...
    def __deepcopy__(self, memo: object, /) -> LogicalLine: ...
    def GetTokenString(self, i: int, skip_error_prefix: int = 0) -> str: ...
    def GetTokenType(self, i: int, skip_error_prefix: int = 0) -> int: ...
    def AppendAttrib(self, attrib: object, /) -> None: ...
    def AppendArgName(self, name: object, /) -> None: ...
    def AppendBaseClassName(self, name: object, /) -> None: ...
    def AppendTypeEquiv(self, a: object, b: object, /) -> None: ...
    def AppendArgTypeEquiv(self, a: object, b: object, /) -> None: ...
    def SetLineRange(self, first_line: int, line_count: int, /) -> None: ...
    def SetParsed(self, parsed: object, /) -> None: ...
    def SetScopeName(self, name: object, /) -> None: ...

@final
@type_check_only
class LogicalLineParser:
    # readline returns one physical line of bytes per call and b"" at the end. With a create
    # hook installed the list holds whatever the hook returned instead of LogicalLine objects.
    # line_count -1 reads to the end; a count below -1 raises ValueError.
    def GetLogicalLineList(
        self, readline: Callable[[], bytes], first_line: int = 0, line_count: int = -1, /
    ) -> list[LogicalLine]: ...
    # The same lines as GetLogicalLineList over io.BytesIO(data).readline, with no Python call
    # per line: data is bytes, bytearray, memoryview or mmap (not str), locked while it reads.
    def GetLogicalLineListFromBuffer(
        self, data: Buffer, first_line: int = 0, line_count: int = -1, /
    ) -> list[LogicalLine]: ...
    # After an edit that replaced old_count physical lines from first_line (0-based) with
    # new_count lines, makes `lines` (a full read of the old text by a parser with these
    # options) what a full read of `data` gives, re-reading only what the edit touched; without
    # the three counts the module finds the changed lines by comparing data with the old text.
    # Returns (index, removed, added): lines[index:index + len(added)] is added, in place of
    # `removed` old lines. Raises ValueError, leaving `lines` as it was, for an edit that does
    # not describe the change from the old text, a list read with other options, or a list that
    # is not exactly as the read or the last update left it (read the text again then).
    @overload
    def UpdateLogicalLineList(
        self, lines: list[LogicalLine], data: Buffer, /
    ) -> tuple[int, int, list[LogicalLine]]: ...
    @overload
    def UpdateLogicalLineList(
        self, lines: list[LogicalLine], data: Buffer, first_line: int, old_count: int,
        new_count: int, /
    ) -> tuple[int, int, list[LogicalLine]]: ...

@type_check_only
class CreateHook(Protocol):
    # Called once per logical line instead of building a LogicalLine; a None result is dropped.
    def __call__(
        self,
        indent_level: int,
        first_line: int,
        line_count: int,
        tokens: tuple[bytes, ...],
        positions: tuple[tuple[int, int], ...],
        spaces_in_indent: int,
        tabs_in_indent: int,
        incomplete: int,
        line_text: str | None,
        /,
    ) -> object: ...

# Code is read as feature_version, a (3, minor) tuple, reads it (strings from (3, 12), lazy
# imports from (3, 15)): by default (None) as Python 3.10, where logicalline-dump reads as the
# newest version the module knows, kNewestFeatureVersion. Pass
# feature_version=sys.version_info[:2] to read as the running interpreter does.
def CreateLogicalLineParser(
    copy_strings: object = True,
    skip_whitespace_lines: object = True,
    remove_comments: object = True,
    include_line_text: object = True,
    *,
    feature_version: tuple[int, int] | None = None,
) -> LogicalLineParser: ...

# A new capsule named "kLogicalLineFunctionTable" on every call; see logicalline_direct.h.
def GetDirectLogicalLineFunctionTable() -> object: ...
def GetIdForTokenStart(text: str | bytes, /) -> int: ...
def _GetFirstCodeUnit(text: str | bytes, /) -> str: ...

# There is no way back to the built-in construction once a hook is installed.
def SetLogicalCreateFunction(hook: CreateHook, /) -> None: ...

# Empties the bounded tables of token texts and fTokens entries that reads share (for leak
# checks); they fill again as reading goes on.
def _ReleaseSharedTables() -> None: ...
