#!/usr/bin/env python3
"""Every relative link of the README, CONTRIBUTING.md and docs/ leads to a file that exists, and every
#anchor to a heading of that file, named as GitHub names it (lowercase, punctuation dropped, blanks to
dashes, -1, -2 ... for repeats).  check-links.py [ROOT]"""
import pathlib, re, sys

root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".").resolve()
pages = [root / "README.md", root / "CONTRIBUTING.md", *sorted((root / "docs").glob("*.md"))]
link = re.compile(r"\[[^\]]*\]\(([^)\s]+)\)")


def anchors(page):
    names, seen, fenced = set(), {}, False
    for line in page.read_text(encoding="utf-8").splitlines():
        if line.startswith("```"):
            fenced = not fenced
        elif not fenced and line.startswith("#"):
            text = line.lstrip("#").strip().lower()
            slug = re.sub(r"[^\w\- ]", "", text).replace(" ", "-")
            count = seen.get(slug, 0)
            seen[slug] = count + 1
            names.add(slug if count == 0 else f"{slug}-{count}")
    return names


def problems(page):
    text = re.sub(r"```.*?```", "", page.read_text(encoding="utf-8"), flags=re.S)
    for target in link.findall(re.sub(r"`[^`\n]*`", "", text)):
        if re.match(r"[a-z]+:", target):
            continue  # a web address or mailto: not ours to check
        path, _, anchor = target.partition("#")
        file = (page.parent / path).resolve() if path else page
        if not file.exists():
            yield f"{page.relative_to(root)}: {target}: no such file"
        elif anchor and file.suffix == ".md" and anchor not in anchors(file):
            yield f"{page.relative_to(root)}: {target}: no such heading"


found = [problem for page in pages if page.exists() for problem in problems(page)]
print("\n".join(found) or f"links: every link of {len(pages)} pages resolves")
sys.exit(1 if found else 0)
