"""The Python door: tables of operations, forms and argument programs for python/src, stubs and lists of names.

An operation is one function of the package. A form is what one C member, with its in-place twin where there is one, makes
of it: element types, layouts, the parameters that it takes. A program says where each C argument of a member comes from.
"""
import re
from collections import defaultdict
from dataclasses import dataclass, field

from registry import ROOT, RegistryError, all_members, processed
import roles

ELEMENTS = ["uint8_t", "int8_t", "uint16_t", "int16_t", "uint32_t", "int32_t", "int64_t", "float", "double",
            "QorComplex16s", "QorComplex32s", "QorComplex32f"]
ERASED = {"int64_t": "l", "QorImageSize": "l", "QorPoint2D": "l", "QorComplex32s": "l", "float": "f", "double": "d",
          "QorComplex32f": "c"}
SRC, SRC2, OUT, MASK, OUT2 = range(5)
ALPHA, CHANNEL, PLANAR = 8, 16, 32
# The plans' types, and which of a plan's variants each operation takes (python/src/plans.h).
PLANS = {"ResizeNearest": "NEAREST", "ResizeLinear": "LINEAR", "ResizeCubic": "CUBIC", "ResizeLanczos": "LANCZOS",
         "ResizeSuper": "SUPER", "ResizeAntialiasing": "ANTIALIAS", "WarpAffineNearest": "NEAREST",
         "WarpAffineLinear": "LINEAR", "WarpAffineCubic": "CUBIC", "DCTFwd": "ANY", "DCTInv": "ANY", "Histogram": "ANY",
         "FilterBorder": "ANY", "ThresholdAdaptiveGauss": "ANY", "HOG": "ANY", "DFTFwd_RToPack": "REAL",
         "DFTInv_PackToR": "REAL", "DFTFwd_CToC": "COMPLEX", "DFTInv_CToC": "COMPLEX", "FFTFwd_RToPack": "REAL",
         "FFTInv_PackToR": "REAL", "FFTFwd_CToC": "COMPLEX", "FFTInv_CToC": "COMPLEX"}
PLAN_TYPES = ["ResizePlan", "WarpAffinePlan", "DctPlan", "DftPlan", "FftPlan", "HistogramPlan", "LinearFilterPlan",
              "AdaptiveGaussPlan", "HogPlan"]
# How the bytes of work memory are asked for, by the query's arguments.
QUERIES = {("region", "size", "data_type", "channels", "bytes"): "WINDOW",
           ("size_of", "size_of", "flags", "bytes"): "CORRELATION", ("size_of", "columns", "bytes"): "KERNEL_ROW",
           ("plan_in", "bytes"): "PLAN", ("plan_in", "size_of", "channels", "bytes"): "PLAN_TILE_CHANNELS",
           ("plan_in", "size_of", "bytes"): "PLAN_TILE", ("plan_in", "region", "bytes"): "PLAN_TILE",
           ("data_type", "region", "count", "channels", "scalar", "bytes", "bytes"): "PLAN_KNOWN",
           ("size_of", "region", "data_type", "data_type", "channels", "bytes", "bytes"): "FILTER_BORDER",
           ("region", "size", "data_type", "channels", "bytes", "bytes"): "ADAPTIVE"}


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


# --- C tables -------------------------------------------------------------------------------------------------------

def erased(member):
    return "".join("p" if a.stars else ERASED.get(a.element, "i") for a in member.arguments)


def element(c_type, member):
    if c_type not in ELEMENTS:
        raise RegistryError(f"{member.name}: the Python door knows no elements {c_type}")
    return ELEMENTS.index(c_type)


