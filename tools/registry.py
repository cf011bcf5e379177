"""The registry in api/: families, groups and members, and what each argument of a member is for."""
import itertools
import re
import tomllib
from dataclasses import dataclass, field
from pathlib import Path

import roles

ROOT = Path(__file__).resolve().parent.parent
LAYOUT = re.compile(r"^(?P<src>AC4|AC1|[CP][1-4]|AP4)(?P<dst>C3C|C4C|AC4|A0C4|[CP][1-4]|AP4|C)?$")


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
    types: str = ""                 # codes as in the name
    layout: str = ""
    c_operation: str = ""           # op and variant, the key of api/roles.toml
    operation: roles.Operation = None
    arguments: list = field(default_factory=list)
    purpose: str = ""

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


def checks_of(keys):
    """The statuses of errors in their order, each with its cause. A list and its entries may be names: of the family's
    checklists, of its texts and of those of forms.toml."""
    checks = keys.get("checks", [])
    if isinstance(checks, str):
        checks = keys["checklists"][checks]
    return [keys["texts"].get(c, c) for c in checks]


def make_member(group, keys, forms, name, kind="", types=None, layout=None):
    member = Member(name=name, group=group, kind=kind, types=types or "", layout=layout or "")
    member.c_operation = "_".join(filter(None, [keys["op"], keys.get("variant")])) if "op" in keys else name[4:]
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
        if path.name in ("forms.toml", "roles.toml"):
            continue
        data = tomllib.loads(path.read_text())
        data["texts"] = forms["texts"] | data.get("texts", {})
        family = Family(path.stem, data.pop("title"), data.pop("namespace"))
        for keys in data.pop("group"):
            family.groups.append(expand_group(family, data | keys, forms))
        families.append(family)
    members = all_members(families)
    twice = [a.name for a, b in zip(members, members[1:]) if a.name == b.name]
    if twice:
        raise RegistryError(f"listed twice: {twice[:5]}")
    give_roles(families, tomllib.loads((folder / "roles.toml").read_text()))
    return families


def give_roles(families, table):
    enums = roles.enumerations((ROOT / "api" / "header.h.in").read_text())
    try:
        for family in families:
            for member in (m for g in family.groups for m in g.members):
                roles.apply(member, family.stem, table, enums)
        roles.check(all_members(families))
    except roles.RoleError as error:
        raise RegistryError(str(error)) from error


def all_members(families):
    """Every member in the order of the export table: byte-wise ascending names."""
    members = [m for f in families for g in f.groups for m in g.members]
    return sorted(members, key=lambda m: m.name.encode())


def choose(families, stems):
    unknown = set(stems) - {f.stem for f in families}
    if unknown:
        raise RegistryError(f"unknown families: {sorted(unknown)}")
    return [f for f in families if not stems or f.stem in stems]
