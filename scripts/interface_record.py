#!/usr/bin/env python3
"""interface_record.py LIBRARY HEADERS

Prints what callers of LIBRARY are compiled against, one line each: exported names with their types; size,
bases and members of each class with offsets in bytes; virtual functions with their slots; enumerators. A private
member has no name there: no caller can use it. The text does not depend on the compiler. LIBRARY needs debug
information. Only types that a header in the folder HEADERS defines are listed. Reads the library with abidw, of
Debian's abigail-tools."""
import pathlib
import re
import subprocess
import sys
import xml.etree.ElementTree as ElementTree

if sys.argv[1:] in (["-h"], ["--help"]):
    print(__doc__)
    sys.exit()

NO_SLOT = 1 << 63  # abidw writes a number beyond this for a destructor's base variant, which has no slot


def common_spelling(text):
    """One spelling for the types that compilers name in different ways."""
    text = re.sub(r"std::__cxx11::basic_string<char, std::char_traits<char>, std::allocator<char> ?>", "std::string",
                  text.replace("[abi:cxx11]", ""))
    text = re.sub(r"\b(long long|long|short) unsigned int\b", r"unsigned \1", text)
    text = re.sub(r"\b((?:unsigned )?(?:long long|long|short)) int\b", r"\1", text)
    text = re.sub(r"(?<=[<,])( ?)([\w: ]+) const(?=[,>])", r"\1const \2", text)
    return re.sub(r" (?=[*&>])", "", text)


def defined_names(headers):
    """The names of the classes and enumerations that the headers define."""
    text = "".join(path.read_text() for path in pathlib.Path(headers).rglob("*.h"))
    return set(re.findall(r"^\s*(?:enum\s+class|class|struct|enum)\s+(?:ZANBASE_API\s+)?(?:\w+::)*(\w+)[^;(]*?\{",
                          text, re.M))


class Interface:
    """The tree that abidw writes, with its types by their identifier."""

    def __init__(self, library, headers):
        text = subprocess.run(["abidw", "--headers-dir", headers, "--drop-private-types", "--no-show-locs",
                               "--exported-interfaces-only", library], check=True, capture_output=True).stdout
        self.root = ElementTree.fromstring(text)
        self.parents = {child: parent for parent in self.root.iter() for child in parent}
        self.types = {node.get("id"): node for node in self.root.iter() if node.get("id")}

    def scopes(self, node):
        """The names of the namespaces and classes around `node`, the outermost first."""
        parent = self.parents.get(node)
        around = self.scopes(parent) if parent is not None else []
        named = parent is not None and parent.tag in ("namespace-decl", "class-decl")
        return around + [parent.get("name")] if named else around

    def full_name(self, node):
        return "::".join(self.scopes(node) + [node.get("name") or "(unnamed)"])

    def type_name(self, identifier):
        node = self.types[identifier]
        if node.tag in ("pointer-type-def", "reference-type-def"):
            target = self.type_name(node.get("type-id"))
            sign = "*" if node.tag == "pointer-type-def" else "&" if node.get("kind") == "lvalue" else "&&"
            return target.replace("(", f"({sign}", 1) if target.endswith(")") else target + sign
        if node.tag == "qualified-type-def":
            qualifiers = " ".join(name for name in ("const", "volatile") if node.get(name) == "yes")
            target = self.type_name(node.get("type-id"))
            return f"{target} {qualifiers}" if target.endswith("*") else f"{qualifiers} {target}"
        if node.tag == "function-type":
            return f"{self.type_name(node.find('return').get('type-id'))} (){self.parameters(node)}"
        return common_spelling(self.full_name(node))

    def parameters(self, function):
        shown = [self.type_name(one.get("type-id")) if one.get("type-id") else "..."
                 for one in function.findall("parameter") if one.get("is-artificial") != "yes"]
        return f"({', '.join(shown)})"

    def exported(self):
        """Lines about functions and variables."""
        declared, overloads = {}, {}
        for node in self.root.iter():
            if node.tag in ("function-decl", "var-decl") and node.get("elf-symbol-id"):
                declared[node.get("elf-symbol-id")] = overloads[self.full_name(node)] = node
        symbols = [node.get("name") for node in self.root.iter("elf-symbol")]
        shown = subprocess.run(["c++filt"], input="\n".join(symbols), check=True, capture_output=True, text=True).stdout
        for symbol, text in zip(symbols, map(common_spelling, shown.splitlines())):
            # abidw keeps one node for a constructor's variants, and sometimes one for two overloads.
            node = declared.get(symbol) or overloads.get(text.partition("(")[0])
            if node is None:
                yield text
            elif node.tag == "var-decl":
                yield f"{text}: {self.type_name(node.get('type-id'))}"
            else:
                parameters = self.parameters(node) if text == symbol else ""
                yield f"{text}{parameters} -> {self.type_name(node.find('return').get('type-id'))}"

    def members(self, node):
        """Lines about one class; abidw describes it once for each translation unit, more or less fully."""
        for base in node.findall("base-class"):
            yield f"base at {int(base.get('layout-offset-in-bits')) // 8:3}: {self.type_name(base.get('type-id'))}"
        for member in node.findall("data-member"):
            if member.get("static") != "yes":
                variable = member.find("var-decl")
                name = "" if member.get("access") == "private" else " " + variable.get("name")
                yield (f"member at {int(member.get('layout-offset-in-bits')) // 8:3}: "
                       f"{self.type_name(variable.get('type-id'))}{name}")
        for member in node.findall("member-function"):
            slot = int(member.get("vtable-offset", NO_SLOT))
            name = member.find("function-decl").get("name")
            if slot < NO_SLOT and member.get("destructor") == "yes":
                yield f"virtual {name}()"  # a pair of slots, which not all compilers list
            elif slot < NO_SLOT:
                yield f"slot {slot}: {name}{self.parameters(member.find('function-decl'))}"

    def classes(self, names):
        """Lines about the classes and enumerations called `names`."""
        for node in self.types.values():
            if node.get("is-declaration-only") == "yes" or node.get("name") not in names:
                continue
            name = self.full_name(node)
            if node.tag == "class-decl":
                yield f"{name}: {int(node.get('size-in-bits')) // 8} bytes"
                yield from (f"{name}: {line}" for line in self.members(node))
            elif node.tag == "enum-decl":
                yield from (f"{name}: {one.get('name')} = {one.get('value')}" for one in node.findall("enumerator"))


def main():
    library, headers = sys.argv[1:]
    interface = Interface(library, headers)
    print("# Exported names", *sorted(set(interface.exported())), sep="\n")
    print("# Classes and enumerations", *sorted(set(interface.classes(defined_names(headers)))), sep="\n")


main()