def instruction(argument, before, member, function, results):
    """(operation, a, b, c) of python/src/core.h for one C argument."""
    kind = argument.kind
    in_place = "I" in member.kind
    frame = member.operation.extent == "frame"
    if kind == "step":
        return ("STEP", before[1], 0, 0)
    if kind in ("image_in", "array_in", "image_out", "array_out", "image_inout", "array_inout", "planes_in", "planes_out",
                "mask") and argument.name not in ("weights", "locations"):
        names = {"src": SRC, "a": SRC, "b": SRC2, "pattern": SRC2, "mask": MASK, "max": OUT2}
        image = names.get(argument.name, OUT)
        if kind.endswith("inout"):
            image = SRC if frame else OUT
        elif kind.endswith("out"):
            image = OUT2 if argument.name == "max" else OUT
        if member.operation.extent == "windows" and kind == "array_out":
            return ("DATA", OUT, 0, 0)
        return ("PLANES" if kind.startswith("planes") else "DATA", image, 0, 0)
    if kind == "rows_in":
        return ("ROWS", SRC, 0, 0)
    if kind == "region":
        return ("REGION", 0, 0, 0)
    if kind == "size_of":
        if argument.detail in ("kernel", "structure"):
            return ("KERNEL_SIZE", function.index(argument.detail), 0, 0)
        return ("SIZE_OF", {"src": SRC, "pattern": SRC2, "dst": OUT}[argument.detail], 0, 0)
    if kind == "buffer":
        return ("BUFFER", 0, 0, 0)
    if kind == "columns":
        return ("LEFT", function.index("before"), 0, 0)
    if kind == "rows":
        return ("TOP", function.index("before"), 0, 0)
    if kind == "count":
        if argument.detail == "src":
            return ("HEIGHT", SRC, 0, 0)
        if argument.detail == "dst":
            return ("WIDTH", SRC, 0, 0)
        if argument.detail == "locations":
            return ("COUNT_POINTS", function.index("locations"), 0, 0)
        return ("COUNTS", 0, 0, argument.length)
    if kind == "bits":
        return ("BITS", 0, 0, 0)
    if kind == "result":
        results.append((element(argument.element, member), argument.length or 1,
                        {"column": "COLUMN", "row": "ROW"}.get(argument.name, "PLAIN")))
        return ("RESULT", len(results) - 1, 0, 0)
    if kind == "lists_out":
        return ("LISTS_OUT", 1 if argument.name == "levels" else 0, 0, argument.length)
    index = next((i for i, p in enumerate(function.parameters)
                  if (p.name, p.kind) in {(n, k) for n, k, _ in public(argument, member)}), -1)
    if index < 0:
        raise RegistryError(f"{member.name}: the Python door has no parameter for {argument.c_name}")
    if kind == "value":
        return ("VALUE", index, element(argument.element, member),
                0 if not argument.stars else argument.length or processed(member.target_layout))
    if kind == "scalar":
        one_axis = argument.name == "anchor"
        return ("ANCHOR" if one_axis else "NUMBER", index, element(argument.element, member), 0)
    if kind == "lists_in":
        return ("LISTS", index, element(argument.element, member), argument.length or 9 * ("24u" in member.types))
    if kind == "array_in":
        return ("VECTOR" if argument.name == "weights" else "POINTS", index, 0, 0)
    return ({"enum": "ENUM", "flags": "FLAGS", "size": "SIZE", "point": "POINT", "kernel": "KERNEL", "plan_in": "PLAN"}[kind],
            index, 0, 0)


def program(member, function, results):
    steps, before = [], None
    for argument in member.arguments:
        before = instruction(argument, before, member, function, results)
        if before[1] < 0:
            raise RegistryError(f"{member.name}: the Python door has no parameter for {argument.c_name}")
        steps.append(before)
    return steps


def query(member, members):
    name = roles.buffer_query(member)
    if not name:
        return "NONE", "NULL"
    kinds = tuple(a.kind for a in members[name].arguments)
    if kinds not in QUERIES:
        raise RegistryError(f"{name}: the Python door cannot ask with {kinds}")
    return QUERIES[kinds], f"(Function){name}"


