"""What a call of the Python package is in C: chooses the member and writes out every call, plans and buffers too.

The pages show the C text of their examples from here, and the tests compile it: its results are those of the package.
"""
import ctypes as ct
import re

import numpy as np

import door_python
import registry

ELEMENT = {"uint8_t": np.uint8, "int8_t": np.int8, "uint16_t": np.uint16, "int16_t": np.int16, "uint32_t": np.uint32,
           "int32_t": np.int32, "int64_t": np.int64, "float": np.float32, "double": np.float64,
           "QorComplex16s": np.dtype([("re", "i2"), ("im", "i2")]), "QorComplex32s": np.dtype([("re", "i4"), ("im", "i4")]),
           "QorComplex32f": np.complex64}
ELEMENT = {name: np.dtype(d) for name, d in ELEMENT.items()}
C_NAME = {d: name for name, d in ELEMENT.items()}
TYPE_CODE = {"uint8_t": "8u", "uint16_t": "16u", "int16_t": "16s", "float": "32f", "double": "64f", "int32_t": "32s",
             "QorComplex32f": "32fc"}
DATA_TYPE = {"uint8_t": "qor8u", "uint16_t": "qor16u", "int16_t": "qor16s", "float": "qor32f", "double": "qor64f"}
SCALAR = {"uint8_t": ct.c_uint8, "int8_t": ct.c_int8, "uint16_t": ct.c_uint16, "int16_t": ct.c_int16, "uint32_t": ct.c_uint32,
          "int32_t": ct.c_int32, "int64_t": ct.c_int64, "float": ct.c_float, "double": ct.c_double}
IMAGES = ("image_in", "image_out", "image_inout", "array_in", "array_out", "array_inout", "planes_in", "planes_out")


class Pair(ct.Structure):
    _fields_ = [("a", ct.c_int32), ("b", ct.c_int32)]


class NoMember(Exception):
    pass


class Status(Exception):
    pass


class Plan:
    """A prepared plan: its memory, what operations need to know of it, and how its buffer is asked for."""

    def __init__(self, block, c_operation, shape, **facts):
        self.block, self.c_operation, self.shape, self.facts = block, c_operation, shape, facts


def literal(value, element="float"):
    """A number in C; complex elements are braces."""
    if isinstance(value, (complex, np.complexfloating)):
        return f"{{{literal(value.real)}, {literal(value.imag)}}}"
    if isinstance(value, np.void):
        return f"{{{value['re']}, {value['im']}}}"
    if element in ("float", "double") and not isinstance(value, str):
        number = float(value)
        if np.isinf(number) or np.isnan(number):
            return "NAN" if np.isnan(number) else "-INFINITY" if number < 0 else "INFINITY"
        text = repr(float(np.float32(number))) if element == "float" else repr(number)
        if element == "float":
            text = np.format_float_positional(np.float32(number), unique=True, trim="0") if 1e-5 < abs(number) < 1e9 else text
        text = text if re.search(r"[.e]", text) else text + ".0"
        return text + ("f" if element == "float" else "")
    return str(int(value))


def block(array, element):
    """An initialiser: rows on lines of their own."""
    rows = np.ascontiguousarray(array).reshape(array.shape[0], -1) if array.ndim > 1 else array.reshape(1, -1)
    lines = [", ".join(literal(v, element) for v in row) for row in rows]
    return "{" + ",\n".join("    " * bool(i) + line for i, line in enumerate(lines)) + "}"


def pixel_class(array, keep_alpha=False, channel=False):
    """The class of a picture's pixels as the forms have it."""
    channels = 1 if array.ndim < 3 else array.shape[2]
    code = channels | (door_python.ALPHA if keep_alpha else 0) | (door_python.CHANNEL if channel and channels > 1 else 0)
    planar = array.ndim == 3 and channels > 1 and array.strides[2] != array.itemsize
    return code | (door_python.PLANAR if planar else 0)


def centre(length):
    return (length - 1) // 2


