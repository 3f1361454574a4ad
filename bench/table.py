#!/usr/bin/env python3
"""Prints the tables of kzbench's results, as Markdown.

    bench/table.py RESULTS...                     what `kzbench pairs` or `kzbench grow` wrote
    bench/table.py --into DOCUMENT RESULTS...     puts the tables into a document instead

A document has a place for each of the two: all between the lines `<!-- pairs -->` (or `growth`)
and `<!-- end -->`. A limit is met when the upper quartile of the ratios keeps it, and `just` when
only the median does.
"""

import json
import pathlib
import sys


def digits(number):
    """Three significant digits, without an exponent."""
    if abs(number) >= 100:
        return f"{number:.0f}"
    return f"{number:.{2 if abs(number) >= 1 else 3}f}" if abs(number) < 10 else f"{number:.1f}"


def quartiles(spread):
    return f"{digits(spread['median'])} ({digits(spread['lower'])} … {digits(spread['upper'])})"


def held_against(limit, case):
    """The spread that a limit applies to; None when its peer was not there."""
    if limit["peer"] is None:
        return case["time"]
    for peer in case["peers"]:
        if peer["name"] == limit["peer"]:
            return peer["ratio"]
    return None


def verdict(limit, case):
    if limit is None:
        return ""
    asked = "≤ " + digits(limit["most"])
    if limit["peer"] is None:
        asked += " " + case["unit"]
    elif not case["peers"] or limit["peer"] != case["peers"][0]["name"]:
        asked += " of " + limit["peer"]
    spread = held_against(limit, case)
    if spread is None:
        return asked + ": no peer"
    if spread["upper"] <= limit["most"]:
        return asked + ": **met**"
    if spread["median"] <= limit["most"]:
        return asked + ": just"
    return f"{asked}: no, {digits(spread['median'] / limit['most'])} ×"


def rows_of(case):
    """The first peer's row has the limits, the other peers follow below."""
    limits = [verdict(case["must"], case), verdict(case["goal"], case)]
    ours = [f"`{case['name']}`", quartiles(case["time"]) + " " + case["unit"]]
    if not case["peers"]:
        yield ours + ["", "", "", ""] + limits
    for peer in case["peers"]:
        yield ours + [
            peer["name"],
            digits(peer["time"]["median"]),
            quartiles(peer["ratio"]),
            digits(peer["ratio"]["best"]),
        ] + limits
        ours, limits = ["", ""], ["", ""]


def table_lines(header, rows):
    yield "| " + " | ".join(header) + " |"
    yield "|" + "---|" * len(header)
    for row in rows:
        yield "| " + " | ".join(row) + " |"


def heading(results):
    return (f"{results['date']}, {results['processors']} × {results['processor']}, "
            f"load {digits(results['load'])}, {results['build']}, variant `{results['variant']}`:")


def pairs_lines(results):
    yield from table_lines(
        ["case", "ours", "peer", "peer's time", "ours / peer", "best / best", "must", "goal"],
        [row for case in results["cases"] for row in rows_of(case)],
    )


def growth_lines(results):
    for table in results["tables"]:
        holds = {True: "holds", False: "**BROKEN**", None: "not judged"}[table["holds"]]
        yield from (f"### `{table['name']}`: {holds}", "", f"{table['law']}.", "")
        yield from table_lines(table["columns"], table["rows"])
        yield ""


def render(results):
    """The name of the results' place, and their text."""
    name, lines = ("pairs", pairs_lines) if "cases" in results else ("growth", growth_lines)
    return name, "\n".join([heading(results), "", *lines(results)]).rstrip() + "\n"


def put_into(document, name, text):
    """The document with a text in the place of that name."""
    begin, end = f"<!-- {name} -->\n", "<!-- end -->"
    before, found, rest = document.partition(begin)
    old, closed, after = rest.partition(end)
    if not found or not closed:
        raise ValueError(f"the document has no place for {name}")
    return f"{before}{begin}\n{text}\n{end}{after}"


def main(arguments):
    path = None
    if arguments[0] == "--into":
        path = pathlib.Path(arguments[1])
        arguments = arguments[2:]
    rendered = [render(json.loads(pathlib.Path(name).read_text("utf-8"))) for name in arguments]
    if path is None:
        print("\n".join(text for _, text in rendered), end="")
        return 0
    document = path.read_text("utf-8")
    for name, text in rendered:
        document = put_into(document, name, text)
    path.write_text(document, "utf-8")
    return 0


if __name__ == "__main__":
    if len(sys.argv) < 2:
        sys.exit(__doc__)
    sys.exit(main(sys.argv[1:]))
