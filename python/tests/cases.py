"""A C member's arguments in both languages, laid out from the registry and apart from the package's own tables."""
import ctypes as ct
import re
from pathlib import Path

import numpy as np
import qori
import registry
from qori import _core

LIBRARY = ct.CDLL(str(Path(qori.__file__).parent / "libqorik5.so.8"))
MEMBERS = {m.name: m for m in registry.all_members(registry.load(registry.ROOT / "api"))}
OPERATIONS = {name: m for name, m in MEMBERS.items() if m.purpose == "operation"}
TYPES = {"uint8_t": "u1", "int8_t": "i1", "uint16_t": "u2", "int16_t": "i2", "uint32_t": "u4", "int32_t": "i4", "float": "f4",
         "double": "f8", "QorComplex16s": [("re", "i2"), ("im", "i2")], "QorComplex32s": [("re", "i4"), ("im", "i4")],
         "QorComplex32f": "c8"}
TYPES = {name: np.dtype(code) for name, code in TYPES.items()}


def structure(part, *names):
    return type("Structure", (ct.Structure,), {"_fields_": [(n, part) for n in names]})


Size, Point = structure(ct.c_int32, "width", "height"), structure(ct.c_int32, "x", "y")
SCALARS = {"uint8_t": ct.c_uint8, "int8_t": ct.c_int8, "uint16_t": ct.c_uint16, "int16_t": ct.c_int16, "uint32_t": ct.c_uint32,
           "int32_t": ct.c_int32, "float": ct.c_float, "double": ct.c_double,
           "QorComplex16s": structure(ct.c_int16, "re", "im"), "QorComplex32s": structure(ct.c_int32, "re", "im"),
           "QorComplex32f": structure(ct.c_float, "re", "im")}
# Arguments by public name: the word in Python and the number in C.
WORDS = {"rounding": ("half_away", 2), "hint": ("accurate", 2), "op": ("greater", 4), "axis": ("horizontal", 0),
         "border": ("replicate", 1), "flags": ("stream_store", 1), "algorithm": ("norm|valid", 0x10001)}
NUMBERS = {"scale": 1, "divisor": 3, "delta": 5.5, "value_above": 250, "value_below": 3, "bit_offset": 3, "alpha": 77, "mode": 1,
           "weight": 3, "shift": 3, "low": 5, "high": 200, "size": 7, "anchor": 2}
MASKS = {"filter_median_horiz": ("5x1", 51), "filter_median_vert": ("1x5", 15)}


def channels(layout):
    return int(re.search(r"\d", layout)[0])


def address(array):
    return array.__array_interface__["data"][0]


def picture(rng, shape, dtype):
    dtype = np.dtype(dtype)
    if dtype.names:
        image = np.empty(shape, dtype)
        for part in dtype.names:
            image[part] = rng.integers(-3000, 3000, shape)
        return image
    if dtype.kind == "c":
        return (rng.normal(0, 40, shape) + 1j * rng.normal(0, 40, shape)).astype(dtype)
    if dtype.kind == "f":
        return rng.uniform(0.1, 5, shape).astype(dtype)
    info = np.iinfo(dtype)
    return rng.integers(info.min, info.max, shape, dtype, endpoint=True)


