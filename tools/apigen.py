#!/usr/bin/env python3
"""Derives everything that lists exports from the registry in api/.

    apigen.py header FILE               the public C header
    apigen.py build DIR [FAMILY...]     entry table and stubs, wrappers, members and contracts, export lists,
                                        import definitions, reference pages; of some families where they are named
    apigen.py where NAME...             where exports are registered, checked and computed

Files whose content does not change are left alone, so that a build repeats only what the registry changed.
"""
import itertools
import re
import sys
import textwrap
import tomllib
from dataclasses import dataclass, field
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
LAYOUT = re.compile(r"^(?P<src>AC4|AC1|[CP][1-4]|AP4)(?P<dst>C3C|C4C|AC4|A0C4|[CP][1-4]|AP4|C)?$")
DOC_FIELDS = [("shapes", "Shapes"), ("elements", "Elements"), ("units", "Units"), ("aliasing", "Aliasing"),
              ("notes", "Notes"), ("returns", "Returns"), ("example", "Example")]


class RegistryError(Exception):
    pass


@dataclass
class Member:
    name: str
    group: "Group"
    kind: str = ""
    source: str = "void"            # C element types
    target: str = "void"
    source_layout: str = "C1"
    target_layout: str = "C1"
    parameters: list = field(default_factory=list)
    expressions: list = field(default_factory=list)
    suffix: str = ""
    result: str = "QorResult"
    call: str = ""
    stack_bytes: int = 0
    checks: list = field(default_factory=list)

    @property
    def prototype(self):
        return ", ".join(self.parameters) or "void"


@dataclass
class Group:
    family: "Family"
    keys: dict
    members: list = field(default_factory=list)

    @property
    def id(self):
        """The operation's C++ name, by which tests and benchmarks pick their code for a member."""
        return re.split(r"\W", self.keys["call"])[0]


@dataclass
class Family:
    stem: str
    title: str
    namespace: str
    groups: list = field(default_factory=list)


def channels(layout):
    """Channels that one pixel holds in memory (planar: planes)."""
    return int(re.search(r"\d", layout.replace("A0", ""))[0])


def processed(layout):
    return 1 if layout.endswith("C") else 3 if layout == "AC4" else channels(layout)


def substitute(text, values):
    """Replaces {key} for the known keys; other braces are C++."""
    return re.sub(r"\{(\w+)\}", lambda m: str(values.get(m[1], m[0])), text)


def split_layout(code):
    match = LAYOUT.match(code)
    if not match:
        raise RegistryError(f"unknown layout code {code}")
    source, target = match["src"], match["dst"]
    if target is None:
        return source, source
    if target == "C":                                   # channel of interest
        return source + "C", source + "C"
    return source, target.replace("A0C4", "C4")


def split_types(code, types):
    parts = re.findall(r"\d+(?:u|sc|s|fc|f)", code)
    if not parts or "".join(parts) != code or any(p not in types for p in parts):
        raise RegistryError(f"unknown element type {code}")
    return types[parts[0]], types[parts[-1]]


def parameter_bytes(parameter, stack):
    if "*" in parameter or "[" in parameter:
        return 4
    kind = parameter.split()[0]
    if kind not in stack:
        raise RegistryError(f"no stack size for {parameter}")
    return stack[kind]