def reach_of(member, given):
    """(before, after) of what is read around a pixel: rows and columns, without the sides of a border."""
    rule = member.operation.reach
    if rule in ("window", "kernel", "structure"):
        array = given.get("kernel", given.get("structure"))
        height, width = given["size"] if array is None else array.shape
        row, column = given["anchor"] if given.get("anchor") is not None else (centre(height), centre(width))
        before, after = (row, column), (height - 1 - row, width - 1 - column)
        return (after, before) if rule == "kernel" else (before, after)
    if rule == "fixed":
        columns, rows = divmod(int(re.search(r"\d+x\d+", str(given["mask"]))[0].replace("x", "")), 10)
        return ((rows // 2, columns // 2),) * 2
    if rule in ("1", "2") and not any(a.name == "border" for a in member.arguments):
        return ((int(rule),) * 2,) * 2
    if rule in ("row", "column"):
        anchor = given["anchor"] if given.get("anchor") is not None else centre(given["size"])
        place = [anchor, given["size"] - 1 - anchor]
        return ((0, place[0]), (0, place[1])) if rule == "row" else ((place[0], 0), (place[1], 0))
    return ((0, 0), (0, 0))


class Model:
    """Attributes are the functions of the package. `lines` collects the C text, `names` the C names of arrays."""

    def __init__(self, library):
        self.library = ct.CDLL(str(library)) if library else None
        families = registry.load(registry.ROOT / "api")
        self.members = {m.name: m for m in registry.all_members(families)}
        self.functions = {f.name: f for f in door_python.functions(families)}
        self.restart()

    def restart(self, names=None):
        self.lines, self.names, self.keep, self.statuses = [], dict(names or {}), [], []
        self.fresh, self.freed = {}, []

    def __getattr__(self, name):
        import plans
        if name in plans.MAKERS:
            return lambda *args, **kwargs: plans.MAKERS[name](self, *args, **kwargs)
        if name.startswith("_") or name not in self.functions:
            raise AttributeError(name)
        return lambda *args, **kwargs: self.run(self.functions[name], args, kwargs)

    def name_of(self, array, fallback):
        for name, known in self.names.items():
            if known is array:
                return name, ""
        for name, known in self.names.items():
            if isinstance(known, np.ndarray) and known.base is not None and known.base is array.base and known.shape == array.shape:
                return name, ""
        for name, known in self.names.items():
            if isinstance(known, np.ndarray) and np.shares_memory(known, array):
                return name, array.ctypes.data - known.ctypes.data
        self.names[fallback] = array
        return fallback, ""

    # --- one call ---------------------------------------------------------------------------------------------------

    def run(self, function, args, kwargs):
        given = self.bind(function, args, kwargs)
        images = [given[n] for n in ("src", "a", "dst") if isinstance(given.get(n), np.ndarray)]
        first = images[0]
        member = self.choose(function, given, first)
        out = self.output(function, member, given, first)
        return self.emit(function, member, given, first, out)

    def bind(self, function, args, kwargs):
        names = list(dict.fromkeys(p.name for p in function.parameters))
        positional = list(dict.fromkeys(p.name for p in function.parameters[:function.positional]))
        given = dict(zip(positional, args)) | kwargs
        unknown = set(given) - set(names)
        if unknown or len(args) > len(positional):
            raise NoMember(f"{function.name} takes no {sorted(unknown)}")
        return {n: v for n, v in given.items() if v is not None}

    def choose(self, function, given, first):
        """The member whose elements, layouts and parameters are those of the call."""
        found = []
        keys = set(given) - {"keep_alpha", "channel", "dtype", "channels", "width"}
        out = given.get("out")
        for form in function.forms:
            main = form.member or form.twin
            in_place = out is not None and out is given.get("src", given.get("a")) and form.twin is not None
            member = form.twin if in_place else form.member
            if member is None:
                continue
            accepted = {n for n, _ in form.accepts} | {"dst"}
            required = {n for n, k in form.requires if k != "OUT"}
            if keys - accepted or required - keys:
                continue
            b = given.get("b")
            if b is not None and ("b", "IMAGE" if isinstance(b, np.ndarray) and b.ndim > 1 else "VALUE") not in form.accepts:
                continue
            source, target = (ELEMENT[e] for e in door_python.elements_of(main))
            if source != first.dtype or form.layouts[0] != pixel_class(first, given.get("keep_alpha"), "channel" in given):
                if not (door_python.reads(main) is False and form.layouts[1] == pixel_class(first, given.get("keep_alpha"))):
                    continue
            plan = next((v for v in given.values() if isinstance(v, Plan)), None)
            if plan is not None and main.c_operation not in plan.c_operation:
                continue
            if "kernel" in given and not self.kernel_fits(main, given["kernel"]):
                continue
            wanted = out.dtype if out is not None else given.get("dtype")
            if wanted is not None and np.dtype(wanted) != target:
                continue
            if out is not None and out.ndim > 1 and (form.layouts[1] ^ pixel_class(out)) & (7 | door_python.PLANAR):
                continue
            if ("channel" in given) != bool((form.layouts[0] | form.layouts[1]) & door_python.CHANNEL) or \
                    (out is None and "dst" not in given and form.layouts[1] & (door_python.CHANNEL | door_python.ALPHA)):
                continue
            rank = (wanted is None and target != first.dtype, form.layouts[0] != form.layouts[1], len(form.accepts))
            found.append((rank, len(found), member))
        if not found:
            raise NoMember(f"{function.name}: no form for {sorted(keys)} of {first.dtype} {first.shape}")
        return min(found)[2]

    @staticmethod
    def kernel_fits(member, kernel):
        wanted = {a.element for a in member.arguments if a.kind == "kernel"}
        return not wanted or ELEMENT[wanted.pop()] == kernel.dtype

    def output(self, function, member, given, first):
        targets = [a for a in member.arguments if a.kind in ("image_out", "array_out", "planes_out")]
        if any(a.kind.endswith("_inout") for a in member.arguments) or not targets:
            return given.get("dst", first) if member.operation.snake == "fill" or not targets else first
        if "out" in given:
            return given["out"]
        if "dst" in given:
            return given["dst"]
        shape = self.shape(member, given, first)
        channels = registry.channels(member.target_layout)
        if "24u" in member.types:
            channels = 3
        if channels > 1 and member.operation.extent not in ("8x8", "2x2", "4x4", "windows"):
            shape = shape + (channels,)
        out = np.zeros(shape, ELEMENT[targets[0].element])
        self.fresh[id(out)] = out
        return out

    def shape(self, member, given, first):
        height, width = first.shape[:2] if first.ndim > 1 else (1, first.shape[0])
        pattern = given["pattern"].shape[:2] if "pattern" in given else None
        extent = member.operation.extent
        if extent == "algorithm":
            extent = {0: "full", 1: "valid", 2: "same"}[int(self.enumerated("QorCorrelation", given["algorithm"])[1]) >> 16]
        if extent == "full":
            return height + pattern[0] - 1, width + pattern[1] - 1
        if extent == "valid":
            return height - pattern[0] + 1, width - pattern[1] + 1
        if extent in ("8x8", "2x2", "4x4"):
            return (int(extent[0]),) * 2
        if extent == "plan":
            plan = next(v for v in given.values() if isinstance(v, Plan))
            return plan.shape
        if extent == "axis" and "diagonal" in str(given["axis"]):
            return width, height
        if extent == "frame":
            (top, left), (bottom, right) = given.get("before", (0, 0)), given.get("after", (0, 0))
            return height + top + bottom, width + left + right
        if extent == "bits":
            return height, given["width"]
        if extent == "blocks":
            rows, columns = given["block"]
            return -(-height // rows), -(-width // columns)
        if extent == "windows":
            plan = next(v for v in given.values() if isinstance(v, Plan))
            return len(given.get("locations", [(0, 0)])), plan.facts["length"]
        if member.operation.c_name.startswith("DotProdCol"):
            return (width,)
        (top, left), (bottom, right) = reach_of(member, given)
        return height - top - bottom, width - left - right

    # --- arguments --------------------------------------------------------------------------------------------------

    def enumerated(self, enum, value):
        """(C text, number) of a word, words joined by |, or a number."""
        table = door_python.ENUMS[enum]
        if isinstance(value, str):
            words = {door_python.enum_word(enum, n): n for n in table} | {n: n for n in table}
            names = [words[w.strip()] for w in value.split("|")]
            return " | ".join(names), sum(table[n] for n in names)
        return next((n for n, v in table.items() if v == value), str(value)), int(value)

    def emit(self, function, member, given, first, out):
        member_reach = reach_of(member, given)
        height, width = self.region(member, given, first, out)
        texts, values, results, previous = [], [], [], None
        for a in member.arguments:
            text, value = None, None
            if a.kind in IMAGES and a.name not in ("weights", "locations"):
                previous = {"b": given.get("b"), "pattern": given.get("pattern")}.get(a.name)
                if a.kind.endswith("_out") or a.kind.endswith("_inout"):
                    previous = out
                    if a.name == "max" and member.operation.extent == "blocks":
                        previous = np.zeros_like(out)
                elif previous is None:
                    previous = first
                public = "dst" if a.kind.endswith("_out") and a.name in ("dst", "out") else a.name
                text, value = self.image(a, previous, public, member, member_reach, given)
            elif a.kind == "mask":
                previous = given["mask"]
                text, value = self.image(a, previous, "mask", member, ((0, 0), (0, 0)), given)
            elif a.kind == "step":
                step = previous.strides[0]
                text, value = str(step), step
            elif a.kind == "region":
                text, value = f"(QorImageSize){{{width}, {height}}}", Pair(width, height)
            elif a.kind == "result":
                name = self.unique(a.name)
                length = a.length or 1
                holder = (SCALAR[a.element] * length)() if a.element in SCALAR else None
                self.lines.append(f"{a.element} {name}{f'[{length}]' if a.length else ''};")
                results.append((name, holder, a))
                text, value = (name if a.length else "&" + name), holder
            elif a.kind == "buffer":
                text, value = self.work_memory(member, given, (height, width), first)
            else:
                text, value = self.plain(a, member, given, first, out)
            texts.append(text)
            values.append(value)
        self.call(member, texts, values)
        return self.returned(member, out, results)

    def returned(self, member, out, results):
        for name, holder, a in results:
            self.names[name] = holder
        if results:
            found = [h[0] if not a.length else tuple(h) for _, h, a in results]
            images = [self.last_max] if member.operation.extent == "blocks" else []
            if images:
                return (out, images[0], *found)
            if member.operation.snake in ("min_index", "max_index") and len(found) == 3:
                return found[0], (found[2], found[1]) if not isinstance(found[1], tuple) else tuple(zip(found[2], found[1]))
            return found[0] if len(found) == 1 else tuple(found)
        if any(a.kind == "lists_out" for a in member.arguments):
            return self.last_lists
        return out

    def unique(self, name):
        candidate, number = name, 2
        while candidate in self.names:
            candidate, number = f"{name}{number}", number + 1
        self.names[candidate] = None
        return candidate

    def image(self, a, array, public, member, reach, given):
        if a.name == "max":
            self.last_max = array
            self.fresh[id(array)] = array
        name, offset = self.name_of(array, public if public not in self.names else self.unique(public))
        element = C_NAME.get(array.dtype)
        parts = []
        if a.kind.startswith("planes"):
            planes = [array[..., c] for c in range(array.shape[2])]
            width = array.shape[1] * array.shape[0]
            text = ", ".join(f"{name} + {c * width}" if c else name for c in range(array.shape[2]))
            const = "const " if a.const else ""
            pointers = (ct.c_void_p * len(planes))(*[p.ctypes.data for p in planes])
            return f"({const}{element}*{' const' if a.const else ''}[]){{{text}}}", pointers
        bytes_in = 0
        if a.kind in ("image_in", "image_inout") and a.name in ("src", "a") and any(map(any, reach)):
            bytes_in = reach[0][0] * array.strides[0] + reach[0][1] * array.strides[1]
        if given.get("offset") is not None and a.kind == "image_out":
            pass
        if "channel" in given and array.ndim == 3 and a.kind != "mask":
            bytes_in += given["channel"] * array.itemsize
        items = (offset or 0) // array.itemsize + bytes_in // array.itemsize
        text = f"{name} + {items}" if items > 0 else f"{name} - {-items}" if items else name
        return text, ct.c_void_p(array.ctypes.data + bytes_in)

    def plain(self, a, member, given, first, out):
        value = given.get(a.name)
        if value is None and a.default is not None:
            value = a.default
        if a.kind == "size_of":
            array = {"src": first, "dst": out, "pattern": given.get("pattern"), "kernel": given.get("kernel"),
                     "structure": given.get("structure")}[a.detail]
            return f"(QorImageSize){{{array.shape[1]}, {array.shape[0]}}}", Pair(array.shape[1], array.shape[0])
        if a.kind in ("size", "point"):
            if value is None:
                shape = given.get("kernel", given.get("structure"))
                shape = given.get("size") if shape is None else shape.shape
                value = centre(shape[0]), centre(shape[1])
            if isinstance(value, str):
                value = (0, 0)
            kind = "QorImageSize" if a.kind == "size" else "QorPoint2D"
            return f"({kind}){{{value[1]}, {value[0]}}}", Pair(value[1], value[0])
        if a.kind in ("rows", "columns"):
            number = given.get("before", (0, 0))[0 if a.kind == "rows" else 1]
            return str(number), number
        if a.kind in ("enum", "flags"):
            return self.enumerated(a.detail, value if value != "0" else 0)
        if a.kind == "value":
            return self.constant(a, value, member)
        if a.kind == "scalar":
            if value is None:
                value = centre(given["size"])
            number = float(value) if a.element in ("float", "double") else int(float(value))
            return literal(number, a.element), SCALAR[a.element](number)
        if a.kind in ("kernel", "array_in"):
            array = np.ascontiguousarray(value if a.name != "locations" else [(c, r) for r, c in given.get("locations", [(0, 0)])],
                                         None if a.name != "locations" else np.int32)
            self.keep.append(array)
            if a.name == "locations":
                text = ", ".join(f"{{{c}, {r}}}" for c, r in array)
                return f"(const QorPoint2D[]){{{text}}}", ct.c_void_p(array.ctypes.data)
            name, _ = self.name_of(value, a.name)
            return name, ct.c_void_p(array.ctypes.data)
        if a.kind == "rows_in":
            pointers = (ct.c_void_p * first.shape[0])(*[first[r].ctypes.data for r in range(first.shape[0])])
            name, _ = self.name_of(first, "src")
            text = ", ".join(f"{name} + {r * first.shape[1]}" if r else name for r in range(first.shape[0]))
            return f"(const {a.element}*[]){{{text}}}", pointers
        if a.kind == "plan_in":
            plan = next(v for v in given.values() if isinstance(v, Plan))
            return plan.facts.get("name", "plan"), ct.c_void_p(plan.block.ctypes.data)
        if a.kind in ("lists_in", "lists_out", "count", "bits"):
            return self.lists(a, member, given, first)
        raise NoMember(f"{member.name}: no way to give {a.c_name}, a {a.kind}")

    def constant(self, a, value, member):
        count = a.length or (registry.processed(member.target_layout) if a.stars else 1)
        items = list(value) if isinstance(value, (list, tuple, np.ndarray)) else [value] * count
        if a.element in SCALAR:
            items = [float(v) if a.element in ("float", "double") else int(float(v)) for v in items]
            packed = (SCALAR[a.element] * count)(*items)
        else:
            packed = np.array([tuple(v) if isinstance(v, (tuple, list)) else (v.real, v.imag) for v in items],
                              [("re", ELEMENT[a.element][0] if a.element != "QorComplex32f" else "f4"),
                               ("im", ELEMENT[a.element][0] if a.element != "QorComplex32f" else "f4")]).tobytes()
            packed = ct.create_string_buffer(packed, len(packed))
        texts = [literal(v, a.element) for v in items]
        if a.stars:
            return f"(const {a.element}[]){{{', '.join(texts)}}}", packed
        return texts[0], packed[0]

    def lists(self, a, member, given, first):
        """Levels, values, tables and histograms: one list, or one a channel."""
        channels = registry.processed(member.source_layout)
        if a.kind == "count":
            if a.detail == "src":
                return str(first.shape[0]), first.shape[0]
            if a.detail == "dst":
                return str(first.shape[1]), first.shape[1]
            if a.detail == "locations":
                number = len(given.get("locations", [(0, 0)]))
                return str(number), number
            levels = given["levels"]
            counted = any(b.kind == "lists_out" and b.name == "levels" for b in member.arguments)
            counts = [levels] * channels if isinstance(levels, int) else list(levels) if counted else \
                [len(levels)] * channels if np.ndim(levels[0]) == 0 else [len(l) for l in levels]
            if a.stars:
                return f"(const int32_t[]){{{', '.join(map(str, counts))}}}", (ct.c_int32 * channels)(*counts)
            return str(counts[0]), counts[0]
        if a.kind == "bits":
            table = given["table"]
            number = int(np.log2(len(table) if np.ndim(table[0]) == 0 else len(table[0])))
            return str(number), number
        if a.kind == "lists_out":
            return self.lists_out(a, member, given, channels)
        value = given[a.name]
        many = a.stars > 1 or a.length > 1
        rows = [np.ascontiguousarray(v, ELEMENT[a.element]) for v in (value if many and np.ndim(value[0]) else [value] * channels)]
        self.keep += rows
        names = []
        if many:
            for row in rows:
                known = next((n for n, k in self.names.items() if isinstance(k, np.ndarray) and k is row), None)
                names.append(known or self.named(a.name, row))
            pointers = (ct.c_void_p * len(rows))(*[r.ctypes.data for r in rows])
            return f"(const {a.element}*[]){{{', '.join(names)}}}", pointers
        return self.named(a.name, rows[0]), ct.c_void_p(rows[0].ctypes.data)

    def named(self, name, array):
        for known, other in self.names.items():
            if isinstance(other, np.ndarray) and other.dtype == array.dtype and other.shape == array.shape and \
                    np.array_equal(other, array) and known.startswith(name):
                return known
        name = self.unique(name)
        self.names[name] = array
        return name

    def lists_out(self, a, member, given, channels):
        if a.name == "hist":
            plan = next((v for v in given.values() if isinstance(v, Plan)), None)
            levels = plan.facts["levels"] if plan else given["levels"]
            counts = [levels] * channels if isinstance(levels, int) else \
                [len(levels)] * channels if np.ndim(levels) == 1 and not isinstance(levels[0], tuple) else [len(l) for l in levels]
            lengths = [n - 1 for n in counts]
        else:
            levels = given["levels"]
            lengths = [levels] * channels if isinstance(levels, int) else list(levels)
        rows = [np.zeros(n, ELEMENT[a.element]) for n in lengths]
        single = a.stars < 2 and not a.length
        names = []
        for row in rows:
            name = self.unique(a.name)
            self.names[name] = row
            self.lines.append(f"{a.element} {name}[{len(row)}];")
            names.append(name)
        if a.name == "hist":
            self.last_lists = rows[0] if channels == 1 else rows
        else:
            self.last_lists = self.last_lists, rows[0] if channels == 1 else rows
        if single or a.stars < 2:
            return names[0], ct.c_void_p(rows[0].ctypes.data)
        pointers = (ct.c_void_p * len(rows))(*[r.ctypes.data for r in rows])
        self.keep += rows
        return f"({a.element}*[]){{{', '.join(names)}}}", pointers

    def region(self, member, given, first, out):
        operation = member.operation
        if operation.extent == "axis" or not any(a.kind.endswith(("_out", "_inout")) for a in member.arguments) or \
                operation.extent in ("blocks", "levels", "windows"):
            return first.shape[:2] if first.ndim > 1 else (1, first.shape[0])
        if out is first and operation.reach:
            return self.shape(member, given, first)
        return out.shape[:2] if out.ndim > 1 else (1, out.shape[0])

    # --- work memory ------------------------------------------------------------------------------------------------

    def work_memory(self, member, given, region, first):
        query = self.members[door_python.roles.buffer_query(member)]
        plan = next((v for v in given.values() if isinstance(v, Plan)), None)
        texts, values = [], []
        bytes_ = (ct.c_int32 * 1)()
        channels = registry.processed(member.source_layout) if first.ndim > 2 else 1
        element = C_NAME[first.dtype]
        for a in query.arguments:
            if a.kind == "bytes":
                text, value = ("&bufferBytes", bytes_) if a.detail == "buffer" else ("&planBytes", (ct.c_int32 * 1)())
            elif a.kind == "region" or (a.kind == "size_of" and a.detail == "dst"):
                text, value = f"(QorImageSize){{{region[1]}, {region[0]}}}", Pair(region[1], region[0])
            elif a.kind == "data_type":
                kernel = plan.facts.get("kernel") if plan else None
                name = DATA_TYPE[element if a.detail == "src" else kernel]
                text, value = name, door_python.ENUMS["QorDataType"][name]
            elif a.kind == "channels":
                text, value = str(channels), channels
            elif a.kind == "plan_in":
                text, value = plan.facts.get("name", "plan"), ct.c_void_p(plan.block.ctypes.data)
            elif a.kind == "columns":
                text, value = str(region[1]), region[1]
            elif a.kind == "size" and plan is not None:
                size = plan.facts["size"]
                text, value = f"(QorImageSize){{{size[1]}, {size[0]}}}", Pair(size[1], size[0])
            elif a.kind == "size_of" and plan is not None and a.detail == "kernel":
                size = plan.facts["size"]
                text, value = f"(QorImageSize){{{size[1]}, {size[0]}}}", Pair(size[1], size[0])
            elif a.kind == "count" and plan is not None:
                levels = plan.facts["levels"]
                counts = [levels] * channels if isinstance(levels, int) else [len(levels)] * channels
                text, value = f"(const int32_t[]){{{', '.join(map(str, counts))}}}", (ct.c_int32 * channels)(*counts)
            elif a.kind == "scalar" and plan is not None:
                text, value = str(plan.facts.get(a.name, 0)), plan.facts.get(a.name, 0)
            else:
                text, value = self.plain(a, query, given, first, None)
            texts.append(text)
            values.append(value)
        if not any("bufferBytes" in line for line in self.lines):
            self.lines.append("int32_t bufferBytes;")
        if any(a.kind == "bytes" and a.detail == "plan" for a in query.arguments) and \
                not any("planBytes" in line for line in self.lines):
            self.lines.append("int32_t planBytes;")
        self.call(query, texts, values)
        memory = np.zeros(max(bytes_[0], 1) + 64, np.uint8)
        self.keep.append(memory)
        name = self.unique("buffer")
        self.names[name] = b"allocated"
        self.lines.append(f"uint8_t* {name} = malloc(bufferBytes + 1);")
        return name, ct.c_void_p(memory.ctypes.data)

    def call(self, member, texts, values):
        line = f"{member.name}("
        width, lines = 100, []
        for i, text in enumerate(texts):
            piece = text + (");" if i + 1 == len(texts) else ", ")
            if len(line + piece) > width and not line.endswith("("):
                lines.append(line.rstrip())
                line = "    "
            line += piece
        self.lines += lines + [line]
        if self.library is None:
            return 0
        call = getattr(self.library, member.name)
        call.restype = ct.c_int32
        converted = []
        for a, value in zip(member.arguments, values):
            if not a.stars and a.element in SCALAR and not isinstance(value, ct._SimpleCData):
                value = SCALAR[a.element](int(value) if a.element not in ("float", "double") else float(value))
            converted.append(value)
        status = call(*converted)
        self.statuses.append(status)
        if status < 0:
            raise Status(f"{member.name}: {status}")
        return status
