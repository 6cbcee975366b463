"""Writes the two short tables of docs/performance.md from the long ones at its end. Run by scripts/bench."""

import pathlib
import re

PAGE = pathlib.Path(__file__).resolve().parent.parent / "docs/performance.md"
LONG = "<!-- scripts/bench writes what follows. -->"
SETS = {"All that the machine has": "all", "AVX-512 without VBMI": "AVX-512", "AVX2": "AVX2", "What every processor has": "SSE2"}
IN_SHORT = ["to a quarter, triangle", "to a quarter, Lanczos 3", "to a quarter, Mitchell", "to three quarters, triangle",
            "to three quarters, Lanczos 3", "to three quarters, Mitchell", "to three quarters, poly3", "up by 4, triangle",
            "up by 4, Lanczos 3", "up by 4, Mitchell"]
# Less than that is within what varies from run to run.
CLEARLY = 1.10


def ratios(text):
    """By work and peer: the ratio with each instruction set."""
    found = {}
    instructions = columns = component = None
    for line in text.splitlines():
        if line.startswith("#"):
            columns = None
            component = line[4:] if line.startswith("### ") else component
            instructions = SETS.get(line[3:], instructions) if line.startswith("## ") else instructions
        if not line.startswith("|"):
            continue
        cells = [cell.strip() for cell in line.strip("|").split("|")]
        if columns is None:
            columns = cells
            continue
        for peer, cell in zip(columns, cells):
            ratio = re.search(r"\(([\d.]+)\)$", cell)
            if ratio and "PictureZOR" not in peer and (peer != "memcpy" or cells[0].startswith("CopyPixels")):
                found.setdefault(("scale " * (component == "scale") + cells[0], peer), {})[instructions] = float(ratio[1])
    return found


def row(words, of, least=0.0):
    return "| " + " | ".join([*words, *(f"{of[s]:.2f}" if of.get(s, 0) > least else "" for s in SETS.values())]) + " |"


def head(*words):
    return [f"| {' | '.join([*words, *SETS.values()])} |", f"|{'---|' * len(words)}{'--:|' * len(SETS)}"]


def put(page, name, lines):
    begin, end = f"<!-- scripts/bench writes {name}. -->", f"<!-- {name} end here. -->"
    before, rest = page.split(begin)
    return "\n".join([before + begin, "", *lines, "", end]) + rest.split(end)[1]


def main():
    page = PAGE.read_text(encoding="utf-8")
    found = ratios(page.split(LONG)[1])
    page = put(page, "ratios to zimg", head("Scaling RGB: ratio to zimg") + [
        row([work], found[f"scale RGB {work}", "zimg"]) for work in IN_SHORT])
    page = put(page, "ratios above one", head("Work", "Peer") + [
        row([work, peer], of, CLEARLY) for (work, peer), of in found.items() if max(of.values()) > CLEARLY])
    PAGE.write_text(page, encoding="utf-8")


if __name__ == "__main__":
    main()
