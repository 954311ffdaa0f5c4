"""The part of the demo that is shown in a picture: searches in three languages."""

import pathlib
import re
import shlex

from terminal_picture import picture

TOP = pathlib.Path(__file__).resolve().parent.parent
PICTURE = TOP / "doc/pictures/search.svg"

_SHOWN = re.compile(r"search --lang (enu|ger|jpn) ")


def _section(text):
    """What stands below the heading of the searches, up to the next one."""
    return re.search(r"6\. What a person finds [^\n]*\n(.*?)\n[^\n]*7\. ", text, re.DOTALL)[1]


def searches(written):
    """Of what the demo writes, the searches that are shown."""
    blocks = re.split(r"\n(?=\x1b\[1m\$ )", _section(written))
    return "\n".join(block for block in blocks if _SHOWN.search(block.split("\n")[0]))


def commands():
    """The arguments of those searches, as scripts/demo has them."""
    lines = _section((TOP / "scripts/demo").read_text(encoding="utf-8")).split("\n")
    return [shlex.split(line)[1:] for line in lines if _SHOWN.search(line)]


def picture_of(written):
    return picture(written, "Searching the example device in English, German and Japanese")
