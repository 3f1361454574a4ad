#!/usr/bin/env python3
"""Prints the tables of kzbench's results, as Markdown.

    bench/table.py results.json [...]     results of `kzbench pairs` or `kzbench grow`

A limit is met when the upper quartile of the ratios keeps it, and `just` when only the median does.
"""

import json
import sys


def digits(number):
    """Three significant digits, without an exponent."""
    if abs(number) >= 100:
        return f"{number:.0f}"
    return f"{number:.{2 if abs(number) >= 1 else 3}f}" if abs(number) < 10 else f"{number:.1f}"


def quartiles(spread):
    return f"{digits(spread['median'])} ({digits(spread['lower'])} … {digits(spread['upper'])})"


def held_against(limit, case):
    """The spread that a limit speaks of; None when its peer was not there."""
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
    """The first peer's row tells of the limits, the other peers follow below."""
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


def print_table(header, rows):
    print("| " + " | ".join(header) + " |")
    print("|" + "---|" * len(header))
    for row in rows:
        print("| " + " | ".join(row) + " |")


def print_pairs(results):
    print_table(
        ["case", "ours", "peer", "peer's time", "ours / peer", "best / best", "must", "goal"],
        [row for case in results["cases"] for row in rows_of(case)],
    )


def print_growth(results):
    for table in results["tables"]:
        holds = {True: "holds", False: "**BROKEN**", None: "not judged"}[table["holds"]]
        print(f"### `{table['name']}`: {holds}\n\n{table['law']}.\n")
        print_table(table["columns"], table["rows"])
        print()


def main(paths):
    for path in paths:
        with open(path, encoding="utf-8") as file:
            results = json.load(file)
        print(
            f"{results['date']}, {results['processors']} × {results['processor']}, "
            f"load {digits(results['load'])}, {results['build']}, "
            f"variant `{results['variant']}`\n"
        )
        if "cases" in results:
            print_pairs(results)
        if "tables" in results:
            print_growth(results)
    return 0


if __name__ == "__main__":
    if len(sys.argv) < 2:
        sys.exit(__doc__)
    sys.exit(main(sys.argv[1:]))
