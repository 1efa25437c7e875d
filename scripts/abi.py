# SPDX-License-Identifier: LGPL-2.1-or-later
"""Compares the symbols that a library exports with what its headers declare.

abi.py CASTXML_OUTPUT EXPORTED_SYMBOLS HEADER_FOLDER
"""

import collections
import re
import subprocess
import sys
import xml.etree.ElementTree as ElementTree

MANGLED = ("Function", "Method", "OperatorMethod", "OperatorFunction", "Converter", "Variable")
MADE = ("inline", "artificial", "deleted", "pure_virtual", "init")


def readable(symbols):
    """The symbols by their readable names, of which a constructor's variants have the same."""
    return subprocess.run(["c++filt"], input="\n".join(symbols), capture_output=True, text=True,
                          check=True).stdout.splitlines()


def declared(path, folder):
    """Readable names of the routines that the headers declare without defining, and all classes."""
    elements = {element.get("id"): element for element in ElementTree.parse(path).getroot()}
    files = {id: open(element.get("name")).read().splitlines() for id, element in elements.items()
             if element.tag == "File" and element.get("name").startswith(folder + "/")}

    def full_name(element):
        context = elements.get(element.get("context"))
        if context is None or context.get("name") == "::":
            return element.get("name")
        return f"{full_name(context)}::{element.get('name')}"

    routines, classes = collections.Counter(), set()
    mangled = set()
    for element in elements.values():
        if element.get("file") not in files:
            continue
        if element.tag in ("Class", "Struct") and element.get("incomplete") != "1":
            classes.add(full_name(element))
        if any(element.get(made, "0") != "0" for made in MADE):
            continue
        # castxml does not say what is hidden.
        line = element.get("line")
        if line and "KESBLUETOOTH_LOCAL" in files[element.get("file")][int(line) - 1]:
            continue
        if element.tag in ("Constructor", "Destructor"):
            tilde = "~" if element.tag == "Destructor" else ""
            routines[full_name(elements[element.get("context")]) + "::" + tilde + element.get("name")] += 1
        elif element.tag in MANGLED and element.get("mangled"):
            mangled.add(element.get("mangled"))
    routines.update(readable(mangled))
    return routines, classes


def exported(path, classes):
    """The same names of what is exported. castxml tells no parameters of constructors."""
    made = re.compile(r"((?:\w+::)*(\w+)::~?\2)\(.*\)")
    generated = re.compile(r"(?:vtable|typeinfo|typeinfo name) for (.*)")
    routines = collections.Counter()
    for name in set(readable(open(path).read().split())):
        of_class = generated.fullmatch(name)
        if of_class and of_class[1] in classes:
            continue
        match = made.fullmatch(name)
        routines[match[1] if match else name] += 1
    return routines


def main():
    wanted, classes = declared(sys.argv[1], sys.argv[3])
    found = exported(sys.argv[2], classes)
    for name in sorted((found - wanted).elements()):
        print(f"exported, but no public header declares it: {name}", file=sys.stderr)
    for name in sorted((wanted - found).elements()):
        print(f"declared by a public header, but not exported: {name}", file=sys.stderr)
    return 0 if found == wanted else 1


sys.exit(main())
