"""The C arguments of one call: each as its text and as the value that ctypes passes."""
import ctypes as ct

import numpy as np

import choice
import door_python_model
import registry
import roles
from c_text import C_NAME, DATA_TYPE, ELEMENT, FLOATS, SCALAR, Pair, listed, literal, number, size

IMAGES = ("image_in", "image_out", "image_inout", "array_in", "array_out", "array_inout", "planes_in", "planes_out")


def enumerated(enum, value):
    """(C text, number) of a word, of words joined by |, or of a number."""
    table = door_python_model.ENUMS[enum]
    if isinstance(value, str):
        words = {door_python_model.enum_word(enum, n): n for n in table} | {n: n for n in table}
        names = [words[w.strip()] for w in value.split("|")]
        return " | ".join(names), sum(table[n] for n in names)
    return next((n for n, v in table.items() if v == value), str(value)), int(value)


class Arguments:
    def __init__(self, model, member, given, first, out):
        self.model, self.member, self.given, self.first, self.out = model, member, given, first, out
        self.plan = choice.plan_of(given)
        self.channels = registry.processed(member.source_layout)
        self.results, self.lists = [], []
        self.second_out = self.image = None             # the image whose step comes next

    def pair(self, a):
        """(text, value) of an argument."""
        if a.kind in IMAGES and a.name not in ("weights", "locations"):
            return self.image_pair(a)
        makers = {"mask": self.mask, "step": self.step, "region": self.region, "result": self.result,
                  "buffer": self.work_memory, "size_of": self.size_of, "size": self.size, "point": self.point,
                  "rows": self.before, "columns": self.before, "enum": self.enum, "flags": self.enum,
                  "value": self.value, "scalar": self.scalar, "kernel": self.kernel, "array_in": self.vector,
                  "rows_in": self.rows, "plan_in": self.plan_in, "lists_in": self.lists_in,
                  "lists_out": self.lists_out, "count": self.count, "bits": self.bits}
        if a.kind not in makers:
            raise choice.NoMember(f"{self.member.name}: no way to give {a.c_name}, a {a.kind}")
        return makers[a.kind](a)

    # --- images -----------------------------------------------------------------------------------------------------

    def image_pair(self, a):
        if a.kind.endswith(("_out", "_inout")):
            self.image = self.out
            if a.name == "max" and self.member.operation.extent == "blocks":
                self.image = self.second_out = self.model.make(self.out.shape, self.out.dtype)
        else:
            self.image = self.given.get(a.name, self.first)
        if a.kind.startswith("planes"):
            return self.planes(a, self.image)
        array, start = self.image, 0
        if a.name in ("src", "a") and not a.kind.endswith("_out"):
            row, column = choice.reach_of(self.member, self.given)[0]
            start = row * array.strides[0] + (column * array.strides[1] if array.ndim > 1 else 0)
        if "channel" in self.given and array.ndim == 3:
            start += self.given["channel"] * array.itemsize
        name, offset = self.model.name_of(array, a.name)
        return self.moved(name, (offset + start) // array.itemsize), ct.c_void_p(array.ctypes.data + start)

    @staticmethod
    def moved(name, elements):
        return f"{name} + {elements}" if elements > 0 else f"{name} - {-elements}" if elements < 0 else name

    def planes(self, a, array):
        name, _ = self.model.name_of(array, a.name)
        height, width, count = array.shape
        pointers = (ct.c_void_p * count)(*[array[..., c].ctypes.data for c in range(count)])
        kind = f"const {a.element}* const" if a.const else f"{a.element}*"
        return listed(kind, [self.moved(name, c * height * width) for c in range(count)]), pointers

    def mask(self, a):
        self.image = self.given[a.name]
        name, offset = self.model.name_of(self.image, a.name)
        return self.moved(name, offset), ct.c_void_p(self.image.ctypes.data)

    def step(self, a):
        return number(self.image.strides[0])

    def region_shape(self):
        """Rows and columns of what is computed: the destination's, or the source's where it is only read."""
        operation, writes = self.member.operation, any(a.kind in IMAGES and not a.kind.endswith("_in")
                                                       for a in self.member.arguments)
        if not writes or operation.extent in ("axis", "blocks", "levels", "windows"):
            array = self.first
        elif self.out is self.first and operation.reach:
            return choice.result_shape(self.member, self.given, self.first, operation.extent)
        else:
            array = self.out
        return array.shape[:2] if array.ndim > 1 else (1, array.shape[0])

    def region(self, a):
        return size(self.region_shape())

    def size_of(self, a):
        return size({"src": self.first, "dst": self.out}.get(a.detail, self.given.get(a.detail)).shape)

    # --- plain values -----------------------------------------------------------------------------------------------

    def size(self, a):
        return size(self.given[a.name])

    def point(self, a):
        row, column = self.given.get(a.name, (0, 0))
        if a.name == "anchor" and a.name not in self.given:
            row, column = (choice.centre(side) for side in choice.window_of(self.given))
        return f"(QorPoint2D){{{column}, {row}}}", Pair(column, row)

    def before(self, a):
        return number(self.given.get("before", (0, 0))[0 if a.kind == "rows" else 1])

    def enum(self, a):
        value = self.given.get(a.name, a.default)
        return enumerated(a.detail, 0 if value == "0" else value)

    def scalar(self, a):
        value = self.given.get(a.name, a.default)
        if value is None:
            value = choice.centre(self.given["size"])
        value = float(value) if a.element in FLOATS else int(value)
        return literal(value, a.element), SCALAR[a.element](value)

    def value(self, a):
        """A constant: one element a channel that is processed."""
        value = self.given.get(a.name, a.default)
        count = a.length or (registry.processed(self.member.target_layout) if a.stars else 1)
        items = list(value) if isinstance(value, (list, tuple, np.ndarray)) else [value] * count
        if a.element not in SCALAR:
            raise choice.NoMember(f"{self.member.name}: constants of {a.element} have no text")
        items = [float(v) if a.element in FLOATS else int(v) for v in items]
        packed, texts = (SCALAR[a.element] * count)(*items), [literal(v, a.element) for v in items]
        return (listed(f"const {a.element}", texts), packed) if a.stars else (texts[0], packed[0])

    def result(self, a):
        name = self.model.unique(a.name)
        holder = (SCALAR[a.element] * (a.length or 1))()
        self.model.names[name] = holder
        self.results.append((a, name))
        self.model.lines.append(f"{a.element} {name}{f'[{a.length}]' if a.length else ''};")
        return (name if a.length else "&" + name), holder

    def plan_in(self, a):
        return self.plan.name, ct.c_void_p(self.plan.memory.ctypes.data)

    # --- vectors and lists ------------------------------------------------------------------------------------------

    def kernel(self, a):
        name, _ = self.model.name_of(self.given[a.name], a.name)
        return name, ct.c_void_p(self.given[a.name].ctypes.data)

    def vector(self, a):
        if a.name != "locations":
            return self.kernel(a)
        points = np.array([(column, row) for row, column in self.given.get("locations", [(0, 0)])], np.int32)
        self.model.keep.append(points)
        return listed("const QorPoint2D", [f"{{{x}, {y}}}" for x, y in points]), ct.c_void_p(points.ctypes.data)

    def rows(self, a):
        name, _ = self.model.name_of(self.first, a.name)
        pointers = (ct.c_void_p * len(self.first))(*[row.ctypes.data for row in self.first])
        texts = [self.moved(name, r * self.first.shape[1]) for r in range(len(self.first))]
        return listed(f"const {a.element}*", texts), pointers

    def level_counts(self):
        """Levels of each channel: given as a number, as one list or as a list a channel; or those of the plan."""
        levels = self.plan.facts["levels"] if self.plan else self.given["levels"]
        if isinstance(levels, int):
            return [levels] * self.channels
        if any(a.kind == "lists_out" and a.name == "levels" for a in self.member.arguments):
            return list(levels)
        return [len(levels)] * self.channels if np.ndim(levels[0]) == 0 else [len(row) for row in levels]

    def count(self, a):
        if a.detail in ("src", "dst"):
            return number(self.first.shape[0 if a.detail == "src" else 1])
        if a.detail == "locations":
            return number(len(self.given.get("locations", [(0, 0)])))
        counts = self.level_counts()
        if not a.stars:
            return number(counts[0])
        return listed("const int32_t", map(str, counts)), (ct.c_int32 * len(counts))(*counts)

    def bits(self, a):
        table = self.given["table"]
        return number(int(np.log2(len(table) if np.ndim(table[0]) == 0 else len(table[0]))))

    def lists_in(self, a):
        value, several = self.given[a.name], a.stars > 1 or a.length > 1
        rows = value if several and np.ndim(value[0]) else [value] * (self.channels if several else 1)
        rows = [np.ascontiguousarray(row, ELEMENT[a.element]) for row in rows]
        self.model.keep += rows
        names = [self.model.named_list(a.name, row) for row in rows]
        if not several:
            return names[0], ct.c_void_p(rows[0].ctypes.data)
        return listed(f"const {a.element}*", names), (ct.c_void_p * len(rows))(*[r.ctypes.data for r in rows])

    def lists_out(self, a):
        rows = [np.zeros(n - (a.name == "hist"), ELEMENT[a.element]) for n in self.level_counts()]
        names = []
        for row in rows:
            names.append(self.model.unique(a.name))
            self.model.names[names[-1]] = row
            self.model.lines.append(f"{a.element} {names[-1]}[{len(row)}];")
        self.lists.append(rows[0] if self.channels == 1 else rows)
        if a.stars < 2:
            return names[0], ct.c_void_p(rows[0].ctypes.data)
        return listed(f"{a.element}*", names), (ct.c_void_p * len(rows))(*[r.ctypes.data for r in rows])

    # --- work memory ------------------------------------------------------------------------------------------------

    def work_memory(self, a):
        query = self.model.members[roles.buffer_query(self.member)]
        holders = {b.detail: (ct.c_int32 * 1)() for b in query.arguments if b.kind == "bytes"}
        self.model.declare_bytes([what + "Bytes" for what in holders])
        self.model.call(query, [(f"&{b.detail}Bytes", holders[b.detail]) if b.kind == "bytes" else self.asked(b)
                                for b in query.arguments])
        pair, _ = self.model.allocate("uint8_t", "buffer", "bufferBytes", holders["buffer"][0], " + 1")
        return pair

    def asked(self, b):
        """An argument of the query: of the call, or of its plan."""
        facts = self.plan.facts if self.plan else {}
        if b.kind == "region" or (b.kind == "size_of" and b.detail == "dst"):
            return size(self.region_shape())
        if b.kind == "columns":
            return number(self.region_shape()[1])
        if b.kind == "channels":
            return number(self.channels if self.first.ndim > 2 else 1)
        if b.kind == "data_type":
            name = DATA_TYPE[C_NAME[self.first.dtype] if b.detail == "src" else facts["kernel"]]
            return name, door_python_model.ENUMS["QorDataType"][name]
        if "size" in facts and b.kind in ("size", "size_of"):
            return size(facts["size"])
        if b.kind == "scalar":
            return number(facts[b.name])
        return self.pair(b)