class Tables:
    """Programs, results and signatures shared by forms of equal content."""

    def __init__(self):
        self.programs, self.results, self.signatures = {}, {}, {}

    @staticmethod
    def number(table, key):
        return table.setdefault(key, len(table))


def bits(names, function):
    return sum(1 << i for i, p in enumerate(function.parameters) if (p.name if p.name != "dst" else "out", p.kind) in names)


def kernel_type(member):
    """Elements of the kernel or the palettes, by which forms are chosen; of palettes of triples one past all others."""
    if "24u" in member.types:
        return len(ELEMENTS)
    found = [a.element for a in member.arguments if a.kind == "kernel" or a.name == "table"]
    return element(found[0], member) if found else 255


def form_row(form, function, tables, members):
    main = form.member or form.twin
    cells = []
    results = []
    for member in (form.member, form.twin):
        if member is None:
            cells.append("NULL, 0, 0")
            continue
        results = []
        steps = program(member, function, results)
        cells.append(f"(Function){member.name}, {tables.number(tables.signatures, erased(member))}, "
                     f"{tables.number(tables.programs, tuple(steps))}")
    inout = next((a for a in form.twin.arguments if a.kind.endswith("_inout")), None) if form.twin else None
    cells[1] += f", {SRC2 if inout and inout.name == 'b' else SRC}"
    kind, asked = query(main, members)
    source, target = (element(e, main) for e in elements_of(main))
    contiguous = any(a.kind.startswith("array") and a.name in ("src", "a", "b") for a in main.arguments)
    contiguous_out = any(a.kind in ("array_out", "array_inout") for a in main.arguments)
    variant = PLANS.get(main.c_operation, "NONE") if main.operation.plan else "NONE"
    if main.operation.plan and variant == "NONE":
        raise RegistryError(f"{main.name}: the Python door knows no plans of {main.c_operation}")
    operation = main.operation
    twin = f'"{form.twin.name}"' if form.twin else "NULL"
    return (f'    {{"{main.name}", {cells[0]}, {twin}, {cells[1]}, {source}, {target}, {form.layouts[0]}, '
            f'{form.layouts[1]}, {bits(form.accepts, function) | choice_bits(function)}u, {bits(form.requires, function)}u, '
            f'PLAN_{variant}, QUERY_{kind}, {asked}, {kernel_type(main)}, {tables.number(tables.results, tuple(results))}, '
            f'REACH_{operation.reach.upper() or "NONE"}, EXTENT_{operation.extent.upper() or "SAME"}, '
            f'{int(operation.overlap == "exact")}, {int(contiguous)}, {int(contiguous_out)}, {processed(main.target_layout)}}},')


def choice_bits(function):
    return sum(1 << i for i, p in enumerate(function.parameters)
               if p.kind in ("KEEP_ALPHA", "CHANNEL", "DTYPE", "CHANNELS", "WIDTH"))


def default_number(parameter, enums):
    text = parameter.default
    if text in (None, "False") or " " in text:
        return "0"
    return str(enums[parameter.enum].get(text, text)) if parameter.enum in enums else text


def quoted(text):
    return '"' + text.replace("\\", "\\\\").replace('"', '\\"').replace("\n", "\\n") + '"'


def signature(function):
    parts = []
    for i, p in enumerate(function.parameters):
        if p.name == "b" and p.kind == "VALUE" and i and function.parameters[i - 1].name == "b":
            continue
        if i == function.positional:
            parts.append("*")
        default = "" if not p.optional else "=" + default_text(p)
        parts.append(p.name + default)
    return f"{function.name}({', '.join(parts)})"


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
        lines += ["", "The arguments stand in their natural order; the C functions take them the other way round."]
    names = list(dict.fromkeys("qori" + m.c_operation for m in members))
    return "\n".join(lines + ["", "C: " + ", ".join(names) + "."])


ENUMS = roles.enumerations((ROOT / "api" / "header.h.in").read_text())


