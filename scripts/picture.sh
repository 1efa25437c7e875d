#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Takes the tour on a terminal and draws some of its sections, as they came, to docs/tour.svg.
source "$(dirname "$0")/lib.sh"

need_packages python3-rich bsdutils
session=$(mktemp)
trap 'rm -f "$session"' EXIT
script -qec "$root/scripts/try.sh" "$session" </dev/null >/dev/null
/usr/bin/python3 - "$session" "$root/docs/tour.svg" <<'PYTHON'
import io, re, sys
from rich.console import Console
from rich.text import Text

shown = ("What is in reach", "Its audio is connected")
text = open(sys.argv[1], newline="").read().replace("\r\n", "\n").split("\nScript done")[0]
sections = re.split(r"\n(?=\n(?:\x1b\[\d*m)?# )", text)
chosen = [section for section in sections if any(title in section for title in shown)]
assert len(chosen) == len(shown), "the tour has other sections now"
lines = Text.from_ansi("\n".join(chosen).strip("\n"))
console = Console(record=True, width=max(map(len, lines.plain.split("\n"))) + 1, file=io.StringIO())
console.print(lines, soft_wrap=True)
picture = console.export_svg(title="scripts/try.sh", unique_id="tour")
# No fonts from elsewhere: the reader's own monospaced one.
picture = re.sub(r"@font-face \{.*?\}\s*", "", picture, flags=re.DOTALL)
picture = picture.replace("Fira Code, monospace", "monospace").replace("<!-- Generated with Rich https://www.textualize.io -->\n", "")
# Some renderers drop spaces that a text begins with: the text is moved instead.
cell = 12.2
def move(match):
    x, between, length, rest, spaces = match.groups()
    offset = cell * spaces.count("&#160;")
    return f'x="{float(x) + offset:.1f}"{between}textLength="{float(length) - offset:.1f}"{rest}>'
picture = re.sub(r'x="([\d.]+)"([^>]*)textLength="([\d.]+)"([^>]*)>((?:&#160;)+)(?=[^&<]|&#(?!160))',
                 move, picture)
open(sys.argv[2], "w").write(picture)
PYTHON
echo "Written: docs/tour.svg"