def make_member(group, keys, forms, name, kind="", types=None, layout=None):
    member = Member(name=name, group=group, kind=kind)
    values = dict(keys.get("vars", {}), K=kind, T=types or "", L="Layout::C1", DL="Layout::C1")
    if types:
        member.source, member.target = split_types(types, forms["types"])
    if layout:
        member.source_layout, member.target_layout = split_layout(layout)
    target = member.target_layout
    single = processed(target) == 1
    values.update(
        S=member.source, D=member.target, N=processed(target),
        L="Layout::" + member.source_layout, DL="Layout::" + target,
        channels=channels(member.source_layout), dstChannels=channels(target))

    arguments = keys.get("args", "")
    if isinstance(arguments, dict):
        arguments = arguments[kind]
    elif arguments in forms["forms"]:
        arguments = forms["forms"][arguments][kind]
    tokens = forms["tokens"] | keys.get("tokens", {})
    for token_name in (arguments + " " + keys.get("tail", "")).split():
        if token_name not in tokens:
            raise RegistryError(f"{name}: unknown argument token {token_name}")
        token = tokens[token_name]
        chosen = token | token.get("single", {}) if single else token
        member.parameters += [substitute(p, values) for p in chosen["c"]]
        if chosen["cpp"]:
            member.expressions.append(substitute(chosen["cpp"], values))
    member.suffix = keys.get("suffix", "")
    member.result = substitute(keys.get("result", member.result), values)
    member.call = substitute(keys["call"], values)
    member.checks = checks_of(keys)
    member.stack_bytes = sum(parameter_bytes(p, forms["stack"]) for p in member.parameters)
    return member


def expand_group(family, keys, forms):
    group = Group(family, keys)
    for variant in keys.get("members", [{}]):
        merged = keys | variant
        for name in merged.get("names", []):
            group.members.append(make_member(group, merged, forms, name))
        if "names" in merged:
            continue
        for types, layout, kind in itertools.product(
                merged.get("types", [""]), merged.get("layouts", [""]), merged.get("kinds", [""])):
            tail = layout + kind + merged.get("suffix", "")
            name = "_".join(filter(None, ["qori" + merged["op"], merged.get("variant", ""), types, tail]))
            if name not in merged.get("except", []):
                group.members.append(make_member(group, merged, forms, name, kind, types, layout))
    if "brief" not in keys:
        raise RegistryError(f"{family.stem}: a group has no brief")
    return group


def load(folder):
    forms = tomllib.loads((folder / "forms.toml").read_text())
    families = []
    for path in sorted(folder.glob("*.toml")):
        if path.name == "forms.toml":
            continue
        data = tomllib.loads(path.read_text())
        data["texts"] = forms["texts"] | data.get("texts", {})
        family = Family(path.stem, data.pop("title"), data.pop("namespace"))
        for keys in data.pop("group"):
            family.groups.append(expand_group(family, data | keys, forms))
        families.append(family)
    names = [m.name for m in all_members(families)]
    twice = [a for a, b in zip(names, names[1:]) if a == b]
    if twice:
        raise RegistryError(f"listed twice: {twice[:5]}")
    return families


def all_members(families):
    """Every member in the order of the export table: byte-wise ascending names."""
    members = [m for f in families for g in f.groups for m in g.members]
    return sorted(members, key=lambda m: m.name.encode())


# --- header and reference pages -------------------------------------------------------------------------------------

def checks_of(keys):
    """The statuses of errors in their order, each with its cause. A list and its entries may be names: of the family's
    checklists, of its texts and of those of forms.toml."""
    checks = keys.get("checks", [])
    if isinstance(checks, str):
        checks = keys["checklists"][checks]
    return [keys["texts"].get(c, c) for c in checks]


def documentation(group):
    keys = dict(group.keys)
    if "returns" not in keys:
        keys["returns"] = "QOR_OK; in this order " + ", ".join(checks_of(keys)) + "; then nothing is written."
    return keys["brief"], [(label, keys[key]) for key, label in DOC_FIELDS if key in keys]


def comment(group):
    brief, fields = documentation(group)
    lines = textwrap.wrap(brief, 112, initial_indent="/** ", subsequent_indent=" *  ")
    for label, text in fields:
        head = f" *  {label:<10}"
        if label == "Example":
            body = text.strip().splitlines()
            lines += [head + body[0]] + [" *  " + " " * 10 + b for b in body[1:]]
        else:
            lines += textwrap.wrap(text, 112, initial_indent=head, subsequent_indent=" *  " + " " * 10)
    return "\n".join(lines + [" */"])


