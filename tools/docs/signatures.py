"""Signatures of operations in Python and C++, from the two doors."""
import functools
import re

import door_cpp
import door_python_model
import registry

CPP_TYPES = {"in": "View<const T, L>", "out": "View<T, L>", "inout": "InPlace<T, L>", "mask": "View<const uint8_t, C1>",
             "block_in": "const T*", "block_out": "T*", "block_inout": "T*", "kernel": "Kernel<T>", "window": "Window",
             "border": "Border<T, N>", "value": "Pixel<T, N>", "buffer": "Buffer&"}
# Operations with plans are calls of theirs: how the plan is made, and how it is called. Work memory is optional.
PLANS = {
    "ResizePlan": """
qori::ResizePlan<T> plan(QorImageSize src, QorImageSize dst, Interpolation how);
QorResult plan(View<const T, L> src, View<T, L> dst, Border<T, N> border = borderReplicate);
QorResult plan.tile(View<const T, L> src, View<T, L> dst, QorPoint2D offset, Border<T, N> border, Buffer& buffer);""",
    "WarpAffinePlan": """
qori::WarpAffinePlan<T, L> plan(QorImageSize src, QorImageSize dst, const double (&matrix)[6], Interpolation how,
    Border<double, N> border = borderReplicate, bool inverse = false);
QorResult plan(View<const T, L> src, View<T, L> dst);
QorResult plan.tile(View<const T, L> src, View<T, L> dst, QorPoint2D offset, Buffer& buffer);""",
    "DftPlan": """
qori::DftPlan<T> plan(QorImageSize size, QorFftNormFlag norm = fftDivInvByN);
QorResult plan.WAY(View<const T, L> src, View<D, L> dst, int32_t scale = 0);""",
    "FftPlan": """
qori::FftPlan<T> plan(QorImageSize size, QorFftNormFlag norm = fftDivInvByN);
QorResult plan.WAY(View<const T, L> src, View<D, L> dst, int32_t scale = 0);""",
    "DctPlan": """
qori::DctPlan plan(QorImageSize size, QorAccuracyHint hint = hintFast);
QorResult plan.WAY(View<const float, L> src, View<float, L> dst);""",
    "LinearFilterPlan": """
qori::LinearFilterPlan<T, L> plan(Kernel<int16_t> kernel, int32_t divisor = 1,
    QorRoundingMode rounding = roundNearestEven);
qori::LinearFilterPlan<T, L> plan(Kernel<float> kernel, QorRoundingMode rounding = roundNearestEven);
QorResult plan(View<const T, L> src, View<T, L> dst, Border<T, N> border = borderReplicate);""",
    "HistogramPlan": """
qori::HistogramPlan<T, L> plan(const float* const (&levels)[N], Pixel<int32_t, N> counts);
qori::HistogramPlan<T, L> plan(Pixel<float, N> lower, Pixel<float, N> upper, Pixel<int32_t, N> counts);
QorResult plan(View<const T, L> src, uint32_t* hist);""",
    "HogPlan": """
qori::HogPlan<T> plan(QorHogConfig config);
QorResult plan(View<const T, L> src, const QorPoint2D* locations, int32_t count, float* dst,
    Border<T, N> border = borderReplicate);""",
    "AdaptiveGaussPlan": """
qori::AdaptiveGaussPlan plan(QorImageSize square, float sigma = 0);
QorResult plan(View<const uint8_t> src, View<uint8_t> dst, float delta,
    Border<uint8_t, 1> border = borderReplicate, uint8_t above = 255, uint8_t below = 0);"""}


@functools.cache
def python_functions():
    return {f.name: f for f in door_python_model.functions(registry.load(registry.ROOT / "api"))}


def python_signature(members):
    return "qori." + door_python_model.signature(python_functions()[members[0].operation.snake])


def cpp_type(argument, c_argument):
    if argument.kind == "enum":
        return argument.detail
    if argument.kind == "result":
        return f"{c_argument.element}&" if not c_argument.length else f"{c_argument.element} (&)[N]"
    if argument.kind in CPP_TYPES:
        return CPP_TYPES[argument.kind]
    return re.sub(r"\s*\w+(\[\w*\])?$", "", c_argument.declaration) + ("*" if c_argument.length else "")


def cpp_calls(members):
    """One line for each list of arguments that the operation takes, out of place first; work memory is optional."""
    lines = {}
    for form in next(iter(door_cpp.forms_of(members).values())):
        member, parts = form.anyone(), []
        for a in door_cpp.in_order(form.arguments, members[0].operation.snake):
            if a.kind == "buffer":
                continue
            text = f"{cpp_type(a, member.arguments[a.places[0]])} {a.name}"
            if "(&)" in text:
                text = text.replace("(&)", f"(&{a.name})").rpartition(" ")[0]
            parts.append(text + (f" = {a.default}" if a.default is not None else ""))
        lines.setdefault(", ".join(parts), form)
    for text in [t for t in lines if " = " in t]:       # what a default covers
        lines.pop(", ".join(p for p in text.split(", ") if " = " not in p), None)
    ordered = sorted(lines, key=lambda text: ("InPlace" in text or text.count("*") > 1))
    return ordered


def cpp_signature(members):
    if members[0].operation.plan:
        return PLANS[members[0].operation.plan].strip().replace("WAY", members[0].operation.snake.rpartition("_")[2])
    name = members[0].operation.snake
    return "\n".join(broken(f"QorResult qori::{name}(", parts.split(", ")) for parts in cpp_calls(members))


def broken(head, parts, width=96):
    """A prototype, broken between parameters where it is long."""
    lines, line, depth = [], head, 0
    joined, current = [], ""
    for part in parts:                                  # commas inside of <> do not part
        current = f"{current}, {part}" if current else part
        depth = current.count("<") - current.count(">")
        if not depth:
            joined.append(current)
            current = ""
    for index, part in enumerate(joined or ["void"]):
        piece = part + (");" if index + 1 >= len(joined) else ", ")
        if len(line + piece) > width:
            lines.append(line.rstrip())
            line = "    "
        line += piece
    return "\n".join(lines + [line])
