#!/usr/bin/env python3
"""Writes what cffi needs to call the libraries, from their public headers.

    make_interface.py OUTPUT HEADER...

OUTPUT is a module of constants and tables, without a compiled part: the package works with every
Python 3 on a machine, and finds the libraries when it is imported.
"""

import re
import sys

import cffi

MARKS = re.compile(r"\b(KZ_API|KZ_NOEXCEPT|KZ_C_BEGIN|KZ_C_END)\b")
COMMENT = re.compile(r"/\*.*?\*/", re.DOTALL)
WIDE = re.compile(r"UINT32_C\((\w+)\)")
NUMBER = re.compile(r"#define +\w+ +(0[xX][0-9a-fA-F]+|\d+)$")


def declarations(header):
    """The declarations of a header, and those of its macros that are numbers."""
    with open(header, encoding="utf-8") as file:
        text = WIDE.sub(r"\1", MARKS.sub("", COMMENT.sub("", file.read())))
    lines = [line.rstrip() for line in text.splitlines()]
    return "\n".join(line for line in lines if not line.startswith("#") or NUMBER.match(line))


def main():
    output, headers = sys.argv[1], sys.argv[2:]
    ffi = cffi.FFI()
    ffi.set_source("kzsdk._interface", None)
    for header in headers:
        ffi.cdef(declarations(header))
    ffi.emit_python_code(output)


if __name__ == "__main__":
    main()
