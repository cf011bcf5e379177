"""What the Python package makes of the registry: its functions, their parameters, and the forms behind them.

An operation is one function of the package. A form is what one C member, with its in-place twin where there is one, makes
of it: element types, layouts, the parameters that it takes.
"""
import re
from collections import defaultdict
from dataclasses import dataclass, field

from registry import ROOT, RegistryError
import roles

ELEMENTS = ["uint8_t", "int8_t", "uint16_t", "int16_t", "uint32_t", "int32_t", "int64_t", "float", "double",
            "QorComplex16s", "QorComplex32s", "QorComplex32f"]
SRC, SRC2, OUT, MASK, OUT2 = range(5)
ALPHA, CHANNEL, PLANAR = 8, 16, 32
PLAN_TYPES = ["ResizePlan", "WarpAffinePlan", "DctPlan", "DftPlan", "FftPlan", "HistogramPlan", "LinearFilterPlan",
              "AdaptiveGaussPlan", "HogPlan"]


@dataclass
class Parameter:
    name: str
    kind: str                       # KIND_... of python/src/core.h
    image: int = -1
    enum: str = ""
    default: str | None = None
    annotation: str = "Any"
    optional: bool = False


@dataclass
class Form:
    member: object
    twin: object = None             # in place
    accepts: set = field(default_factory=set)
    requires: set = field(default_factory=set)


@dataclass
class Function:
    name: str
    parameters: list = field(default_factory=list)
    positional: int = 0
    forms: list = field(default_factory=list)

    def index(self, name, kind=None):
        for i, p in enumerate(self.parameters):
            if p.name == name and (kind is None or p.kind == kind):
                return i
        return -1


# --- what a member's arguments mean to a caller ---------------------------------------------------------------------

def layout_class(layout):
    channels = int(re.search(r"\d", layout)[0])
    return channels | (ALPHA if layout.startswith("A") else 0) | (PLANAR if "P" in layout else 0)


def layouts(member, inserts):
    """Classes of the source's and the destination's pixels as a caller sees them: alpha that is kept is the
    destination's matter, or the source's where there is no destination."""
    code = member.layout
    source, target = layout_class(member.source_layout.rstrip("C") if code in ("C3C", "C4C") else member.source_layout), 0
    target = layout_class(member.target_layout.rstrip("C") if code in ("C3C", "C4C") else member.target_layout)
    if code in ("C3C", "C4C"):
        source, target = source | CHANNEL, target | CHANNEL
    elif code in ("C3C1", "C4C1"):
        source |= CHANNEL
    elif code in ("C1C3", "C1C4") and inserts:
        target |= CHANNEL
    elif code == "AC4C3":
        source &= ~ALPHA
    if "24u" in member.types:
        target = 3
    elif member.operation.extent == "windows":
        target = 1
    return source, target


def annotation(argument):
    return {"value": "Value", "scalar": "float" if argument.element in ("float", "double") else "int", "enum": "str | int",
            "flags": "str | int", "size": "tuple[int, int]", "point": "tuple[int, int]", "kernel": "Array",
            "lists_in": "Lists", "plan_in": "Plan", "mask": "Array"}.get(argument.kind, "Any")


