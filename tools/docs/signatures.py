"""Signatures of operations in Python and C++, from the roles of their arguments."""
import functools

import door_python
import registry

INPUTS = ("image_in", "image_inout", "planes_in", "array_in", "array_inout", "rows_in")
OUTPUTS = ("image_out", "planes_out", "array_out", "lists_out")
SILENT = ("step", "region", "size_of", "count", "bits", "buffer", "result")


def public_arguments(member):
    """The arguments that a caller gives, in natural order: inputs (a before b), what has no default, then the rest."""
    given = [a for a in member.arguments if a.kind not in SILENT + OUTPUTS]
    inputs = sorted((a for a in given if a.kind in INPUTS), key=lambda a: a.name if a.name in "ab" else "")
    others = [a for a in given if a.kind not in INPUTS]
    operand = [a for a in others if a.name == "b"]
    rest = [a for a in others if a.name != "b"]
    return inputs + operand + [a for a in rest if a.default is None] + [a for a in rest if a.default is not None]


def merged(members):
    """Arguments of all members by name, in order; those that some members lack have the default None."""
    order, everywhere = {}, None
    for member in members:
        names = [a.name for a in public_arguments(member)]
        everywhere = set(names) if everywhere is None else everywhere & set(names)
        for argument in public_arguments(member):
            order.setdefault(argument.name, argument)
    required = [a for a in order.values() if a.default is None and a.name in everywhere]
    optional = [a for a in order.values() if a not in required]
    return required, optional


def default_text(argument):
    text = argument.default
    if text is None:
        return "None"
    return "(0, 0)" if text == "0 0" else text


@functools.cache
def python_functions():
    return {f.name: f for f in door_python.functions(registry.load(registry.ROOT / "api"))}


def python_signature(members):
    return "qori." + door_python.signature(python_functions()[members[0].operation.snake])


CPP_TYPES = {"image_in": "View<const T, L> {}", "image_inout": "View<const T, L> {}", "planes_in": "Planes<const T, N> {}",
             "array_in": "const T* {}", "array_inout": "const T* {}", "rows_in": "const T* const* {}", "value": "Value<T, L> {}",
             "scalar": "{e} {}", "enum": "{d} {}", "flags": "{d} {}", "size": "QorImageSize {}", "point": "QorPoint2D {}",
             "kernel": "Kernel<T> {}", "lists_in": "Lists<T, L> {}", "mask": "View<const std::uint8_t, C1> {}",
             "rows": "std::int32_t {}", "columns": "std::int32_t {}", "plan_in": "const {p}& {}"}


def cpp_parameter(argument, member):
    form = CPP_TYPES.get(argument.kind, argument.element + " {}")
    text = form.replace("{e}", argument.element).replace("{d}", argument.detail).replace("{p}", member.operation.plan or "auto")
    return text.replace("{}", argument.name)


def cpp_signature(members):
    member = members[0]
    required, optional = merged(members)
    parts = [cpp_parameter(a, member) for a in required]
    if any(a.kind in OUTPUTS for a in member.arguments):
        parts.append("View<D, L> out")
    parts += [cpp_parameter(a, member) + (f" = {default_text(a)}" if a.default is not None else "") for a in optional
              if a.default is not None]
    parts += [f"{a.element}& {a.name}" for a in member.arguments if a.kind == "result"]
    return f"Status qori::{member.operation.snake}({', '.join(parts)}) noexcept;"


__all__ = ["cpp_signature", "python_signature", "public_arguments", "registry"]
