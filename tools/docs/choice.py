"""Which member of the registry a call of the Python package stands for, and the shape of its result."""
from dataclasses import dataclass, field

import numpy as np

import door_python_model
from c_text import ELEMENT

CHOOSERS = {"keep_alpha", "channel", "dtype", "channels", "width"}      # keywords that are no arguments in C


class NoMember(Exception):
    pass


@dataclass
class Plan:
    """A plan that has been made: its memory, the C operations that take it, and what their calls need to know of it."""
    memory: np.ndarray
    operations: set
    shape: tuple                    # of results; None where it does not say
    name: str
    facts: dict = field(default_factory=dict)


def plan_of(given):
    return next((v for v in given.values() if isinstance(v, Plan)), None)


def is_image(value):
    return isinstance(value, np.ndarray) and value.ndim > 1


def bind(function, args, kwargs):
    """{name: value} of what is given; the first value of all is the image that chooses."""
    names = {p.name for p in function.parameters}
    positional = list(dict.fromkeys(p.name for p in function.parameters[:function.positional]))
    given = dict(zip(positional, args)) | kwargs
    if set(given) - names or len(args) > len(positional):
        raise NoMember(f"{function.name} takes no {sorted(set(given) - names)}")
    return {n: v for n, v in given.items() if v is not None}


def pixel_class(array, keep_alpha=False, channel=False):
    """The class of a picture's pixels as the forms have it."""
    channels = 1 if array.ndim < 3 else array.shape[2]
    code = channels | (door_python_model.ALPHA if keep_alpha else 0)
    code |= door_python_model.CHANNEL if channel and channels > 1 else 0
    planar = array.ndim == 3 and channels > 1 and array.strides[2] != array.itemsize
    return code | (door_python_model.PLANAR if planar else 0)


def takes(form, given):
    """Whether a form has the parameters that are given, and needs no others."""
    keys = set(given) - CHOOSERS
    if keys - {n for n, _ in form.accepts} - {"dst"} or {n for n, k in form.requires if k != "OUT"} - keys:
        return False
    return "b" not in given or ("b", "IMAGE" if is_image(given["b"]) else "VALUE") in form.accepts


def fits_layouts(form, given, first, main):
    parts = door_python_model.CHANNEL | door_python_model.ALPHA
    key = form.layouts[0 if door_python_model.reads(main) else 1]
    target = given.get("out", given.get("dst"))
    if key != pixel_class(first, given.get("keep_alpha"), "channel" in given):
        return False
    if ("channel" in given) != bool((form.layouts[0] | form.layouts[1]) & door_python_model.CHANNEL):
        return False
    if target is None:
        return not form.layouts[1] & parts
    return target.ndim < 2 or not (form.layouts[1] ^ pixel_class(target)) & (7 | door_python_model.PLANAR)


def fits_elements(given, first, main):
    source, target = (ELEMENT[e] for e in door_python_model.elements_of(main))
    kernels = {ELEMENT[a.element] for a in main.arguments if a.kind == "kernel"}
    if "kernel" in given and kernels and given["kernel"].dtype not in kernels:
        return False
    wanted = given["out"].dtype if "out" in given else given.get("dtype")
    return source == first.dtype and (wanted is None or np.dtype(wanted) == target)


def choose(function, given, first):
    """The member whose elements, layouts and parameters are those of the call; of several the nearest to the source."""
    found = []
    for form in function.forms:
        main = form.member or form.twin
        in_place = form.twin is not None and given.get("out") is first
        member = form.twin if in_place else form.member
        plan = plan_of(given)
        if member is None or not takes(form, given) or (plan and main.c_operation not in plan.operations) or \
                not fits_elements(given, first, main) or not fits_layouts(form, given, first, main):
            continue
        target = ELEMENT[door_python_model.elements_of(main)[1]]
        rank = (target != first.dtype, form.layouts[0] != form.layouts[1], len(form.accepts), len(found))
        found.append((rank, member))
    if not found:
        raise NoMember(f"{function.name}: no form for {sorted(given)} of {first.dtype} {first.shape}")
    return min(found, key=lambda entry: entry[0])[1]


# --- shapes ---------------------------------------------------------------------------------------------------------

def centre(length):
    return (length - 1) // 2


def window_of(given):
    weights = given.get("kernel", given.get("structure"))
    return weights.shape if weights is not None else given["size"]


def reach_of(member, given):
    """((rows, columns) before, (rows, columns) after) of what is read around a pixel."""
    rule, anchor = member.operation.reach, given.get("anchor")
    if rule in ("window", "kernel", "structure"):
        height, width = window_of(given)
        row, column = anchor if anchor is not None else (centre(height), centre(width))
        before, after = (row, column), (height - 1 - row, width - 1 - column)
        return (after, before) if rule == "kernel" else (before, after)
    if rule == "fixed":
        columns, rows = (int(side) // 2 for side in str(given["mask"])[-3:].split("x"))
        return ((rows, columns),) * 2
    if rule in ("1", "2") and not any(a.name == "border" for a in member.arguments):
        return ((int(rule),) * 2,) * 2
    if rule in ("row", "column"):
        before = anchor if anchor is not None else centre(given["size"])
        after = given["size"] - 1 - before
        return ((0, before), (0, after)) if rule == "row" else ((before, 0), (after, 0))
    return (0, 0), (0, 0)


def correlation_extent(number):
    return ("full", "valid", "same")[number >> 16 & 3]


def result_shape(member, given, first, extent):
    """Rows and columns of what a call makes."""
    height, width = first.shape[:2] if first.ndim > 1 else (1, first.shape[0])
    if extent in ("full", "valid"):
        sign = 1 if extent == "full" else -1
        rows, columns = given["pattern"].shape[:2]
        return height + sign * (rows - 1), width + sign * (columns - 1)
    if extent in ("8x8", "2x2", "4x4"):
        return (int(extent[0]),) * 2
    if extent == "plan":
        return plan_of(given).shape
    if extent == "axis" and "diagonal" in str(given["axis"]):
        return width, height
    if extent == "frame":
        (top, left), (bottom, right) = given.get("before", (0, 0)), given.get("after", (0, 0))
        return height + top + bottom, width + left + right
    if extent == "bits":
        return height, given["width"]
    if extent == "blocks":
        return -(-height // given["block"][0]), -(-width // given["block"][1])
    if extent == "windows":
        return len(given.get("locations", [(0, 0)])), plan_of(given).facts["length"]
    if member.operation.c_name.startswith("DotProdCol"):
        return (width,)
    (top, left), (bottom, right) = reach_of(member, given)
    return height - top - bottom, width - left - right
