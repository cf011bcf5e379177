"""What making a plan of the Python package is in C: the queries, the memory and the call that fills it."""
import ctypes as ct

import numpy as np

from arguments import enumerated
from c_text import C_NAME, DATA_TYPE, TYPE_CODE, Pair, listed, literal, number, size
from choice import Plan
from door_python_model import ENUMS

INTERPOLATION = {"nearest": "interpNearest", "linear": "interpLinear", "cubic": "interpCubic", "super": "interpSuper",
                 "lanczos": "interpLanczos"}


class Maker:
    """The calls that make a plan: a query, memory, the initialisation."""

    def __init__(self, model):
        self.model, self.bytes = model, {}

    def query(self, name, *pairs, receives):
        holders = {r: (ct.c_int32 * 1)() for r in receives}
        self.model.declare_bytes(receives)
        self.fill(name, *pairs, *[("&" + r, holders[r]) for r in receives])
        self.bytes = {r: h[0] for r, h in holders.items()}

    def allocate(self, c_type, name, amount, spare=""):
        return self.model.allocate(c_type, name, amount, self.bytes[amount], spare)

    def fill(self, name, *pairs):
        self.model.call(self.model.members[name], list(pairs))


def code_of(dtype):
    element = C_NAME[np.dtype(dtype)]
    return TYPE_CODE[element], DATA_TYPE.get(element, "")


def data_type(name):
    return name, ENUMS["QorDataType"][name]


def cubic(b, c, element):
    return [(literal(b, element), float(b)), (literal(c, element), float(c))]


def resize_plan(model, src_shape, dst_shape, interpolation="linear", dtype="uint8", *, antialias=False, b=0.0, c=0.5,
                lobes=3):
    kind = interpolation.rstrip("23")
    lobes = int(interpolation[-1]) if interpolation[-1].isdigit() else lobes
    code, _ = code_of(dtype)
    maker = Maker(model)
    interpolation = INTERPOLATION[kind]
    maker.query(f"qoriResizeGetSize_{code}", size(src_shape), size(dst_shape),
                (interpolation, ENUMS["QorInterpolationKind"][interpolation]), number(int(antialias)),
                receives=["planBytes", "initBytes"])
    plan, memory = maker.allocate("QorResizePlan", "plan", "planBytes")
    pairs = [size(src_shape), size(dst_shape)]
    if kind == "cubic":
        pairs += cubic(b, c, "float")
    if kind == "lanczos":
        pairs += [number(lobes)]
    pairs.append(plan)
    if kind in ("cubic", "lanczos") or antialias:
        pairs.append(maker.allocate("uint8_t", "init", "initBytes", " + 1")[0])
    way = kind.capitalize()
    init = f"qoriResizeAntialiasing{way}Init" if antialias else f"qoriResize{way}Init_{code}"
    maker.fill(init, *pairs)
    operation = "ResizeAntialiasing" if antialias else "Resize" + kind.capitalize()
    return Plan(memory, {operation}, tuple(dst_shape[:2]), plan[0])


def warp_affine_plan(model, src_shape, dst_shape, matrix, interpolation="linear", dtype="uint8", channels=1, *,
                     inverse=False, border="constant", border_value=0, b=0.0, c=0.5):
    maker = Maker(model)
    _, type_name = code_of(dtype)
    method, interpolation = interpolation, INTERPOLATION[interpolation]
    (a, b_, c_), (d, e, f) = matrix                     # rows and columns; C maps x and y
    coefficients = np.array([e, d, f, b_, a, c_], np.float64)
    values = (ct.c_double * 4)(*(list(border_value) if np.ndim(border_value) else [border_value] * 4))
    model.keep += [coefficients, values]
    matrix_text = (model.named_list("matrix", coefficients), ct.c_void_p(coefficients.ctypes.data))
    border_pair = enumerated("QorBorderMode", border)
    maker.query("qoriWarpAffineGetSize", size(src_shape), size(dst_shape), data_type(type_name), matrix_text,
                (interpolation, ENUMS["QorInterpolationKind"][interpolation]), number(int(inverse)), border_pair,
                receives=["planBytes", "initBytes"])
    plan, memory = maker.allocate("QorWarpPlan", "plan", "planBytes")
    pairs = [size(src_shape), size(dst_shape), data_type(type_name), matrix_text, number(int(inverse)),
             number(channels)]
    if method == "cubic":
        pairs += cubic(b, c, "double")
    texts = [literal(v, "double") for v in list(values)[:channels]]
    pairs += [border_pair, (listed("const double", texts), values), number(0), plan]
    if method == "cubic":
        pairs.append(maker.allocate("uint8_t", "init", "initBytes", " + 1")[0])
    maker.fill(f"qoriWarpAffine{method.capitalize()}Init", *pairs)
    return Plan(memory, {"WarpAffine" + method.capitalize()}, tuple(dst_shape[:2]), plan[0])