def statuses(header):
    body = re.search(r"typedef enum QorStatusCode \{(.*?)\n\}", header, re.DOTALL)[1]
    found = []
    pending = ""
    for line in body.splitlines():
        comment = re.search(r"/\*\*<?\s*(.*?)(?:\*/)?\s*$", line) or re.search(r"^\s+\*\s+(.*?)(?:\*/)?\s*$", line)
        entry = re.search(r"(QOR_\w+) = (-?\d+)", line)
        text = comment[1].strip() if comment else ""
        if entry:
            found.append((entry[1], int(entry[2]), text if "/**<" in line else pending.strip()))
            pending = ""
        else:
            pending += " " + text
    return found


def tables(families):
    """python/src includes this: see core.h for the structures."""
    members = {m.name: m for m in all_members(families)}
    shared = Tables()
    shared.number(shared.results, ())
    rows, heads, thunks, methods, parameters = [], [], [], [], []
    enum_names = sorted(ENUMS)
    for number, function in enumerate(functions(families)):
        start = len(rows)
        rows += [form_row(f, function, shared, members) for f in function.forms]
        first = len(parameters)
        for i, p in enumerate(function.parameters):
            twin = p.name == "b" and p.kind == "IMAGE" and function.index("b", "VALUE") > 0
            parameters.append(f'    {{"{p.name}", KIND_{p.kind}, {p.image}, {which(p)}, '
                              f'{int(not p.optional)}, {function.index("b", "VALUE") if twin else 0}, '
                              f'{default_number(p, ENUMS)}}},')
        heads.append(f'    {{"{function.name}", &parameters[{first}], &forms[{start}], {len(function.parameters)}, '
                     f'{function.positional}, {len(rows) - start}, &index_{function.name}, {{{", ".join(map(str, known(function)))}}}}},')
        thunks.append(index_table(function) + f"OPERATION({function.name}, {number})")
        methods.append(f"    METHOD({function.name}, {quoted(doc(function))}),")
    text = ["/* Generated by tools/apigen.py. */", f"enum {{ OPERATIONS = {len(heads)}, PARAMETERS = {len(parameters)} }};",
            "static const Parameter parameters[] = {", *parameters, "};"]
    text += [f"static const Step program_{n}[] = {{" + ", ".join(
        f"{{STEP_{s[0]}, {s[1]}, {s[2]}, {s[3]}}}" for s in steps) + ", {STEP_END, 0, 0, 0}};"
        for steps, n in shared.programs.items()]
    text += ["static const Step* const programs[] = {" + ", ".join(f"program_{n}" for n in shared.programs.values()) + "};"]
    text += [f"static const Result results_{n}[] = {{" + ", ".join(
        f"{{{e}, {c}, RESULT_{k}}}" for e, c, k in found) + (", " if found else "") + "{0, 0, RESULT_END}};"
        for found, n in shared.results.items()]
    text += ["static const Result* const results[] = {" + ", ".join(f"results_{n}" for n in shared.results.values()) + "};"]
    text += trampolines(shared.signatures)
    text += ["static const Form forms[] = {", *rows, "};", *[t.split("OPERATION(")[0] for t in thunks],
             "static const Operation operations[] = {", *heads, "};"]
    text += ["OPERATION(" + t.split("OPERATION(")[1] for t in thunks]
    text += ["static PyMethodDef methods[] = {", *methods, "    {NULL, NULL, 0, NULL},", "};"]
    for name in enum_names:
        words = ", ".join(f'{{"{enum_word(name, n)}", {v}}}' for n, v in ENUMS[name].items()) if name != "QorStatusCode" else ""
        text.append(f"static const Word words_{name}[] = {{{words}{', ' if words else ''}{{NULL, 0}}}};")
    text += ["static const Enumeration enumerations[] = {"] + [f'    {{"{n}", words_{n}}},' for n in enum_names] + ["};"]
    found = statuses((ROOT / "api" / "header.h.in").read_text())
    text += ["static const Status statuses[] = {"] + [f'    {{{v}, "{n}", {quoted(t)}}},' for n, v, t in found] + [
        "    {0, NULL, NULL},", "};"]
    return "\n".join(text) + "\n"


