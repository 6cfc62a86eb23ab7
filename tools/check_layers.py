"""Fails when a C++ file includes a folder that comes after its own in the layer order
core -> tokenizer -> assembly -> lines -> module. The public header in include/ may be used by
the module layer only. The module layer is only the Python surface: reading a source into a
list (lines/list_read) and updating a list (lines/list_update) live in lines/, and the surface
reaches the reader, its state and the numbering only through them.

    python3 tools/check_layers.py [ROOT]
"""
import pathlib
import re
import sys

LAYERS = ["core", "tokenizer", "assembly", "lines", "module"]
PUBLIC_HEADERS = {"logicalline_direct.h": "module"}
BELOW_THE_SURFACE = {"assembly/line_builder.h", "assembly/reading_state.h",
                     "assembly/source_reader.h", "assembly/token_list.h", "lines/numbering.h",
                     "lines/shift_table.h"}
INCLUDE = re.compile(r'^\s*#\s*include\s+"([^"]+)"', re.M)


def violations(root):
    for layer_index, layer in enumerate(LAYERS):
        for path in sorted((root / layer).glob("*.[ch]*")):
            for target in INCLUDE.findall(path.read_text()):
                folder = target.split("/")[0] if "/" in target else None
                if folder in LAYERS:
                    if LAYERS.index(folder) > layer_index:
                        yield f"{path.relative_to(root)} includes {target}, a later layer"
                    elif layer == "module" and target in BELOW_THE_SURFACE:
                        yield (f"{path.relative_to(root)} includes {target}: the surface reads "
                               "and updates lists through lines/list_read.h and list_update.h")
                elif target in PUBLIC_HEADERS:
                    if LAYERS.index(PUBLIC_HEADERS[target]) > layer_index:
                        yield f"{path.relative_to(root)} includes {target}, the module's own"
                else:
                    yield f"{path.relative_to(root)} includes {target}, which is in no layer"


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).parent.parent)
    found = list(violations(root.resolve()))
    for line in found:
        print(line)
    print(f"layers: {len(found)} violation(s)")
    return 1 if found else 0


if __name__ == "__main__":
    sys.exit(main())