class Case:
    """`python` are keywords of the function, `c` the arguments of the member; `made` pairs what each of them writes."""

    def __init__(self, member, seed=1):
        self.member, self.operation, self.rng = member, member.operation, np.random.default_rng(seed)
        self.height, self.width, self.margins = 11, 13, (0, 0, 0, 0)
        self.python, self.c, self.made, self.results, self.keep = {}, [], [], [], []
        self.layout, self.in_place = member.layout, "I" in member.kind
        self.names = {a.name for a in member.arguments}
        self.source, self.target = member.source, member.target
        if self.source == "void":
            self.source = self.target = next(a.element for a in member.arguments if a.stars)
        if self.operation.plan:
            self.make_plan()
        self.choose_margins()
        self.choose_extent()
        for argument in member.arguments:
            getattr(self, argument.kind)(argument)
        self.choose_forms()

    def choose_forms(self):
        code, images = self.layout, {a.kind for a in self.member.arguments}
        if self.member.target_layout == "AC4" or (code == "AC4" and not images & {"image_out", "image_inout"}):
            self.python["keep_alpha"] = True
        if self.has_channel("src") or self.has_channel("out"):
            self.python["channel"] = 1
        if "src" in self.python and self.operation.snake == "copy" and self.layout.endswith("AC4") and self.layout != "AC4":
            self.python["keep_alpha"] = True

    def has_channel(self, which):
        inserts = self.member.c_operation in ("Copy", "Set")
        return self.layout in ("C3C", "C4C") or (which == "src" and self.layout in ("C3C1", "C4C1")) or (
            which == "out" and self.layout in ("C1C3", "C1C4") and inserts)

    def make_plan(self):
        name, types, element = self.operation.plan, self.member.types, TYPES[self.source].name
        count = channels(self.layout)
        kind = re.sub(r"^(Resize|WarpAffine)", "", self.member.c_operation).lower()
        if name == "ResizePlan":
            wide = kind == "antialiasing"
            self.plan = qori.ResizePlan((11, 13), (7, 6), "linear" if wide else kind, element, antialias=wide)
            self.out_size = 7, 6
        elif name == "WarpAffinePlan":
            turn = [[1.1, 0.2, -1], [-0.3, 0.9, 2]]
            self.plan = qori.WarpAffinePlan((11, 13), (9, 12), turn, kind, element, count, border="replicate")
            self.out_size = 9, 12
        elif name in ("DftPlan", "FftPlan"):
            self.height, self.width = (11, 13) if name == "DftPlan" else (8, 16)
            kind = "uint8" if "32s" in types else "complex64" if types == "32fc" else "float32"
            self.plan = getattr(qori, name)((self.height, self.width), kind)
        elif name == "HogPlan":
            self.height = self.width = 24
            self.plan = qori.HogPlan((16, 16), cell=4, block=8, stride=4)
        else:
            kernel = self.rng.normal(0, 1, (3, 5)).astype("f4")
            make = {"DctPlan": lambda: qori.DctPlan((11, 13)),
                    "HistogramPlan": lambda: qori.HistogramPlan(9, element, count, lower=0, upper=200),
                    "LinearFilterPlan": lambda: qori.LinearFilterPlan(kernel, element, count),
                    "AdaptiveGaussPlan": lambda: qori.AdaptiveGaussPlan(5, sigma=1.0)}
            self.plan = make[name]()

    def choose_margins(self):
        """Pixels that are read around the region: (top, left, bottom, right)."""
        reach, (h, w), (y, x) = self.operation.reach, (3, 5), (1, 3)
        self.window, self.anchor = (h, w), (y, x)
        self.mask_word = MASKS.get(self.operation.snake, ("3x3", 33))
        if reach in ("window", "structure"):
            self.margins = y, x, h - 1 - y, w - 1 - x
        elif reach == "kernel":
            self.margins = h - 1 - y, w - 1 - x, y, x
        elif reach == "fixed":
            code = self.mask_word[1]
            self.margins = (code % 10 // 2, code // 10 // 2) * 2
        elif reach in ("row", "column"):
            self.margins = (0, 2, 0, 4) if reach == "row" else (2, 0, 4, 0)
        elif reach in ("1", "2") and "border" not in self.names:
            self.margins = (int(reach),) * 4
        elif reach == "centred":
            self.window = 5, 5

    def choose_extent(self):
        extent = self.operation.extent
        self.pattern = 4, 5
        if extent in ("2x2", "4x4", "8x8"):
            self.height = self.width = 8
        side = {"2x2": 2, "4x4": 4, "8x8": 8}.get(extent)
        sizes = {"full": (14, 17), "same": (11, 13), "valid": (8, 9), "algorithm": (8, 9), "frame": (16, 18), "bits": (11, 13),
                 "blocks": (4, 3)}
        if side:
            self.out_size = side, side
        elif extent == "row":
            self.out_size = 1, self.width
        elif not hasattr(self, "out_size"):
            self.out_size = sizes.get(extent, (self.height, self.width))

    # --- images

    def array(self, height, width, layout, c_type):
        count = channels(layout)
        if "P" in layout:
            return picture(self.rng, (count, height, width), TYPES[c_type]).transpose(1, 2, 0)
        return picture(self.rng, (height, width) if count == 1 else (height, width, count), TYPES[c_type])

    def apart(self, array):
        """The same elements in rows that do not follow each other, which is how blocks in images are told from blocks."""
        return np.pad(array, ((0, 0), (0, 3)))[:, :array.shape[1]] if self.operation.extent == "8x8" else array

    def pass_image(self, argument, array, offset=0):
        """The image, by the argument's declaration, and its step, which follows as an argument of its own."""
        if argument.kind.startswith("planes"):
            planes = (ct.c_void_p * channels(self.layout_of(argument)))(
                *(address(array) + k * array.strides[2] for k in range(array.shape[2])))
            self.keep.append(planes)
            self.c.append(planes)
        else:
            self.c.append(ct.c_void_p(address(array) + offset))
        self.step_value = array.strides[0]

    def layout_of(self, argument):
        return self.member.source_layout if argument.kind.endswith("_in") else self.member.target_layout

    def image_in(self, argument):
        if argument.name in ("weights", "locations"):
            return self.vector(argument)
        top, left, bottom, right = self.margins
        height, width = self.height + top + bottom, self.width + left + right
        if argument.name == "pattern":
            height, width = self.pattern
        if self.operation.extent == "bits":
            width = 4
        array = self.array(height, width, self.layout_of(argument), self.source)
        if argument.kind == "image_in":
            array = self.apart(array)
        offset = top * array.strides[0] + left * array.strides[1]
        if self.has_channel("src"):
            offset += array.itemsize
        self.python[argument.name] = array
        self.pass_image(argument, array, offset)

    planes_in = array_in = image_in

    def image_out(self, argument):
        if self.operation.extent == "windows":
            return self.descriptors(argument)
        height, width = self.out_size
        layout = "C3" if "24u" in self.member.types else self.layout_of(argument)
        c_type = self.target
        array = self.array(height, width, layout, c_type)
        mine = array.copy() if "P" not in layout else array.transpose(2, 0, 1).copy().transpose(1, 2, 0)
        if argument.kind == "image_out":
            mine, array = self.apart(mine), self.apart(array)
        self.made.append((mine, array))
        name = "dst" if self.operation.snake == "fill" else "out"
        if self.operation.extent == "blocks":
            self.python["out"] = self.python.get("out", ()) + (mine,)
        else:
            self.python[name] = mine
        self.pass_image(argument, array, array.itemsize if self.has_channel("out") else 0)

    planes_out = array_out = image_out

    def descriptors(self, argument):
        count = self.plan.descriptor_size
        mine, array = np.zeros((2, count), "f4"), np.zeros((2, count), "f4")
        self.made.append((mine, array))
        self.python["out"] = mine
        self.c.append(ct.c_void_p(address(array)))

    def image_inout(self, argument):
        top, left, bottom, right = self.margins
        height, width = self.height + top + bottom, self.width + left + right
        frame = self.operation.extent == "frame"
        if frame:
            (height, width), top, left = self.out_size, 2, 3
        array = self.array(height, width, self.member.target_layout, self.target)
        mine = array.copy()
        self.made.append((mine, array))
        inner = mine[top:top + self.height, left:left + self.width]
        if frame:
            self.python.update(src=inner, out=mine)
        elif argument.name == "b":
            self.python.update(b=inner, out=inner)
        else:
            source = mine.view(TYPES[self.source]) if self.source != self.target else mine
            self.python[argument.name] = source
            self.python["out"] = inner
        self.pass_image(argument, array, top * array.strides[0] + left * array.strides[1])

    array_inout = image_inout

    def step(self, argument):
        self.c.append(ct.c_int32(self.step_value))

    def mask(self, argument):
        array = self.rng.integers(0, 2, (self.height, self.width), "u1")
        self.python["mask"] = array
        self.pass_image(argument, array)

    # --- sizes

    def region(self, argument):
        self.c.append(Size(self.width, self.height))

    def size_of(self, argument):
        sizes = {"src": (self.height, self.width), "pattern": self.pattern, "dst": self.out_size}
        height, width = sizes.get(argument.detail, self.window)
        self.c.append(Size(width, height))

    def size(self, argument):
        self.python[argument.name] = self.window
        self.c.append(Size(self.window[1], self.window[0]))

    def point(self, argument):
        y, x = self.anchor if argument.name == "anchor" else (0, 0)
        if argument.name == "anchor":
            self.python["anchor"] = y, x
        self.c.append(Point(x, y))

    def rows(self, argument):
        self.python["before"] = 2, 3
        self.c.append(ct.c_int32(2))

    def columns(self, argument):
        self.c.append(ct.c_int32(3))

    def count(self, argument):
        counts = {"src": self.height, "dst": self.width, "locations": 2}
        if argument.detail in counts:
            return self.c.append(ct.c_int32(counts[argument.detail]))
        entries = getattr(self, "entries", 9)
        if entries == 9 and self.operation.extent == "levels" and "lower" in self.names:
            self.python["levels"] = 9
        self.c.append((ct.c_int32 * argument.length)(*[entries] * argument.length) if argument.length else ct.c_int32(entries))

    def bits(self, argument):
        self.c.append(ct.c_int32(3))

    # --- numbers

    def value(self, argument):
        n = argument.length or (channels(self.layout) if argument.stars else 1)
        start = {"below": 3, "lower": 10, "upper": 90, "above": 60, "threshold": 40}.get(argument.name, 1)
        if argument.name == "border_value":
            start, values = 0, [0] * n
        values = [start + i for i in range(n)]
        if argument.element.startswith("QorComplex"):
            values = [complex(v, -v) for v in values]
        if argument.name != "border_value" or self.operation.snake == "hog":
            self.python[argument.name] = values if argument.stars else values[0]
        made = (SCALARS[argument.element] * n)(*(self.number(argument.element, v) for v in values))
        self.keep.append(made)
        self.c.append(made if argument.stars else made[0] if not argument.element.startswith("Qor") else made[0])
        if not argument.stars and not argument.element.startswith("Qor"):
            self.c[-1] = SCALARS[argument.element](values[0])
        if argument.name == "border_value" and not argument.stars:
            self.python["border_value"] = values[0]

    def number(self, c_type, value):
        if c_type.startswith("QorComplex"):
            part = float if c_type == "QorComplex32f" else int
            return SCALARS[c_type](part(value.real), part(value.imag))
        return value

    def scalar(self, argument):
        value = NUMBERS[argument.name]
        if self.operation.snake in ("exp", "log", "square", "sqrt") and argument.name == "scale":
            value = 2
        self.python[argument.name] = value
        self.c.append(SCALARS[argument.element](value))

    def enum(self, argument):
        word, code = self.mask_word if argument.name == "mask" else WORDS[argument.name]
        self.python[argument.name] = word
        self.c.append(ct.c_int32(code))

    flags = enum

    def kernel(self, argument):
        dtype = TYPES[argument.element]
        array = self.rng.integers(0, 2, self.window).astype(dtype) if argument.name == "structure" else (
            self.rng.integers(-5, 9, self.window).astype(dtype))
        array[0, 0] = 1
        self.python[argument.name] = array
        self.c.append(ct.c_void_p(address(array)))

    def vector(self, argument):
        if argument.name == "weights":
            array = picture(self.rng, self.height, TYPES[argument.element])
        else:
            self.python["locations"] = [(0, 4), (4, 8)]
            array = np.array([[4, 0], [8, 4]], "i4")
            self.keep.append(array)
            return self.c.append(ct.c_void_p(address(array)))
        self.python["weights"] = array
        self.c.append(ct.c_void_p(address(array)))

    def rows_in(self, argument):
        array = picture(self.rng, (self.height, self.width), TYPES[argument.element])
        self.python[argument.name] = array
        rows = (ct.c_void_p * self.height)(*(address(array) + y * array.strides[0] for y in range(self.height)))
        self.keep.append(rows)
        self.c.append(rows)

    def lists_in(self, argument):
        triples = "24u" in self.member.types
        n, dtype = argument.length or 1, TYPES[argument.element]
        if argument.name == "table":
            lists = [picture(self.rng, (8, 3) if triples else 8, dtype) for _ in range(n)]
            self.entries = 8
        else:
            lists = [np.sort(self.rng.permutation(200)[:9]).astype(dtype) for _ in range(n)]
            self.entries = 9
        self.keep.append(lists)
        self.python[argument.name] = lists if argument.length else lists[0]
        pointers = (ct.c_void_p * n)(*map(address, lists))
        self.keep.append(pointers)
        self.c.append(pointers if argument.length else ct.c_void_p(address(lists[0])))

    # --- results, plans, memory

    def lists_out(self, argument):
        n = argument.length or 1
        entries = 9 if argument.name == "levels" else 8
        lists = [np.full(entries, -1, "i4") for _ in range(n)]
        self.results.append((argument.name, "lists", lists, bool(argument.length)))
        pointers = (ct.c_void_p * n)(*map(address, lists))
        self.keep.append(pointers)
        self.c.append(pointers if argument.length else ct.c_void_p(address(lists[0])))

    def result(self, argument):
        array = np.zeros(argument.length or 1, TYPES[argument.element])
        self.results.append((argument.name, "numbers", array, bool(argument.length)))
        self.c.append(ct.c_void_p(address(array)))

    def plan_in(self, argument):
        self.python["plan"] = self.plan
        self.c.append(ct.c_void_p(_core._address(self.plan)))

    def buffer(self, argument):
        scratch = self.rng.integers(0, 255, 1 << 20, "u1")
        self.keep.append(scratch)
        self.c.append(ct.c_void_p(address(scratch)))

    def call_c(self):
        function = getattr(LIBRARY, self.member.name)
        function.restype = ct.c_int32
        return function(*self.c)
