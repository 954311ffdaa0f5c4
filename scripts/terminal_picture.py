"""What a program writes to a terminal, and a picture of it in which the text is text."""

import fcntl
import itertools
import os
import pty
import re
import struct
import subprocess
import termios
import unicodedata
from xml.sax.saxutils import escape

COLUMNS = 80

# In pixels. A cell is as wide as the letters of the usual monospaced fonts at this size.
_FONT = 14
_WIDE_FONT = 16  # fills two cells
_CELL = 8.43
_LINE = 20
_MARGIN = 18

_HEAD = """\
<svg xmlns="http://www.w3.org/2000/svg" width="{width:.0f}" height="{height}" \
viewBox="0 0 {width:.0f} {height}" role="img">
<title>{title}</title>
<style>
text {{ font: {font}px "DejaVu Sans Mono", "Noto Sans Mono", Menlo, Consolas, \
"Noto Sans Mono CJK JP", "Noto Sans CJK JP", "Hiragino Sans", "MS Gothic", monospace;
fill: #d7dce2; white-space: pre; }}
.bold {{ font-weight: bold; fill: #ffd479; }}
.dim {{ fill: #8b96a5; }}
.wide {{ font-size: {wide}px; }}
</style>
<rect width="100%" height="100%" rx="8" fill="#1d232c"/>
"""


def run_in_terminal(command):
    """What `command` writes to a terminal of 80 columns, with the terminal's escapes, lines ending
    in a line feed; and its exit status."""
    ours, theirs = pty.openpty()
    fcntl.ioctl(theirs, termios.TIOCSWINSZ, struct.pack("HHHH", 24, COLUMNS, 0, 0))
    env = {**os.environ, "TERM": "xterm", "LC_ALL": "C.UTF-8"}
    env.pop("NO_COLOR", None)
    process = subprocess.Popen(
        command, stdin=subprocess.DEVNULL, stdout=theirs, stderr=theirs, env=env
    )
    os.close(theirs)
    written = b""
    while True:
        try:
            part = os.read(ours, 65536)
        except OSError:  # how a terminal ends here when nobody has it open
            break
        if not part:
            break
        written += part
    os.close(ours)
    return written.decode().replace("\r\n", "\n"), process.wait()


def _cells(character):
    """How many columns a terminal gives to the character."""
    if unicodedata.category(character) in ("Mn", "Me", "Cf"):
        return 0
    return 2 if unicodedata.east_asian_width(character) in "WF" else 1


def _clusters(text):
    """The characters, each with those behind it that have no column of their own."""
    clusters = []
    for character in text:
        if clusters and _cells(character) == 0:
            clusters[-1] += character
        else:
            clusters.append(character)
    return clusters


def _pieces(text):
    """The parts that are drawn each for itself: a wide character, or what stands between two. Fonts
    do not agree how wide they are, so their places are given."""
    for wide, group in itertools.groupby(_clusters(text), lambda cluster: _cells(cluster[0]) == 2):
        yield from group if wide else ["".join(group)]


def _spans(line, style):
    """The pieces of the line as (column, columns, text, style), and the style at its end."""
    spans, column = [], 0
    for escape_sequence, text in re.findall(r"(\x1b[^A-Za-z]*[A-Za-z])|([^\x1b]+)", line):
        if escape_sequence:
            style = {"\x1b[0m": "", "\x1b[1m": "bold", "\x1b[2m": "dim"}[escape_sequence]
        for piece in _pieces(text):
            columns = sum(map(_cells, piece))
            spans.append((column, columns, piece, style))
            column += columns
    return spans, style


def _drawn(span, base):
    column, columns, text, style = span
    start = len(text) - len(text.lstrip(" "))
    text, columns = text.strip(" "), columns - (len(text) - len(text.strip(" ")))
    if not text:
        return ""
    x = _MARGIN + (column + start) * _CELL
    classes = f"{style} wide" if _cells(text[0]) == 2 else style
    mark = f' class="{classes.strip()}"' if classes else ""
    return (
        f'<text x="{x:.1f}" y="{base}" textLength="{columns * _CELL:.1f}"{mark}'
        f' xml:space="preserve">{escape(text)}</text>\n'
    )


def picture(written, title):
    """An SVG of what was written to a terminal; only weights are known of its escapes."""
    lines = written.strip("\n").split("\n")
    parts, style = [], ""
    for number, line in enumerate(lines):
        spans, style = _spans(line, style)
        base = _MARGIN + _FONT + number * _LINE
        parts += [_drawn(span, base) for span in spans]
    head = _HEAD.format(
        width=COLUMNS * _CELL + 2 * _MARGIN,
        height=2 * _MARGIN + len(lines) * _LINE - (_LINE - _FONT),
        font=_FONT,
        wide=_WIDE_FONT,
        title=escape(title),
    )
    return head + "".join(parts) + "</svg>\n"
