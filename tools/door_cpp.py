"""The operations of the C++ header as a model: forms and signatures, made from the members' roles.

A form is the members of one operation whose C arguments are alike but for their types; one of them is chosen by a key,
which is made of the elements and layouts of a call's images. A signature is what a C++ caller writes; the forms that it
may stand for are tried in turn.
"""
from dataclasses import dataclass, field

import roles

TYPE_DIGITS = {"uint8_t": 1, "int8_t": 2, "uint16_t": 3, "int16_t": 4, "uint32_t": 5, "int32_t": 6, "float": 7, "double": 8,
               "QorComplex16s": 9, "QorComplex32s": 10, "QorComplex32f": 11}
LAYOUT_DIGITS = {"C1": 1, "C2": 2, "C3": 3, "C4": 4, "AC4": 5, "P3": 6, "P4": 7, "C3C": 8, "C4C": 9}
TYPE_NAMES = {"uint8_t": "8u", "int8_t": "8s", "uint16_t": "16u", "int16_t": "16s", "uint32_t": "32u", "int32_t": "32s",
              "float": "32f", "double": "64f", "QorComplex16s": "16sc", "QorComplex32s": "32sc", "QorComplex32f": "32fc"}
LAYOUT_NAMES = {"C3C": "ChannelOfC3", "C4C": "ChannelOfC4"}
# Both orders of the operands are the same: in place, the image that changes stands first.
SYMMETRIC = {"add", "multiply", "multiply_fraction", "multiply_packed"}
BLOCKS = ("2x2", "4x4", "8x8")
READ, WRITTEN = ("in", "block_in"), ("out", "inout", "block_out", "block_inout")


class DoorError(Exception):
    pass


@dataclass
class Argument:
    """One of C++: its kind, its name, and the places of the C arguments that it stands for."""
    kind: str
    name: str
    places: list
    default: str = None
    detail: str = ""

    @property
    def image(self):
        return self.kind in ("in", "out", "inout", "mask")

    @property
    def deduced(self):
        return self.image or self.kind.startswith("block")


@dataclass
class Form:
    name: str
    c_operation: str
    arguments: list
    sizes: dict                  # place of a C argument: the role that says which size stands there
    extent: str
    keyed: str                   # by images, by explicit types, by nothing
    weighted: bool               # the kernel's element takes part in the choice
    members: dict = field(default_factory=dict)      # key: member

    def anyone(self):
        return next(iter(self.members.values()))


def is_free(member):
    """A function of its own name in C++; the others serve plans and go by their C names."""
    return member.purpose in ("operation", "library") and not member.operation.plan


def name_of(member):
    if is_free(member):
        return member.operation.snake
    return {"Malloc": "allocate", "Free": "release"}.get(member.c_operation, roles.snake_case(member.c_operation))


# --- what the arguments of C are to C++ -----------------------------------------------------------------------------

def kind_of(a, after, images, blocks):
    """The kind of the C++ argument that begins at a C argument, and how many C arguments it takes."""
    following = [b.kind for b in after]
    if a.kind in ("image_in", "image_out", "image_inout", "planes_in", "planes_out"):
        return a.kind.split("_")[1], 2
    if a.kind == "mask":
        return "mask", 2
    if blocks and a.kind.startswith("array_"):
        return "block_" + a.kind.split("_")[1], 1
    if images and (a.kind == "region" or (a.kind == "size_of" and a.detail in images)):
        return "size", 1
    if a.kind == "kernel":
        return ("kernel", 3) if following[:2] == ["size_of", "point"] else ("plain", 1)
    if a.kind == "size" and a.name == "size" and following[:1] == ["point"]:
        return "window", 2
    if images and a.name == "border" and after and after[0].name == "border_value":
        return "border", 2
    if images and (a.kind == "value" or (a.kind == "count" and a.detail == "levels")):
        return "value", 1
    if images and a.kind == "result":
        return "result", 1
    return ("enum" if a.kind == "enum" else "buffer" if a.kind == "buffer" else "plain"), 1


def arguments_of(member):
    """Arguments of C++ in the order of C; sizes that views bring along."""
    c = member.arguments
    images = {a.name for a in c if a.kind.startswith(("image_", "planes_"))}
    found, sizes, place = [], {}, 0
    while place < len(c):
        a = c[place]
        kind, count = kind_of(a, c[place + 1:], images, member.operation.extent in BLOCKS)
        if kind == "size":
            sizes[place] = "region" if a.kind == "region" else a.detail
        else:
            default = a.default if kind in ("plain", "enum", "border") else None
            found.append(Argument(kind, a.name, list(range(place, place + count)), default, a.detail))
        place += count
    names = [a.name for a in found]
    for a in found:
        if names.count(a.name) > 1:
            a.name = roles.public_name(c[a.places[0]].c_name)
    if not is_free(member):                                 # plans give every argument, work memory too
        for a in found:
            a.default = None
            a.kind = {"buffer": "plain", "value": "value"}.get(a.kind, a.kind)
    return found, sizes