def fourier_plan(family):
    def make(model, shape, dtype="float32", *, norm="div_inv_by_n", hint="fast"):
        letter = {"complex64": "C_32fc", "uint8": "R_32s"}.get(np.dtype(dtype).name, "R_32f")
        norm_pair, choice = enumerated("QorFftNormFlag", norm), enumerated("QorAccuracyHint", hint)
        shape_pairs = [size(shape)] if family == "DFT" else [number(int(np.log2(n))) for n in shape[1::-1]]
        maker = Maker(model)
        if letter == "R_32s":
            name = model.unique("plan")
            holder = (ct.c_void_p * 1)()
            model.lines.append(f"QorFft2DPlan* {name};")
            maker.fill(f"qori{family}InitAlloc_{letter}", ("&" + name, holder), *shape_pairs, norm_pair, choice)
            memory = np.ctypeslib.as_array((ct.c_uint8 * 1).from_address(holder[0]))
            model.freed.append(f"qori{family}Free_{letter}({name});")
            plan = (name, None)
        else:
            maker.query(f"qori{family}GetSize_{letter}", *shape_pairs, norm_pair, choice,
                        receives=["planBytes", "initBytes", "workBytes"])
            plan, memory = maker.allocate("QorFft2DPlan", "plan", "planBytes")
            init, _ = maker.allocate("uint8_t", "init", "initBytes", " + 1")
            maker.fill(f"qori{family}Init_{letter}", *shape_pairs, norm_pair, choice, plan, init)
        there, back = ("CToC", "CToC") if letter == "C_32fc" else ("RToPack", "PackToR")
        return Plan(memory, {f"{family}Fwd_{there}", f"{family}Inv_{back}"}, tuple(shape[:2]), plan[0])
    return make


def dct_plan(model, shape, *, hint="fast"):
    """One plan for both ways."""
    maker = Maker(model)
    choice = enumerated("QorAccuracyHint", hint)
    maker.query("qoriDCTFwdGetSize_32f", size(shape), choice, receives=["planBytes", "initBytes", "workBytes"])
    plan, memory = maker.allocate("QorDct2DPlan", "plan", "planBytes")
    init, _ = maker.allocate("uint8_t", "init", "initBytes", " + 1")
    maker.fill("qoriDCTFwdInit_32f", size(shape), choice, plan, init)
    return Plan(memory, {"DCTFwd", "DCTInv"}, tuple(shape[:2]), plan[0])


def adaptive_gauss_plan(model, shape, *, sigma=0.0):
    maker = Maker(model)
    region = size((1, 1))
    maker.query("qoriThresholdAdaptiveGaussGetBufferSize", region, size(shape), data_type("qor8u"), number(1),
                receives=["planBytes", "bufferBytes"])
    plan, memory = maker.allocate("QorAdaptiveGaussSpec", "plan", "planBytes")
    maker.fill("qoriThresholdAdaptiveGaussInit", region, size(shape), data_type("qor8u"), number(1),
               (literal(sigma), float(sigma)), plan)
    return Plan(memory, {"ThresholdAdaptiveGauss"}, None, plan[0], dict(size=shape))


