"""What each argument of a member is for, and the operations' names outside C: api/roles.toml applied to members."""
import keyword
import re
from dataclasses import dataclass, field

ROLE = re.compile(r"^(?P<kind>\w+)(?::(?P<detail>\w+))?(?: (?P<name>\w+))?(?: = (?P<default>.+))?$")
IMAGES = ("image_in", "image_out", "image_inout", "planes_in", "planes_out")
RULES = {"reach": {"", "window", "kernel", "structure", "fixed", "1", "2", "row", "column", "centred", "centred_kernel",
                   "centred_plan", "plan"},
         "extent": {"", "full", "same", "valid", "algorithm", "plan", "axis", "frame", "blocks", "bits", "2x2", "4x4",
                    "8x8", "levels", "windows", "row"},
         "overlap": {"exact", "never"}}


KEYWORDS = set(keyword.kwlist) | set("""
    auto bool case char default delete double explicit float int long new operator register short signed switch template
    this typename union unsigned using virtual void volatile""".split())


class RoleError(Exception):
    pass


@dataclass
class Argument:
    """One C parameter: its declaration, and what api/roles.toml says of it."""
    c_name: str
    declaration: str
    element: str                    # the C type that it is or points to, without const
    stars: int                      # pointers and arrays that lead to it
    const: bool
    length: int                     # of an array; 0: no array
    kind: str = ""
    detail: str = ""
    name: str = ""
    default: str | None = None


@dataclass
class Operation:
    """An entry of [operations]."""
    c_name: str
    snake: str
    names: dict = field(default_factory=dict)
    reversed: bool = False
    reach: str = ""
    extent: str = ""
    overlap: str = "exact"
    buffer: str = ""
    plan: str = ""


def snake_case(name):
    name = re.sub(r"(?<=[a-z0-9])(?=[A-Z])|(?<=[A-Z])(?=[A-Z][a-z])", "_", name)
    return re.sub(r"_+", "_", name).lower()


def public_name(c_name):
    return snake_case(re.sub(r"^p+(?=[A-Z])", "", c_name))


def declared(parameter):
    match = re.match(r"^(?P<head>.*?)(?P<name>\w+)(?:\[(?P<length>\w*)\])?$", parameter)
    head, length = match["head"], match["length"]
    element = re.sub(r"\bconst\b|\*", " ", head).split()
    if len(element) != 1:
        raise RoleError(f"cannot read the parameter {parameter}")
    return Argument(match["name"], parameter, element[0], head.count("*") + (length is not None),
                    head.lstrip().startswith("const"), int(length) if length else 0)


def operation_of(c_name, types, table):
    for key in (f"{c_name}_{types}", c_name):
        if key in table:
            entry = dict(table[key])
            break
    else:
        entry = {}
    unknown = set(entry) - set(Operation.__dataclass_fields__) - {"c_name"}
    operation = Operation(c_name, entry.pop("snake", snake_case(c_name)), **entry) if not unknown else None
    if unknown or any(getattr(operation, rule) not in values for rule, values in RULES.items()):
        raise RoleError(f"{c_name}: roles.toml says what nothing understands: {entry}")
    return operation


def give_role(argument, text, kinds, enums):
    match = ROLE.match(text)
    if not match or (match["kind"] not in kinds and match["kind"] != "plan"):
        raise RoleError(f"{argument.declaration}: unknown role {text}")
    argument.kind, argument.detail = match["kind"], match["detail"] or ""
    argument.name, argument.default = match["name"] or public_name(argument.c_name), match["default"]
    if argument.kind in ("enum", "flags"):
        names = enums.get(argument.detail, {})
        if not names or (argument.default not in (None, "0") and argument.default not in names):
            raise RoleError(f"{argument.declaration}: unknown enumeration or value in {text}")


