"""What scripts/docs adds to the pages: the README in front, the files of the project that pages link to, the reference
that scripts/reference has made, and bars below ratios."""

import pathlib
import re

from mkdocs.structure.files import File, Files

ROOT = pathlib.Path(__file__).resolve().parent.parent
PLACE = ROOT / "build/docs-extra"
# A cell of a race: the peer's time, and in parentheses ours divided by it.
RACE = re.compile(r"^[\d.]+ \(([\d.]+)\)$")
# A cell of a column of ratios.
RATIO = re.compile(r"^(\d+\.\d+)$")
RATIO_HEADS = {"of vips", "of gm", "ratio"}
LINK = re.compile(r"(!?\[[^\]]*\]\()([^)#\s]+)((?:#[^)\s]*)?\))")
BAR = '<span class="bar"><span style="width:{:.0f}%" class="{}"></span></span>'

STYLE = """
.bar{display:block;height:5px;margin-top:3px;min-width:70px;background:var(--md-default-fg-color--lightest);border-radius:3px}
.bar>span{display:block;height:100%;border-radius:3px}
.bar>.ahead{background:#2e9e5b}.bar>.behind{background:#d1762b}
img{border-radius:4px}
/* The theme's own blue is hard to read on its dark ground. */
[data-md-color-scheme=slate]{--md-typeset-a-color:#9fb0ff}
"""


def shown_place(target):
    """Where the site keeps a file that stands outside docs/."""
    return f"project/{target.relative_to(ROOT)}" + ("" if target.suffix in {".jpg", ".png", ".svg"} else ".txt")


def moved_links(text, folder):
    """Links of a page that stands in `folder`, as they are in the site."""

    def moved(match):
        before, link, after = match.groups()
        target = (folder / link).resolve()
        if re.match(r"[a-z]+:", link) or not target.is_relative_to(ROOT):
            return match[0]
        if target == ROOT / "README.md":
            return f"{before}index.md{after}"
        if target == ROOT / "CONTRIBUTING.md":
            return f"{before}contributing.md{after}"
        if target.is_relative_to(ROOT / "docs"):
            return f"{before}{target.relative_to(ROOT / 'docs')}{after}"
        if not target.is_file():
            # A folder has no page.
            return match[0] if not target.is_dir() else f"{before[1:-2].rstrip(']')}"
        return f"{before}{shown_place(target)}{after}"

    return LINK.sub(moved, text)


def on_files(files, config):
    """Adds the README, CONTRIBUTING, the style, and every file outside docs/ that a page links to."""
    PLACE.mkdir(parents=True, exist_ok=True)
    added, seen = [], set()

    def add(name, data):
        if name not in seen:
            seen.add(name)
            (PLACE / name).parent.mkdir(parents=True, exist_ok=True)
            (PLACE / name).write_bytes(data)
            added.append(File(name, str(PLACE), config["site_dir"], False))

    add("index.md", (ROOT / "README.md").read_bytes())
    add("contributing.md", (ROOT / "CONTRIBUTING.md").read_bytes())
    add("site.css", STYLE.encode())
    reference = ROOT / "build/reference/html"
    for page in sorted(reference.rglob("*.*")):
        add(f"reference/{page.relative_to(reference)}", page.read_bytes())
    for page in [ROOT / "README.md", ROOT / "CONTRIBUTING.md", *sorted((ROOT / "docs").glob("*.md"))]:
        for _, link, _ in LINK.findall(page.read_text()):
            target = (page.parent / link).resolve()
            if target.is_relative_to(ROOT) and target.is_file() and not target.is_relative_to(ROOT / "docs") and target.suffix != ".md":
                add(shown_place(target), target.read_bytes())
    return Files([*files, *added])


def with_bars(text):
    """Tables with a bar below each ratio: a full one is the peer's time, and ours in it."""
    lines, ratios = [], None
    for line in text.split("\n"):
        if not line.startswith("|"):
            ratios = None
            lines.append(line)
            continue
        cells = line.split("|")
        if ratios is None:  # The head of a table; at times it says for all columns what they are.
            every = "ratio to" in cells[1]
            ratios = {i for i, cell in enumerate(cells[2:], 2) if every or cell.strip().lower() in RATIO_HEADS}
        for i, cell in enumerate(cells):
            if found := RACE.match(cell.strip()) or (RATIO.match(cell.strip()) if i in ratios else None):
                ratio = float(found[1])
                cells[i] = f" {cell.strip()}{BAR.format(min(ratio, 1) * 100, 'ahead' if ratio <= 1 else 'behind')} "
        lines.append("|".join(cells))
    return "\n".join(lines)


def on_page_markdown(markdown, page, **_):
    folder = ROOT if page.file.src_path in {"index.md", "contributing.md"} else (ROOT / "docs" / page.file.src_path).parent
    text = moved_links(markdown, folder)
    if page.file.src_path == "performance.md":
        text = with_bars(text)
    return text