def linear_filter_plan(model, kernel, dtype="uint8", channels=1, *, divisor=1, rounding="nearest_even"):
    maker = Maker(model)
    _, type_name = code_of(dtype)
    name, _ = model.name_of(kernel, "kernel")
    pointer = (name, ct.c_void_p(kernel.ctypes.data))
    kernel_type = "qor16s" if kernel.dtype == np.int16 else "qor32f"
    code = "16s" if kernel.dtype == np.int16 else "32f"
    maker.query("qoriFilterBorderGetSize", size(kernel.shape), size((1, 1)), data_type(type_name),
                data_type(kernel_type), number(channels), receives=["planBytes", "bufferBytes"])
    plan, memory = maker.allocate("QorLinearFilterPlan", "plan", "planBytes")
    pairs = [pointer, size(kernel.shape)] + ([number(divisor)] if code == "16s" else [])
    maker.fill(f"qoriFilterBorderInit_{code}", *pairs, data_type(type_name), number(channels),
               enumerated("QorRoundingMode", rounding), plan)
    return Plan(memory, {"FilterBorder"}, None, plan[0], dict(size=kernel.shape, kernel=C_NAME[kernel.dtype]))


def histogram_plan(model, levels, dtype="uint8", channels=1, *, lower=None, upper=None):
    """Levels as a list, or their number between two bounds."""
    maker = Maker(model)
    _, type_name = code_of(dtype)
    uniform = isinstance(levels, int)
    count = levels if uniform else len(levels)
    counts = listed("const int32_t", [str(count)] * channels), (ct.c_int32 * channels)(*[count] * channels)
    maker.query("qoriHistogramGetBufferSize", data_type(type_name), size((1, 1)), counts,
                number(channels), number(int(uniform)), receives=["planBytes", "bufferBytes"])
    plan, memory = maker.allocate("QorHistogramSpec", "plan", "planBytes")
    if uniform:
        bounds = [(listed("const float", [literal(v)] * channels), (ct.c_float * channels)(*[v] * channels))
                  for v in (lower, upper)]
        maker.fill("qoriHistogramUniformInit", data_type(type_name), *bounds, counts, number(channels), plan)
    else:
        row = np.ascontiguousarray(levels, np.float32)
        model.keep.append(row)
        name = model.named_list("levels", row)
        pointers = (ct.c_void_p * channels)(*[row.ctypes.data] * channels)
        maker.fill("qoriHistogramInit", data_type(type_name),
                   (listed("const float*", [name] * channels), pointers), counts, number(channels), plan)
    return Plan(memory, {"Histogram"}, None, plan[0], dict(levels=count, uniform=int(uniform)))


class HogConfig(ct.Structure):
    _fields_ = [("integers", ct.c_int32 * 5), ("sigma", ct.c_float), ("limit", ct.c_float), ("window", Pair)]


def hog_plan(model, window=(128, 64), *, cell=8, block=16, stride=8, bins=9, sigma=8.0, limit=0.2, columns_first=False):
    integers = [int(columns_first), cell, block, stride, bins]
    config = HogConfig((ct.c_int32 * 5)(*integers), sigma, limit, Pair(window[1], window[0]))
    model.keep.append(config)
    texts = [*map(str, integers), literal(sigma), literal(limit), f"{{{window[1]}, {window[0]}}}"]
    model.lines.append(f"const QorHogConfig config = {{{', '.join(texts)}}};")
    maker = Maker(model)
    pair = ("&config", ct.byref(config))
    maker.query("qoriHOGGetSize", pair, receives=["planBytes"])
    plan, memory = maker.allocate("QorHogPlan", "plan", "planBytes")
    maker.fill("qoriHOGInit", pair, plan)
    blocks = ((window[0] - 2 * cell) // stride + 1) * ((window[1] - 2 * cell) // stride + 1)
    return Plan(memory, {"HOG"}, None, plan[0], dict(length=blocks * 4 * bins))


MAKERS = {"ResizePlan": resize_plan, "WarpAffinePlan": warp_affine_plan, "FftPlan": fourier_plan("FFT"),
          "DftPlan": fourier_plan("DFT"), "DctPlan": dct_plan, "AdaptiveGaussPlan": adaptive_gauss_plan,
          "LinearFilterPlan": linear_filter_plan, "HistogramPlan": histogram_plan, "HogPlan": hog_plan}