def known(function):
    """Parameters of Operation.has in python/src/core.h."""
    out = next((i for i, p in enumerate(function.parameters) if p.kind == "OUT"), -1)
    plan = next((i for i, p in enumerate(function.parameters) if p.kind == "PLAN"), -1)
    return [out, *(function.index(name) for name in ("pattern", "border", "offset", "axis")), plan]


def which(parameter):
    """The enumeration or the type of plans that a parameter takes."""
    if parameter.kind == "PLAN":
        return PLAN_TYPES.index(parameter.enum)
    return sorted(ENUMS).index(parameter.enum) if parameter.enum else 0


def index_table(function):
    """First form and number of forms by element type and channels of the first image."""
    return f"static const Index index_{function.name} = {{{{" + ", ".join(
        "{" + ", ".join(f"{{{lo}, {n}}}" for lo, n in row) + "}" for row in spans(function)) + "}};\n"


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


def spans(function):
    table = [[(0, 0)] * 10 for _ in ELEMENTS]
    for i, form in enumerate(function.forms):
        e, c = key_of(form)
        lo, n = table[e][c]
        if n and lo + n != i:
            raise RegistryError(f"{function.name}: forms are not sorted")
        table[e][c] = (lo, n + 1) if n else (i, 1)
    return table


def trampolines(signatures):
    types = {"p": "void*", "i": "int32_t", "l": "int64_t", "f": "float", "d": "double", "c": "QorComplex32f"}
    text = []
    for letters, n in signatures.items():
        declared = ", ".join(types[c] for c in letters)
        passed = ", ".join(f"a[{i}].{c}" for i, c in enumerate(letters))
        text.append(f"static int call_{n}(Function f, const Slot* a) {{ return ((int32_t (*)({declared}))f)({passed}); }}")
    return text + ["static const Trampoline trampolines[] = {" + ", ".join(f"call_{n}" for n in signatures.values()) + "};"]


# --- stubs ----------------------------------------------------------------------------------------------------------

