#!/usr/bin/env python3
"""Checks the Markdown documents (paths, links and the width of lines) and the width of comments.

    scripts/check_documents.py      exits with 1 and one line for each complaint

- A relative link leads to a file of the tree, and to a heading in it when it names one.
- A path in `back quotes` or in a code block that begins with a folder of the tree exists. What is
  built (build/...), what has a placeholder (<name>, *, ...) and what is installed elsewhere is not
  looked at.
- No line is wider than 100 characters, except in tables, code blocks and long links. Nor is any
  comment in a source, a script or a CMake file.
"""

import pathlib
import re
import subprocess
import sys

ROOT = pathlib.Path(__file__).resolve().parent.parent
WIDTH = 100
LINK = re.compile(r"\[[^\]]*\]\(([^)\s]+)\)")
CODE = re.compile(r"`([^`]+)`")
COMMENT = re.compile(r"\s*(//|\*[ /]|#)")
COMMENTED = (".c", ".cpp", ".h", ".hpp", ".java", ".py", ".sh", ".cmake", "CMakeLists.txt", "run")
PATH = re.compile(r"(?<![\w./-])(?:[\w.-]+/)+[\w.-]*")


def tracked(pattern):
    listed = subprocess.run(["git", "ls-files", "--", pattern], cwd=ROOT, capture_output=True,
                            text=True, check=True)
    return [ROOT / name for name in listed.stdout.splitlines() if (ROOT / name).exists()]


def anchors(document):
    """As the hosting sites make them: lower case, punctuation dropped, hyphens for blanks."""
    found = set()
    for line in document.read_text(encoding="utf-8").splitlines():
        if line.startswith("#"):
            title = line.lstrip("#").strip().lower()
            found.add(re.sub(r"[^\w\- ]", "", title).replace(" ", "-"))
    return found


def lines_of(document):
    """Each line with its number, and whether it is code."""
    fenced = False
    for number, line in enumerate(document.read_text(encoding="utf-8").splitlines(), 1):
        if line.lstrip().startswith("```"):
            fenced = not fenced
        yield number, line, fenced or line.startswith("    ")


def check_link(document, target):
    if re.match(r"[a-z]+:", target):
        return None
    name, _, anchor = target.partition("#")
    file = (document.parent / name).resolve() if name else document
    if not file.exists():
        return f"no such file: {target}"
    if anchor and file.suffix == ".md" and anchor not in anchors(file):
        return f"no such heading: {target}"
    return None


def check_path(document, path, folders):
    """A path counts from the root, or from the document's own folder."""
    if path.split("/")[0] not in folders or any(sign in path for sign in "<>*"):
        return None
    if (ROOT / path.rstrip(".")).exists() or (document.parent / path.rstrip(".")).exists():
        return None
    return f"no such path: {path}"


def complaints(document, folders):
    for number, line, code in lines_of(document):
        found = [check_link(document, target) for target in LINK.findall(line)] if not code else []
        for text in [line] if code else CODE.findall(line):
            for match in PATH.finditer(text):
                if text[match.end():match.end() + 1] not in ("<", "*", "$"):
                    found.append(check_path(document, match.group(), folders))
        if len(line) > WIDTH and not code and not line.startswith("|") and " " in line.strip("- "):
            found.append(f"{len(line)} characters wide")
        for complaint in filter(None, found):
            yield f"{document.relative_to(ROOT)}:{number}: {complaint}"


def wide_comments(source):
    for number, line in enumerate(source.read_text(encoding="utf-8").splitlines(), 1):
        if len(line) > WIDTH and COMMENT.match(line):
            yield f"{source.relative_to(ROOT)}:{number}: {len(line)} characters wide"


def main():
    folders = {path.relative_to(ROOT).parts[0] for path in tracked("*")
               if len(path.relative_to(ROOT).parts) > 1}
    found = [complaint for document in tracked("*.md") for complaint in complaints(document, folders)]
    found += [complaint for source in tracked("*") if source.name.endswith(COMMENTED)
              for complaint in wide_comments(source)]
    print("\n".join(found), end="\n" if found else "")
    sys.exit(1 if found else 0)


if __name__ == "__main__":
    main()