def declaration(member):
    text = f"QORI_API {member.result} QORI_CALL {member.name}({member.prototype});"
    bound = text.replace(" ", "\0").replace(",\0", ", ")     # break between parameters only
    return "\n".join(textwrap.wrap(bound, 120, subsequent_indent=" " * 4)).replace("\0", " ")


def header(families):
    template = (ROOT / "api" / "header.h.in").read_text()
    parts = []
    for family in families:
        parts.append(f"/* ---- {family.title} {'-' * (105 - len(family.title))} */\n")
        for group in family.groups:
            parts.append(comment(group))
            parts += [declaration(m) for m in group.members]
            parts.append("")
    return template.replace("@DECLARATIONS@", "\n".join(parts).rstrip())


def reference_page(family):
    lines = [f"# {family.title}", ""]
    for group in family.groups:
        brief, fields = documentation(group)
        lines += [f"## {brief}", ""]
        for label, text in fields:
            if label == "Example":
                lines += ["**Example**", "", "```c", text.strip(), "```", ""]
            else:
                lines += [f"**{label}.** {text}", ""]
        lines += ["```c"] + [f"{m.result} {m.name}({m.prototype});" for m in group.members] + ["```", ""]
    return "\n".join(lines)


# --- build products -------------------------------------------------------------------------------------------------

def entries(family):
    """Wrappers: included by the family's source file behind its templates."""
    lines = ["// Generated by tools/apigen.py.", f"namespace qori::{family.namespace} {{", 'extern "C" {']
    for member in (m for g in family.groups for m in g.members):
        result = "" if member.result == "void" else "return "
        lines.append(f"{member.result} QORI_CALL {member.name}_impl({member.prototype}) {{\n"
                     f"    {result}{member.call}({', '.join(member.expressions)});\n}}")
    return "\n".join(lines + ["}", "}", ""])


def members_list(family):
    """X-macro lines: export, operation, element types, layouts, kind and suffix."""
    lines = ["// Generated by tools/apigen.py."]
    for member in (m for g in family.groups for m in g.members):
        lines.append(f"QORI_MEMBER({member.name}, {member.group.id}, {member.source}, {member.target}, "
                     f"{member.source_layout}, {member.target_layout}, {member.kind}, {member.suffix})")
    return "\n".join(lines + [""])


def contract(member):
    """X-macro line: export, names of its parameters, and its checks as the header lists them."""
    names = " ".join(re.search(r"(\w+)(?:\[\w*\])?$", p)[1] for p in member.parameters)
    return f'QORI_CONTRACT({member.name}, "{names}", "{"|".join(member.checks)}")'


def contracts(family):
    return "\n".join(["// Generated by tools/apigen.py."] + [contract(m) for g in family.groups for m in g.members
                                                             if m.result == "QorResult"] + [""])


def includes(kind, families):
    return "".join(f'#include "{kind}/{f.stem}.inc"\n' for f in families)


def entry_table(members):
    """One 16-byte stub and one table slot per export. Preprocessed assembly for both systems."""
    lines = ["/* Generated by tools/apigen.py. */", '#include "frame/entry_macros.h"',
             "", ".data", ".balign 64", "qoriEntryTable:"]
    lines += [f"    QORI_SLOT {m.name}, {m.stack_bytes}" for m in members]
    lines += ["", ".text", ".balign 64"]
    lines += [f"    QORI_STUB {m.name}, {i}" for i, m in enumerate(members)]
    return "\n".join(lines + [""])


def export_definition(members):
    return "\n".join(['LIBRARY "qorik5-8.2.dll"', "EXPORTS"] + [f"    {m.name}" for m in members] + [""])


def import_definition(members):
    return "\n".join(['LIBRARY "qorik5-8.2.dll"', "EXPORTS"] +
                     [f"    {m.name}@{m.stack_bytes}" for m in members] + [""])


def version_script(members):
    return "{\nglobal:\n" + "".join(f"    {m.name};\n" for m in members) + "local: *;\n};\n"