STUB = '''# Generated by tools/apigen.py.
from collections.abc import Sequence
from typing import Any, TypeAlias, final

from numpy.typing import NDArray

Array: TypeAlias = NDArray[Any]
Number: TypeAlias = float | complex
Value: TypeAlias = Number | Sequence[Number] | Array
Numbers: TypeAlias = float | tuple[float, ...]
Position: TypeAlias = tuple[int, int] | tuple[tuple[int, int], ...]
Lists: TypeAlias = Array | Sequence[float] | Sequence[Array] | Sequence[Sequence[float]]
Pair: TypeAlias = int | tuple[int, int] | Sequence[int]
DType: TypeAlias = str | type | Any
Source: TypeAlias = "Array | memoryview | Image"

class Error(ValueError):
    code: int

class Warning(UserWarning): ...

@final
class Image:
    @property
    def shape(self) -> tuple[int, ...]: ...
    @property
    def dtype(self) -> str: ...

def empty(shape: tuple[int, int] | tuple[int, int, int], dtype: DType = "uint8") -> Image: ...
def version() -> str: ...
def _members() -> list[tuple[str, str | None, str | None]]: ...
def _member(function: str, /, *arguments: Any, **keywords: Any) -> str: ...
def _address(plan: Any, /) -> int: ...

class _ImagePlan:
    @property
    def src_shape(self) -> tuple[int, int]: ...
    @property
    def dst_shape(self) -> tuple[int, int]: ...
    @property
    def dtype(self) -> str: ...
    @property
    def border(self) -> tuple[int, int, int, int]: ...

@final
class ResizePlan(_ImagePlan):
    def __new__(cls, src_shape: Pair, dst_shape: Pair, interpolation: str = "linear", dtype: DType = "uint8", *,
                antialias: bool = False, b: float = 0.0, c: float = 0.5, lobes: int = 3) -> ResizePlan: ...
    def __call__(self, src: Source, out: Source | None = None, *, offset: Pair | None = None, border: str | int = "replicate",
                 border_value: Value = 0) -> Array: ...
    def src_offset(self, offset: Pair, /) -> tuple[int, int]: ...
    def src_roi(self, rect: tuple[int, int, int, int], /) -> tuple[tuple[int, int, int, int], tuple[int, int, int, int]]: ...

@final
class WarpAffinePlan(_ImagePlan):
    def __new__(cls, src_shape: Pair, dst_shape: Pair, matrix: Sequence[Sequence[float]] | Array, interpolation: str = "linear",
                dtype: DType = "uint8", channels: int = 1, *, inverse: bool = False, border: str | int = "constant",
                border_value: Value = 0, b: float = 0.0, c: float = 0.5) -> WarpAffinePlan: ...
    def __call__(self, src: Source, out: Source | None = None, *, offset: Pair | None = None) -> Array: ...

class _Transform(_ImagePlan):
    def forward(self, src: Source, out: Source | None = None, *, scale: int = 0, keep_alpha: bool = False) -> Array: ...
    def inverse(self, src: Source, out: Source | None = None, *, scale: int = 0, keep_alpha: bool = False) -> Array: ...

@final
class DctPlan(_Transform):
    def __new__(cls, shape: Pair, *, hint: str | int = "fast") -> DctPlan: ...

@final
class DftPlan(_Transform):
    def __new__(cls, shape: Pair, dtype: DType = "float32", *, norm: str | int = "div_inv_by_n",
                hint: str | int = "fast") -> DftPlan: ...

@final
class FftPlan(_Transform):
    def __new__(cls, shape: Pair, dtype: DType = "float32", *, norm: str | int = "div_inv_by_n",
                hint: str | int = "fast") -> FftPlan: ...

@final
class HistogramPlan:
    def __new__(cls, levels: Lists | int, dtype: DType = "uint8", channels: int = 1, *, lower: Value | None = None,
                upper: Value | None = None) -> HistogramPlan: ...
    def __call__(self, src: Source, out: Any = None) -> Any: ...
    @property
    def dtype(self) -> str: ...
    @property
    def levels(self) -> tuple[tuple[float, ...], ...]: ...

@final
class LinearFilterPlan:
    def __new__(cls, kernel: Source, dtype: DType = "uint8", channels: int = 1, *, divisor: int = 1,
                rounding: str | int = "nearest_even") -> LinearFilterPlan: ...
    def __call__(self, src: Source, out: Source | None = None, *, border: str | int = "replicate",
                 border_value: Value = 0) -> Array: ...
    @property
    def dtype(self) -> str: ...

@final
class AdaptiveGaussPlan:
    def __new__(cls, size: Pair, *, sigma: float = 0.0) -> AdaptiveGaussPlan: ...
    def __call__(self, src: Source, delta: float, out: Source | None = None, *, value_above: int = 255, value_below: int = 0,
                 border: str | int = "replicate", border_value: Value = 0) -> Array: ...
    @property
    def dtype(self) -> str: ...

@final
class HogPlan:
    def __new__(cls, window: Pair = (128, 64), *, cell: int = 8, block: int = 16, stride: int = 8, bins: int = 9,
                sigma: float = 8.0, limit: float = 0.2, columns_first: bool = False) -> HogPlan: ...
    def __call__(self, src: Source, out: Source | None = None, *, locations: Sequence[Pair] | Array | None = None,
                 border: str | int = "replicate", border_value: Value = 0) -> Array: ...
    @property
    def descriptor_size(self) -> int: ...

'''
ANNOTATIONS = {"IMAGE": "Source", "OUT": "Source", "VALUE": "Value", "ENUM": "str | int", "FLAGS": "str | int", "SIZE": "Pair",
               "POINT": "Pair", "KERNEL": "Source", "LISTS": "Lists", "VECTOR": "Lists", "POINTS": "Sequence[Pair] | Array",
               "COUNTS": "int | Sequence[int]", "KEEP_ALPHA": "bool", "CHANNEL": "int", "DTYPE": "DType", "CHANNELS": "int",
               "WIDTH": "int"}