def settle(arguments, operation):
    """Completes roles by what stands beside them: images without steps, planes, directions of plans, operands."""
    for argument, after in zip(arguments, arguments[1:] + [None]):
        if argument.kind in IMAGES and argument.stars == 2:
            argument.kind = argument.kind.replace("image", "planes")
        elif argument.kind in IMAGES and (after is None or after.kind != "step") \
                and not (after and after.name == "bit_offset"):
            argument.kind = argument.kind.replace("image", "array")
        elif argument.kind == "lists_in" and not argument.const:
            argument.kind = "lists_out"
        elif argument.kind == "plan":
            argument.detail = argument.element
            argument.kind = ("plan_new" if argument.stars == 2 else "plan_in" if argument.const else
                             "plan_release" if len(arguments) == 1 else "plan_out")
    kinds = [a.kind for a in arguments]
    if "image_inout" in kinds and "image_in" in kinds:
        arguments[kinds.index("image_in")].name, arguments[kinds.index("image_inout")].name = "a", "b"
    swap = {"a": "b", "b": "a"} if operation.reversed else {}
    for argument in arguments:
        argument.name = operation.names.get(argument.name, swap.get(argument.name, argument.name))


def purpose(member):
    """operation, or how a member serves others: prepare, allocate, release, query, inspect, memory, library."""
    kinds = {a.kind for a in member.arguments}
    for kind, meaning in (("plan_new", "allocate"), ("plan_release", "release"), ("plan_out", "prepare"),
                          ("bytes", "query"), ("memory", "memory")):
        if kind in kinds:
            return meaning
    if member.result != "QorResult":
        return "memory" if kinds else "library"
    if "plan_in" in kinds and not kinds & {*IMAGES}:
        return "inspect"
    return "operation"


def apply(member, stem, roles, enums):
    member.operation = operation_of(member.c_operation, member.types, roles["operations"])
    own = roles.get("families", {}).get(stem, {})
    member.arguments = [declared(p) for p in member.parameters]
    for argument in member.arguments:
        text = own.get(argument.c_name, roles["parameters"].get(argument.c_name))
        if text is None:
            raise RoleError(f"{member.name}: roles.toml gives {argument.c_name} no role")
        give_role(argument, text, roles["kinds"], enums)
    settle(member.arguments, member.operation)
    member.purpose = purpose(member)


def form(member):
    """What tells a member from others of its operation's name: two of one form could not be told apart."""
    operands = [(a.name, a.kind.split("_")[0], a.element if a.kind in ("kernel", "rows_in") else "")
                for a in member.arguments
                if a.kind not in ("step", "region", "buffer")]
    chosen_by_plan = member.operation.c_name if member.operation.plan else ""
    return member.operation.snake, member.types, member.layout, member.kind, chosen_by_plan, tuple(sorted(operands))


def check(members):
    """Names that the doors can have, forms that they can tell apart, and work memory that they can measure."""
    names, forms = {m.name for m in members}, {}
    for member in members:
        reserved = KEYWORDS & {member.operation.snake, *(a.name for a in member.arguments)}
        if reserved:
            raise RoleError(f"{member.name}: {reserved} are words of Python or C++")
        if member.purpose == "operation":
            twin = forms.setdefault(form(member), member)
            if twin is not member:
                raise RoleError(f"{member.name} and {twin.name} are one form of {member.operation.snake}")
            query = buffer_query(member)
            if ("buffer" in {a.kind for a in member.arguments}) != bool(query) or (query and query not in names):
                raise RoleError(f"{member.name}: no query of its work memory, or one that it does not need: {query!r}")


def unused(members, roles):
    """Operations of the table that no member has."""
    return sorted(set(roles["operations"]) - {m.c_operation for m in members} -
                  {f"{m.c_operation}_{m.types}" for m in members})


def buffer_query(member):
    """The export that reports the bytes of the member's work memory."""
    source = member.types if member.source == member.target else re.match(r"\d+[a-z]+?(?=\d|$)", member.types)[0]
    plan = "32s" if "32s" in member.types else "32f"
    return member.operation.buffer.replace("{S}", source).replace("{L}", member.layout).replace("{P}", plan)


def enumerations(header):
    """{enumeration: {name: value}} of the header's text."""
    found = {}
    for name, body in re.findall(r"typedef enum (\w+) \{(.*?)\n\} \1;", header, re.DOTALL):
        body = re.sub(r"/\*.*?\*/", "", body, flags=re.DOTALL)
        found[name] = {n: int(v, 0) for n, v in re.findall(r"(\w+)\s*=\s*(-?\w+)", body)}
    return found
