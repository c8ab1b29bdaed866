"""The members of a class are defined in one source.

A class that does not fit into one readable source holds several ideas: each becomes a class with a header, a
source and a test of its own.

usage: oneclass.py [TREE]      checks the tree (default: the working folder)
"""
import pathlib
import re
import sys

FLOORS = ("core", "builtin", "plugins", "tarsel")

# Faces: they declare together what is implemented next to its own subject. They stay.
FACES = {
    "QvPlatform": "the contract with the system; each subject of it has a source",
    "QvUtil": "the operations that applications expect in one place",
}

# Members that return what is defined above their class. A source of a lower floor cannot define them.
MEMBERS_ABOVE = {
    "core/value/measurevalues.cpp": "measures know no Any, and their public faces return Any and search AnyVector",
}

# Still spread. Nothing is added here; an entry goes when its class stands in one source.
OPEN = set()

DEFINITION = re.compile(r"^(?![\s#}]|using\b|namespace\b|extern\b|friend\b|return\b|template class\b)"
                        r"[^(={;]*?((?:[A-Za-z_]\w*::)+)(?:~?[A-Za-z_]\w*|operator\b[^;{]*?)\s*[(={;]", re.M)
COMMENT = re.compile(r"//[^\n]*|/\*.*?\*/", re.S)


def code_of(file):
    return COMMENT.sub("", file.read_text(errors="replace"))


def classes_defined_here(code):
    return set(re.findall(r"\b(?:class|struct)\s+(?:QV_API\s+)?([A-Za-z_]\w*)(?:\s+final)?\s*(?::[^:;{][^;{]*)?\{", code))


def sources_by_class(tree):
    """The sources that define members of each class; a class that a source has to itself is left out."""
    namespaces, sources = {"std"}, {}
    for floor in FLOORS:
        for file in sorted((tree / floor).rglob("*")):
            if file.suffix not in (".h", ".cpp"):
                continue
            code = code_of(file)
            for name in re.findall(r"^(?:inline )?namespace ([\w:]+)", code, re.M):
                namespaces.update(name.split("::"))
            if file.suffix == ".h":
                continue
            own = classes_defined_here(code)
            for found in DEFINITION.finditer(code):
                outermost = next((part for part in found[1].split("::") if part and part not in namespaces), None)
                if outermost and outermost not in own:
                    sources.setdefault(outermost, set()).add(str(file.relative_to(tree)))
    return {name: sorted(files) for name, files in sources.items() if name not in namespaces}


def check(tree, still_open=None):
    still_open = OPEN if still_open is None else still_open
    found = {name: [file for file in files if file not in MEMBERS_ABOVE] for name, files in sources_by_class(tree).items()}
    faults = [f"{name}: members in {len(files)} sources: {', '.join(files)}" for name, files in sorted(found.items())
              if len(files) > 1 and name not in FACES and name not in still_open]
    return faults + [f"{name}: stands in one source now; take it out of the list of oneclass.py"
                     for name in still_open if len(found.get(name, [])) < 2]


if __name__ == "__main__":
    faults = check(pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else "."))
    print("\n".join(faults), end="\n" if faults else "")
    sys.exit(bool(faults))