def public(argument, member):
    """The function's parameters that a C argument asks for: (name, kind, image)."""
    kind, name = argument.kind, argument.name
    if kind in ("image_in", "planes_in", "array_in", "rows_in") and name not in ("weights", "locations"):
        return [(name, "IMAGE", SRC if name in ("src", "a") else SRC2)]
    if kind in ("image_inout", "array_inout"):
        return [(name, "IMAGE", SRC if name in ("src", "a") else SRC2), ("out", "OUT", OUT)]
    if kind in ("image_out", "planes_out", "array_out", "lists_out"):
        if name == "levels":
            return [("levels", "COUNTS", -1)]
        return [("out", "OUT", OUT)]
    if kind == "mask":
        return [(name, "IMAGE", MASK)]
    simple = {"value": "VALUE", "scalar": "NUMBER", "enum": "ENUM", "flags": "FLAGS", "size": "SIZE", "point": "POINT",
              "kernel": "KERNEL", "plan_in": "PLAN", "lists_in": "LISTS"}
    if kind == "array_in":
        return [(name, "VECTOR" if name == "weights" else "POINTS", -1)]
    if kind == "rows":
        return [("before", "SIZE", -1), ("after", "SIZE", -1)]
    if kind in simple:
        return [(name, simple[kind], -1)]
    if kind in ("step", "region", "size_of", "count", "bits", "buffer", "channels", "data_type", "result", "columns"):
        return []
    raise RegistryError(f"{member.name}: the Python door cannot make {argument.c_name}, a {kind}")


def optional(argument, kind, operation):
    return (argument.default is not None or kind == "OUT" or argument.name == "anchor" or
            (kind == "SIZE" and argument.kind == "rows") or argument.name == "locations")


def collect(members):
    """The function of an operation's members: its forms and parameters."""
    function = Function(members[0].operation.snake)
    codes = {m.layout for m in members}
    inserts = "C3C" in codes and "C1C3" in codes
    pairs = {}
    for member in members:
        key = (member.c_operation, member.types, member.layout, member.suffix, member.kind.replace("I", ""))
        form = pairs.setdefault(key, Form(None))
        if "I" in member.kind:
            form.twin = member
        else:
            form.member = member
    found = {}                      # (name, kind) in order: [parameter, forms that require it]
    for form in pairs.values():
        form.inserts = inserts
        for member in filter(None, (form.member, form.twin)):
            for argument in member.arguments:
                for name, kind, image in public(argument, member):
                    entry = found.setdefault((name, kind), Parameter(
                        name, kind, image, argument.detail if kind in ("ENUM", "FLAGS") else
                        member.operation.plan if kind == "PLAN" else "", argument.default,
                        annotation(argument)))
                    form.accepts.add((name, kind))
                    if not optional(argument, kind, member.operation) and name != "after":
                        form.requires.add((name, kind))
        source, target = layouts(form.member or form.twin, inserts)
        form.layouts = source, target
    function.forms = sorted(pairs.values(), key=lambda f: (key_of(f), len(f.accepts), (f.member or f.twin).name))
    everywhere = set.intersection(*(f.requires for f in function.forms))
    either = {("b", "IMAGE"), ("b", "VALUE")}
    required = [p for k, p in found.items() if (k in everywhere or k in either) and p.kind != "OUT"]
    images = sorted((p for p in required if p.kind == "IMAGE"), key=lambda p: p.image)
    images += [p for p in required if p.name == "b" and p.kind == "VALUE"]
    plans = [p for p in required if p.kind == "PLAN"]
    others = [p for p in required if p not in images and p not in plans]
    others.sort(key=lambda p: ["KERNEL", "LISTS", "VECTOR"].index(p.kind) if p.kind in ("KERNEL", "LISTS", "VECTOR") else 3)
    out = [p for p in found.values() if p.kind == "OUT"]
    rest = [p for p in found.values() if p not in required and p.kind != "OUT"]
    for p in rest:
        p.optional = True
    if not any(p.kind == "IMAGE" for p in images):              # fills what is given
        for p in out:
            p.optional, p.name = False, "dst"
        function.parameters = out + others + rest
        function.positional = len(out + others)
    else:
        for p in out:
            p.optional = True
        function.parameters = images + plans + others + out + rest
        function.positional = len(images + plans + others + out)
    add_choices(function, codes)
    return function


