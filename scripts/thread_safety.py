#!/usr/bin/env python3
"""scripts/thread_safety.py [FOLDER]

Prints each free function and each class with functions whose comment does not state its thread-safety. A class's comment
stands for its members. Reads what doxygen wrote as XML to FOLDER (build/docs-xml).
"""
import pathlib
import sys
import xml.etree.ElementTree as xml

if sys.argv[1:] in (["-h"], ["--help"]):
    print(__doc__)
    sys.exit()


def place(node):
    return node.find("location").get("file") + ":" + node.find("location").get("line")


def states(node):
    texts = ["".join(node.find(part).itertext()) for part in ("briefdescription", "detaileddescription")]
    return "thread-safe" in " ".join(texts).lower() or "thread safety" in " ".join(texts).lower()


findings = set()
folder = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else "build/docs-xml")
for entry in xml.parse(folder / "index.xml").findall("compound"):  # doxygen keeps the files of removed declarations
    for compound in xml.parse(folder / (entry.get("refid") + ".xml")).findall("compounddef"):
        functions = compound.findall("sectiondef/memberdef[@kind='function'][@prot='public']")
        if compound.get("prot") == "private":
            continue
        if compound.get("kind") in ("class", "struct"):
            if functions and not states(compound) and not all(states(function) for function in functions):
                findings.add(f"{place(compound)}: {compound.findtext('compoundname')}")
        else:
            findings |= {f"{place(f)}: {f.findtext('name')}" for f in functions if not states(f)}
print("\n".join(sorted(findings)), end="\n" if findings else "")