def in_order(arguments, operation):
    """What is computed from, the destination, the rest, what may be left out. Operands stand as they read."""
    operands = sorted((a for a in arguments if a.name in ("a", "b") and (a.deduced or a.kind == "value")),
                      key=lambda a: a.name)
    if operation in SYMMETRIC:
        operands.sort(key=lambda a: a.kind != "inout")
    changed = [a for a in arguments if a.kind.endswith("inout") and a not in operands]
    sources = [a for a in arguments if a.kind in READ and a not in operands]
    targets = [a for a in arguments if a.kind in ("out", "block_out")]
    filled = [a for a in arguments if a.kind == "value" and operation == "fill"]
    first = operands + changed + sources + filled + targets
    rest = [a for a in arguments if a not in first]
    left = [a for a in rest if a.default is not None]
    left.sort(key=lambda a: a.kind != "border")
    return first + [a for a in rest if a not in left and a.kind != "buffer"] + left + [a for a in rest if a.kind == "buffer"]


# --- keys -----------------------------------------------------------------------------------------------------------

def layouts_of(member):
    """Layouts of a member's sources and destinations as views have them."""
    source, target = member.source_layout, member.target_layout
    if member.c_operation == "Copy" and target == "C1" and source in ("C3", "C4"):
        source += "C"                                       # one channel is taken out
    if member.c_operation == "Copy" and source == "C1" and target in ("C3", "C4"):
        target += "C"                                       # or put in
    if member.types.endswith("24u"):
        target = "C3"                                       # three bytes for each element
    return source, target


def ends_of(member, arguments):
    """(element, layout) of sources and of destinations; those of the other where there are none."""
    source_layout, target_layout = layouts_of(member)
    source = target = None
    for a in arguments:
        element = member.arguments[a.places[0]].element
        if a.kind in READ:
            source = element, source_layout
        elif a.kind in WRITTEN:
            target = element, target_layout
    if source is None and target is None:
        source = member.source, member.source_layout
    return source or target, target or source


def digits(end):
    return TYPE_DIGITS[end[0]] << 4 | LAYOUT_DIGITS[end[1]]


def key_of(member, form):
    if form.keyed == "nothing":
        return member.name
    source, target = ends_of(member, form.arguments)
    key = digits(source) << 8 | digits(target)
    for a in form.arguments:
        if form.weighted and a.kind == "kernel":
            key |= TYPE_DIGITS[member.arguments[a.places[0]].element] << 16
    return key


def forms_of(members):
    """{operation: its forms}, in the order of the registry."""
    operations = {}
    for member in members:
        name = name_of(member)
        forms = operations.setdefault(name, {})
        arguments, sizes = arguments_of(member)
        keyed = "images" if any(a.deduced for a in arguments) else "types" if member.types else "nothing"
        shape = (member.c_operation if keyed == "nothing" else "", keyed, tuple(sizes.items()), member.operation.extent,
                 tuple((a.kind, a.name, tuple(a.places)) for a in arguments))
        if shape not in forms:
            weighted = any(a.kind == "kernel" and member.arguments[a.places[0]].name == "kernel" for a in arguments)
            forms[shape] = Form(f"{name}_{len(forms)}", member.c_operation, arguments, sizes, member.operation.extent,
                                keyed, weighted and is_free(member))
        form = forms[shape]
        key = key_of(member, form)
        if key in form.members:
            raise DoorError(f"{member.name} and {form.members[key].name} are called with the same images")
        form.members[key] = member
    return {name: list(forms.values()) for name, forms in operations.items()}


# --- signatures -----------------------------------------------------------------------------------------------------

@dataclass
class Choice:
    """A form behind a signature, with what the caller leaves out."""
    form: Form
    arguments: dict
    left_out: list


@dataclass
class Signature:
    operation: str
    arguments: list
    choices: list
    keyed: str

    @property
    def weighted(self):
        return self.choices[0].form.weighted

    @property
    def allocates(self):
        """Some form has work memory that the caller does not bring."""
        return any(a.kind == "buffer" for c in self.choices for a in c.left_out)


def signatures_of(operation, forms):
    found = {}
    for form in forms:
        if form.keyed == "nothing":
            found[form.name] = Signature(operation, form.arguments, [Choice(form, {a.name: a for a in form.arguments}, [])],
                                         "nothing")
            continue
        ordered = in_order(form.arguments, operation)
        named = {a.name: a for a in ordered}
        given = [a for a in ordered if a.kind != "buffer"]
        lists = [ordered] if len(given) < len(ordered) else []
        lists.append(given)
        while lists[-1] and lists[-1][-1].default is not None:
            lists.append(lists[-1][:-1])
        for shown in lists:
            pattern = form.keyed, tuple((a.kind, a.name) for a in shown)
            signature = found.setdefault(pattern, Signature(operation, shown, [], form.keyed))
            signature.choices.append(Choice(form, named, [a for a in ordered if a not in shown]))
    for signature in found.values():                        # the form that leaves out least is tried first
        signature.choices.sort(key=lambda c: len(c.left_out))
    refuse_doubles(operation, found.values())
    return list(found.values())


def refuse_doubles(operation, signatures):
    """Two signatures of one length differ in which arguments are images, or in the type of one of the others."""
    def type_of(a, choice):
        c = choice.form.anyone().arguments[choice.arguments[a.name].places[0]]
        return c.detail if a.kind == "enum" else a.kind if a.kind != "plain" else c.element

    seen = set()
    for s in signatures:
        if s.keyed == "nothing":
            continue
        shape = s.keyed, tuple(a.kind if a.deduced else type_of(a, s.choices[0]) for a in s.arguments)
        if shape in seen:
            raise DoorError(f"{operation}: two ways to call it look alike: {shape}")
        seen.add(shape)


def check(families):
    """Every member has a way to be called that is no other's."""
    for name, forms in forms_of([m for f in families for g in f.groups for m in g.members]).items():
        signatures_of(name, forms)