def add_choices(function, codes):
    """Keywords that choose among forms of one signature."""
    classes = [f.layouts for f in function.forms]
    if any((source | target) & ALPHA for source, target in classes):
        function.parameters.append(Parameter("keep_alpha", "KEEP_ALPHA", default="False", annotation="bool", optional=True))
    if any((source | target) & CHANNEL for source, target in classes):
        function.parameters.append(Parameter("channel", "CHANNEL", annotation="int", optional=True))
    if function.index("out") < 0:
        return
    targets, channels = defaultdict(set), defaultdict(set)
    for form in function.forms:
        m = form.member or form.twin
        targets[m.source, form.layouts[0]].add(m.target)
        channels[m.source, form.layouts[0] & 7].add(form.layouts[1] & 7)
    if any(len(t) > 1 for t in targets.values()):
        function.parameters.append(Parameter("dtype", "DTYPE", annotation="DType", optional=True))
    if function.name == "duplicate":
        function.parameters.append(Parameter("channels", "CHANNELS", annotation="int", optional=True))
    if any((f.member or f.twin).operation.extent == "bits" for f in function.forms):
        function.parameters.append(Parameter("width", "WIDTH", annotation="int", optional=True))


def functions(families):
    groups = defaultdict(list)
    for family in families:
        for member in (m for g in family.groups for m in g.members):
            if member.purpose == "operation":
                groups[member.operation.snake].append(member)
    found = [collect(groups[name]) for name in sorted(groups)]
    for function in found:
        if len(function.parameters) > 24:
            raise RegistryError(f"{function.name}: more parameters than the Python door counts")
    return found


def reads(member):
    return any(a.kind.endswith(("_in", "_inout")) and a.kind != "plan_in" for a in member.arguments)


def elements_of(member):
    """Of the first image that is given and of the destination; names without element types tell by their arguments."""
    if member.source == "void":
        return (next(a.element for a in member.arguments if a.stars),) * 2
    return member.source if reads(member) else member.target, member.target


def key_of(form):
    main = form.member or form.twin
    layout = form.layouts[0 if reads(main) else 1]
    return ELEMENTS.index(elements_of(main)[0]), (layout & 7) + (5 if layout & PLANAR else 0)


# --- texts ---------------------------------------------------------------------------------------------------------

ENUMS = roles.enumerations((ROOT / "api" / "header.h.in").read_text())


def parameter_list(function, text):
    """text(parameter) of each; an operand that may be an image or numbers stands once."""
    texts = []
    for i, p in enumerate(function.parameters):
        if p.name == "b" and p.kind == "VALUE" and i and function.parameters[i - 1].name == "b":
            continue
        if i == function.positional:
            texts.append("*")
        texts.append(text(p))
    return ", ".join(texts)


def signature(function):
    texts = parameter_list(function, lambda p: p.name + ("=" + default_text(p) if p.optional else ""))
    return f"{function.name}({texts})"


def default_text(p):
    if p.default is None or p.kind == "POINT":
        return "None"
    if p.kind in ("ENUM", "FLAGS"):
        return "0" if p.default == "0" else repr(enum_word(p.enum, p.default))
    return p.default


def enum_word(enum, name):
    """The word for an enumerator: its name in snake_case without the prefix that all of its enumeration share."""
    names = ENUMS[enum]
    first = [re.match(r"[a-z]+", n)[0] for n in names]
    prefix = first[0] if all(f == first[0] for f in first) and all(len(n) > len(first[0]) for n in names) else ""
    return roles.snake_case(name[len(prefix):]).replace("_axis", "").strip("_")


def doc(function):
    briefs = list(dict.fromkeys((f.member or f.twin).group.keys["brief"] for f in function.forms))
    members = [m for f in function.forms for m in (f.member, f.twin) if m]
    lines = [signature(function), "--", ""] + briefs
    if any(m.operation.reversed for m in members):
        c_name = "qori" + next(m.c_operation for m in members if m.operation.reversed)
        lines += ["", f"{function.name}(a, b, out) stands in the natural order: what C writes as {c_name}(b, a, out)."]
    names = list(dict.fromkeys("qori" + m.c_operation for m in members))
    return "\n".join(lines + ["", "C: " + ", ".join(names) + "."])