def write(path, text):
    path.parent.mkdir(parents=True, exist_ok=True)
    if not path.exists() or path.read_text() != text:
        path.write_text(text)


def build(families, folder):
    members = all_members(families)
    for family in families:
        write(folder / "entries" / f"{family.stem}.inc", entries(family))
        write(folder / "members" / f"{family.stem}.inc", members_list(family))
        write(folder / "contracts" / f"{family.stem}.inc", contracts(family))
        write(folder / "reference" / f"{family.stem}.md", reference_page(family))
    write(folder / "members" / "all.inc", includes("members", families))
    write(folder / "contracts" / "all.inc", includes("contracts", families))
    write(folder / "entry_table.S", entry_table(members))
    write(folder / "exports.def", export_definition(members))
    write(folder / "imports.def", import_definition(members))
    write(folder / "exports.map", version_script(members))
    write(folder / "exports.txt", "".join(m.name + "\n" for m in members))


def choose(families, stems):
    unknown = set(stems) - {f.stem for f in families}
    if unknown:
        raise RegistryError(f"unknown families: {sorted(unknown)}")
    return [f for f in families if not stems or f.stem in stems]


# --- finding one's way ----------------------------------------------------------------------------------------------

def lines_with(path, pattern):
    """FILE:LINE: TEXT of each line of a file that the pattern matches."""
    relative = path.relative_to(ROOT)
    return [f"{relative}:{number}: {text.strip()}" for number, text in enumerate(path.read_text().splitlines(), 1)
            if re.search(pattern, text)]


def includes_of(path):
    """A source and the files of src/ that it includes, theirs too."""
    found, waiting = [], [path]
    while waiting:
        file = waiting.pop()
        if file in found:
            continue
        found.append(file)
        for name in re.findall(r'^#include "([^"]+)"', file.read_text(), re.MULTILINE):
            places = [folder / name for folder in (file.parent, ROOT / "src", ROOT / "src/frame")]
            waiting += [place for place in places if place.exists()][:1]
    return found


def where(families, name):
    """The registry's line, the call that the wrapper makes, and the family's function; then the kernels' files."""
    matches = [(f, g, m) for f in families for g in f.groups for m in g.members if m.name == name]
    if not matches:
        raise RegistryError(f"no export is called {name}")
    family, group, member = matches[0]
    place = lines_with(ROOT / "api" / f"{family.stem}.toml", rf'^call = "{re.escape(group.keys["call"])}"')
    lines = [f"{name}({member.prototype})", f"registry   {place[0] if place else f'api/{family.stem}.toml'}",
             f"calls      {family.namespace}::{member.call}"]
    sources = [p for p in (ROOT / "src").rglob("*.cpp") if f'"entries/{family.stem}.inc"' in p.read_text()]
    for file in includes_of(sources[0]):
        if "kernels" in file.parts:
            continue
        lines += [f"function   {found}" for found in lines_with(file, rf"^(?!\s+(?:return|if)\b).*\b{group.id}\b( =|\()")]
    kernels = sorted(str(f.relative_to(ROOT)) for f in includes_of(sources[0]) if "kernels" in f.parts)
    return lines + [f"kernels    {', '.join(kernels) or 'none'}"]


def main(arguments):
    command, *operands = arguments or [""]
    if not operands or command not in ("header", "build", "where") or (command == "header" and len(operands) > 1):
        print(__doc__, file=sys.stderr)
        return 2
    try:
        families = load(ROOT / "api")
        if command == "header":
            write(Path(operands[0]), header(families))
        elif command == "build":
            folder, *chosen = operands
            build(choose(families, chosen), Path(folder))
        else:
            for name in operands:
                print("\n".join(where(families, name)))
    except (RegistryError, KeyError, tomllib.TOMLDecodeError) as error:
        print(f"apigen: {error!r}", file=sys.stderr)
        return 1
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
