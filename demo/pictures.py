"""Pictures of what people look at, for the README: terminals as SVG, made from what tallyctl shows on one; a page, by a browser.

Usage: pictures.py FOLDER [BROWSER]   (without a browser the terminals alone)"""

import html
import pathlib
import re
import subprocess
import sys

from harness import Device, on_screen
from wear_days import wear_rows

COLUMN, LINE, MARGIN, BAR = 8.4, 18, 16, 30  # pixels
COLOURS = {"1": 'font-weight="bold" fill="#ffffff"', "2": 'fill="#8b95a5"', "32": 'font-weight="bold" fill="#6cc48b"', "31": 'fill="#ff8a80"'}
PLAIN = 'fill="#d5dbe5"'
FONT = "ui-monospace, DejaVu Sans Mono, Menlo, Consolas, monospace"


def pieces(line):
    """(text, attributes) of a line with the colours that tallyctl uses."""
    style = ""
    for text, code in re.findall(r"([^\x1b]*)(?:\x1b\[(\d+)m)?", line):
        if text:
            yield text, COLOURS.get(style, "")
        style = code


def terminal(command, shown, columns):
    """An SVG of a terminal that shows the lines behind the command."""
    lines = [f"$ {command}", *shown]
    width, height = columns * COLUMN + 2 * MARGIN, len(lines) * LINE + BAR + MARGIN
    svg = [f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {width:.0f} {height}" role="img" font-size="14" '
           f'font-family="{FONT}">',
           f"<title>{html.escape(command)}</title>",
           f'<rect width="100%" height="100%" rx="8" fill="#1b212b"/>',
           *(f'<circle cx="{MARGIN + 4 + 18 * i}" cy="16" r="5" fill="#3a4453"/>' for i in range(3))]
    for row, line in enumerate(lines):
        at = 0
        for text, attributes in pieces(line):
            stripped = text.lstrip(" ")
            x, y = MARGIN + (at + len(text) - len(stripped)) * COLUMN, BAR + (row + 1) * LINE - 5
            at += len(text)
            stripped = stripped.rstrip(" ")
            if stripped:
                svg.append(f'<text x="{x:.1f}" y="{y}" textLength="{len(stripped) * COLUMN:.1f}" lengthAdjust="spacingAndGlyphs" '
                           f'xml:space="preserve" {attributes or PLAIN}>{html.escape(stripped)}</text>')
    return "\n".join([*svg, "</svg>"]) + "\n"


def main(folder, browser=None):
    folder.mkdir(parents=True, exist_ok=True)
    device = Device(sample=True)
    try:
        device.run("-f")
        device.tally("record", "import", "-", stdin="".join(wear_rows()))
        for name, command, first, last in (("wear", "tallyctl wear", 0, 99), ("wear-history", "tallyctl wear --history --endurance 3000", 0, 16),
                                           ("report", "tallyctl report power", 0, 99)):
            shown = on_screen(device, command.split()[1:], 80, NO_COLOR="").replace(str(device.root), "").splitlines()
            (folder / f"{name}.svg").write_text(terminal(command, shown[first:last], 80))
        if browser:
            page = device.base / "page.html"
            device.tally("report", "--html", str(page), "--day", "yesterday", "wifi")
            subprocess.run([browser, "--headless", "--no-sandbox", "--disable-gpu", "--hide-scrollbars", "--window-size=1100,1330",
                            f"--screenshot={folder / 'page.png'}", page.as_uri()], check=True, capture_output=True, timeout=120)
        for picture in folder.iterdir():
            assert picture.stat().st_size < 200_000, f"{picture} is larger than 200 KB"
    finally:
        device.close()


if __name__ == "__main__":
    main(pathlib.Path(sys.argv[1]), *sys.argv[2:3])
