"""The Python door: the tables that python/src includes, and the check that nothing is left out.

A program says where each C argument of a member comes from; a trampoline calls what has one erased signature.
"""
import re

from door_python_model import (ELEMENTS, ENUMS, OUT, OUT2, MASK, PLAN_TYPES, SRC, SRC2, doc, elements_of, enum_word, functions,
                               key_of, public)
from door_python_stubs import package_stub, stub
from registry import ROOT, RegistryError, all_members, processed
import roles

ERASED = {"int64_t": "l", "QorImageSize": "l", "QorPoint2D": "l", "QorComplex32s": "l", "float": "f", "double": "d",
          "QorComplex32f": "c"}
# The plans' types, and which of a plan's variants each operation takes (python/src/plans.h).
PLANS = {"ResizeNearest": "NEAREST", "ResizeLinear": "LINEAR", "ResizeCubic": "CUBIC", "ResizeLanczos": "LANCZOS",
         "ResizeSuper": "SUPER", "ResizeAntialiasing": "ANTIALIAS", "WarpAffineNearest": "NEAREST",
         "WarpAffineLinear": "LINEAR", "WarpAffineCubic": "CUBIC", "DCTFwd": "ANY", "DCTInv": "ANY", "Histogram": "ANY",
         "FilterBorder": "ANY", "ThresholdAdaptiveGauss": "ANY", "HOG": "ANY", "DFTFwd_RToPack": "REAL",
         "DFTInv_PackToR": "REAL", "DFTFwd_CToC": "COMPLEX", "DFTInv_CToC": "COMPLEX", "FFTFwd_RToPack": "REAL",
         "FFTInv_PackToR": "REAL", "FFTFwd_CToC": "COMPLEX", "FFTInv_CToC": "COMPLEX"}
# How the bytes of work memory are asked for, by the query's arguments.
QUERIES = {("region", "size", "data_type", "channels", "bytes"): "WINDOW",
           ("size_of", "size_of", "flags", "bytes"): "CORRELATION", ("size_of", "columns", "bytes"): "KERNEL_ROW",
           ("plan_in", "bytes"): "PLAN", ("plan_in", "size_of", "channels", "bytes"): "PLAN_TILE_CHANNELS",
           ("plan_in", "size_of", "bytes"): "PLAN_TILE", ("plan_in", "region", "bytes"): "PLAN_TILE",
           ("data_type", "region", "count", "channels", "scalar", "bytes", "bytes"): "PLAN_KNOWN",
           ("size_of", "region", "data_type", "data_type", "channels", "bytes", "bytes"): "FILTER_BORDER",
           ("region", "size", "data_type", "channels", "bytes", "bytes"): "ADAPTIVE"}


def erased(member):
    return "".join("p" if a.stars else ERASED.get(a.element, "i") for a in member.arguments)


def element(c_type, member):
    if c_type not in ELEMENTS:
        raise RegistryError(f"{member.name}: the Python door knows no elements {c_type}")
    return ELEMENTS.index(c_type)


def instruction(argument, before, member, function, results):
    """(operation, a, b, c) of python/src/core.h for one C argument."""
    kind = argument.kind
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
