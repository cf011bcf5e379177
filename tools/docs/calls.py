"""What a call of the Python package is in C: every call written out, plans and work memory too.

The pages show the C text of their examples from here. Calls are made as well, through ctypes, so that the tests can
hold the package, the model and the compiled text against each other.
"""
import ctypes as ct

import numpy as np

import arguments
import choice
import door_python_model
import registry
from c_text import ELEMENT, SCALAR

OUTPUTS = ("image_out", "array_out", "planes_out")


class Status(Exception):
    pass


class Model:
    """Attributes are the functions and plans of the package. `lines` collects the C text, `names` the C names."""

    def __init__(self, library):
        self.library = ct.CDLL(str(library))
        families = registry.load(registry.ROOT / "api")
        self.members = {m.name: m for m in registry.all_members(families)}
        self.functions = {f.name: f for f in door_python_model.functions(families)}
        self.restart()

    def restart(self):
        self.lines, self.names, self.freed = [], {}, []
        self.keep = []                              # memory that calls point into
        self.fresh = {}                             # arrays that calls make, by id

    def __getattr__(self, name):
        import plans
        if name in plans.MAKERS:
            return lambda *args, **kwargs: plans.MAKERS[name](self, *args, **kwargs)
        if name.startswith("_") or name not in self.functions:
            raise AttributeError(name)
        return lambda *args, **kwargs: self.run(self.functions[name], args, kwargs)

    # --- names ------------------------------------------------------------------------------------------------------

    def unique(self, name):
        candidate, count = name, 2
        while candidate in self.names:
            candidate, count = f"{name}{count}", count + 1
        self.names[candidate] = None
        return candidate

    def name_of(self, array, fallback):
        """(name, offset in bytes) of an array or of the one that it is a part of."""
        for name, known in self.names.items():
            if known is array:
                return name, 0
        for name, known in self.names.items():
            if isinstance(known, np.ndarray) and np.shares_memory(known, array):
                return name, array.ctypes.data - known.ctypes.data
        name = self.unique(fallback)
        self.names[name] = array
        return name, 0

    def named_list(self, name, array):
        """The name of an array of these elements."""
        for known, other in self.names.items():
            if isinstance(other, np.ndarray) and known.startswith(name) and other.dtype == array.dtype and \
                    np.array_equal(other, array):
                return known
        name = self.unique(name)
        self.names[name] = array
        return name

    def make(self, shape, dtype):
        array = np.zeros(shape, dtype)
        self.fresh[id(array)] = array
        return array

    # --- calls ------------------------------------------------------------------------------------------------------

    def run(self, function, args, kwargs):
        given = choice.bind(function, args, kwargs)
        first = next(given[n] for n in ("src", "a", "dst") if n in given)
        member = choice.choose(function, given, first)
        call = arguments.Arguments(self, member, given, first, self.output(member, given, first))
        self.call(member, [call.pair(a) for a in member.arguments])
        return self.returned(call)

    def extent(self, member, given):
        if member.operation.extent != "algorithm":
            return member.operation.extent
        return choice.correlation_extent(arguments.enumerated("QorCorrelation", given["algorithm"])[1])

    def output(self, member, given, first):
        target = next((a for a in member.arguments if a.kind in OUTPUTS), None)
        if target is None or "out" in given or "dst" in given:
            return given.get("out", given.get("dst", first))
        extent = self.extent(member, given)
        shape = choice.result_shape(member, given, first, extent)
        channels = 3 if "24u" in member.types else registry.channels(member.target_layout)
        if channels > 1 and extent not in ("8x8", "2x2", "4x4", "windows"):
            shape += (channels,)
        return self.make(shape, ELEMENT[target.element])

    def returned(self, call):
        """What the package returns: the destination, lists, or results in its order."""
        results = [(a, self.names[name]) for a, name in call.results]
        values = {a.name: tuple(h) if a.length else h[0] for a, h in results}
        if call.member.operation.extent == "blocks":
            return (call.out, call.second_out, *values.values())
        if "column" in values and "row" in values:
            value, column, row = (values.pop(n) for n in (next(iter(values)), "column", "row"))
            return value, tuple(zip(row, column)) if isinstance(row, tuple) else (row, column)
        if values:
            found = tuple(values.values())
            return found[0] if len(found) == 1 else found
        if call.lists:
            return call.lists[0] if len(call.lists) == 1 else tuple(call.lists)
        return call.out

    def call(self, member, pairs):
        """Writes a call down, broken between arguments where it is long, and makes it."""
        line, width = f"{member.name}(", 100
        for i, (text, _) in enumerate(pairs):
            piece = text + (");" if i + 1 == len(pairs) else ", ")
            if len(line + piece) > width and not line.endswith("("):
                self.lines.append(line.rstrip())
                line = "    "
            line += piece
        self.lines.append(line)
        function = getattr(self.library, member.name)
        function.restype = ct.c_int32
        values = []
        for a, (_, value) in zip(member.arguments, pairs):
            if not a.stars and a.element in SCALAR and not isinstance(value, ct._SimpleCData):
                value = SCALAR[a.element](value)
            values.append(value)
        status = function(*values)
        if status < 0:
            raise Status(f"{member.name}: {status}")

    def allocate(self, c_type, name, amount, count, spare=""):
        """Memory for a plan or a buffer; (text, pointer) and the memory."""
        memory = np.zeros(count + 128, np.uint8)
        memory = memory[-memory.ctypes.data % 64:]
        self.keep.append(memory)
        name = self.unique(name)
        self.names[name] = b"allocated"
        self.lines.append(f"{c_type}* {name} = malloc({amount}{spare});")
        return (name, ct.c_void_p(memory.ctypes.data)), memory

    def declare_bytes(self, names):
        new = [n for n in names if n not in self.names]
        if new:
            self.names.update(dict.fromkeys(new))
            self.lines.append(f"int32_t {', '.join(new)};")