def annotated(function, p):
    text = p.enum if p.kind == "PLAN" else ANNOTATIONS.get(p.kind, p.annotation)
    if p.kind == "IMAGE" and p.name == "b" and function.index("b", "VALUE") > 0:
        text = "Source | Value"
    levels = any((f.member or f.twin).operation.extent in ("levels", "blocks") for f in function.forms)
    if p.kind == "OUT" and levels:
        text = "Any"
    if not p.optional:
        return f"{p.name}: {text}"
    default = default_text(p)
    return f"{p.name}: {text} | None = {default}" if default == "None" and text != "Any" else f"{p.name}: {text} = {default}"


def returned(function):
    main = function.forms[0].member or function.forms[0].twin
    if main.operation.extent in ("levels", "blocks"):
        return "Any"
    results = [a.name for a in main.arguments if a.kind == "result"]
    if not results:
        return "Array"
    parts = ["Position" if name == "column" else "Numbers" for name in results if name != "row"]
    return parts[0] if len(parts) == 1 else f"tuple[{', '.join(parts)}]"


def stub(families):
    lines = []
    for function in functions(families):
        parts = []
        for i, p in enumerate(function.parameters):
            if p.name == "b" and p.kind == "VALUE" and i and function.parameters[i - 1].name == "b":
                continue
            if i == function.positional:
                parts.append("*")
            parts.append(annotated(function, p))
        lines.append(f"def {function.name}({', '.join(parts)}) -> {returned(function)}: ...")
    return STUB + "\n".join(lines) + "\n"


def package_stub(families):
    names = sorted([f.name for f in functions(families)] + [*PLAN_TYPES, "Error", "Warning", "Image", "empty", "version"])
    return "# Generated by tools/apigen.py.\n" + "".join(f"from ._core import {n} as {n}\n" for n in names) + "\n__version__: str\n"


# --- completeness ---------------------------------------------------------------------------------------------------

# What the package does without, and why.
WITHOUT = {r"InitAlloc_(?!R_32s)|Free_(?!R_32s)|DCT(Fwd|Inv)(InitAlloc|Free)": "plans live in memory of their objects",
           r"qoriDCTInv(GetSize|Init)_": "plans of both directions are alike",
           r"qoriMalloc_.*_AC4": "blocks of AC4 are those of C4",
           r"qoriFilterMedianGetBufferSize_|qoriFilterGetBufSize_64f": "no function takes such a buffer"}


def check_support(families):
    """Every member that is not an operation is used by python/src, asked for work memory, or left out for a reason."""
    text = "".join(path.read_text() for path in sorted((ROOT / "python" / "src").glob("*.c")))
    members = all_members(families)
    asked = {roles.buffer_query(m) for m in members if m.purpose == "operation"}
    for member in members:
        name = member.name
        base = re.sub(r"_(?:8u|16u|16s|32s|32f|64f|32sc|32fc)$", "", name)
        pasted = re.sub(r"_(?:8u|16u|16s|32s|32f|32sc|32fc)_", "_##type##_", name)
        if member.purpose != "operation" and name not in asked and not re.search(
                rf"\b{name}\b|BY_TYPE\({base}\)|{re.escape(pasted)}\(", text) and not any(re.search(w, name) for w in WITHOUT):
            raise RegistryError(f"{name}: the Python door does not use it, and says no reason")


def products(families):
    check_support(families)
    return {"python_tables.inc": tables(families), "python/_core.pyi": stub(families),
            "python/__init__.pyi": package_stub(families)}
