"""What making a plan of the Python package is in C: the queries, the memory and the call that fills it."""
import ctypes as ct

import numpy as np

from calls import C_NAME, DATA_TYPE, TYPE_CODE, Pair, Plan, literal

INTERPOLATION = {"nearest": "interpNearest", "linear": "interpLinear", "cubic": "interpCubic", "super": "interpSuper",
                 "lanczos": "interpLanczos"}


def size_text(shape):
    return f"(QorImageSize){{{shape[1]}, {shape[0]}}}"


def size(shape):
    return size_text(shape), Pair(shape[1], shape[0])


def number(value):
    return str(value), value


class Maker:
    """Collects the arguments of one C call after the other; blocks of memory keep their C names."""

    def __init__(self, model):
        self.model, self.bytes = model, {}

    def query(self, name, *arguments, receives):
        declared = [r for r in receives if not any(r in line and line.startswith("int32_t") for line in self.model.lines)]
        if declared:
            self.model.lines.append(f"int32_t {', '.join(declared)};")
        holders = {r: (ct.c_int32 * 1)() for r in receives}
        pairs = list(arguments) + [("&" + r, holders[r]) for r in receives]
        self.model.call(self.model.members[name], [p[0] for p in pairs], [p[1] for p in pairs])
        self.bytes = {r: h[0] for r, h in holders.items()}

    def allocate(self, c_type, name, amount, extra=""):
        memory = np.zeros(self.bytes[amount] + 128, np.uint8)
        memory = memory[-memory.ctypes.data % 64:]
        name = self.model.unique(name)
        self.model.names[name] = b"allocated"
        self.model.keep.append(memory)
        self.model.lines.append(f"{c_type}* {name} = malloc({amount}{extra});")
        return (name, ct.c_void_p(memory.ctypes.data)), memory

    def fill(self, name, *pairs):
        self.model.call(self.model.members[name], [p[0] for p in pairs], [p[1] for p in pairs])


def code_of(dtype):
    element = C_NAME[np.dtype(dtype)]
    return TYPE_CODE[element], DATA_TYPE.get(element, "")


def data_type(name):
    from door_python import ENUMS
    return name, ENUMS["QorDataType"][name]


def resize_plan(model, src_shape, dst_shape, interpolation="linear", dtype="uint8", *, antialias=False, b=0.0, c=0.5, lobes=3):
    from door_python import ENUMS
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
        pairs += [(literal(b), float(b)), (literal(c), float(c))]
    if kind == "lanczos":
        pairs += [number(lobes)]
    pairs.append(plan)
    if kind in ("cubic", "lanczos") or antialias:
        pairs.append(maker.allocate("uint8_t", "init", "initBytes", " + 1")[0])
    init = f"qoriResizeAntialiasing{kind.capitalize()}Init" if antialias else f"qoriResize{kind.capitalize()}Init_{code}"
    maker.fill(init, *pairs)
    return Plan(memory, {"ResizeAntialiasing" if antialias else "Resize" + kind.capitalize()}, tuple(dst_shape[:2]), name=plan[0])


def warp_affine_plan(model, src_shape, dst_shape, matrix, interpolation="linear", dtype="uint8", channels=1, *, inverse=False,
                     border="constant", border_value=0, b=0.0, c=0.5):
    from door_python import ENUMS
    maker = Maker(model)
    _, type_name = code_of(dtype)
    method, interpolation = interpolation, INTERPOLATION[interpolation]
    (a, b_, c_), (d, e, f) = matrix                     # rows and columns; C maps x and y
    coefficients = np.array([e, d, f, b_, a, c_], np.float64)
    values = (ct.c_double * 4)(*(list(border_value) if np.ndim(border_value) else [border_value] * 4))
    model.keep += [coefficients, values]
    matrix_text = (model.named("matrix", coefficients), ct.c_void_p(coefficients.ctypes.data))
    border_pair = model.enumerated("QorBorderMode", border)
    maker.query("qoriWarpAffineGetSize", size(src_shape), size(dst_shape), data_type(type_name), matrix_text,
                (interpolation, ENUMS["QorInterpolationKind"][interpolation]), number(int(inverse)), border_pair,
                receives=["planBytes", "initBytes"])
    plan, memory = maker.allocate("QorWarpPlan", "plan", "planBytes")
    pairs = [size(src_shape), size(dst_shape), data_type(type_name), matrix_text, number(int(inverse)), number(channels)]
    if method == "cubic":
        pairs += [(literal(b, "double"), float(b)), (literal(c, "double"), float(c))]
    texts = ", ".join(literal(v, "double") for v in list(values)[:max(channels, 1)])
    pairs += [border_pair, (f"(const double[]){{{texts}}}", values), number(0), plan]
    if method == "cubic":
        pairs.append(maker.allocate("uint8_t", "init", "initBytes", " + 1")[0])
    maker.fill(f"qoriWarpAffine{method.capitalize()}Init", *pairs)
    return Plan(memory, {"WarpAffine" + method.capitalize()}, tuple(dst_shape[:2]), name=plan[0])


def fourier_plan(family):
    def make(model, shape, dtype="float32", *, norm="div_inv_by_n", hint="fast"):
        dtype = np.dtype(dtype)
        element = C_NAME[dtype]
        letter = "C_32fc" if dtype == np.complex64 else "R_32s" if dtype in (np.uint8, np.int32) else "R_32f"
        flag, choice = model.enumerated("QorFftNormFlag", norm), model.enumerated("QorAccuracyHint", hint)
        shape_pairs = [size(shape)] if family == "DFT" else [number(int(np.log2(n))) for n in shape[1::-1]]
        maker = Maker(model)
        if letter == "R_32s":
            name = model.unique("plan")
            holder = (ct.c_void_p * 1)()
            model.lines.append(f"QorFft2DPlan* {name};")
            maker.fill(f"qori{family}InitAlloc_{letter}", ("&" + name, holder), *shape_pairs, flag, choice)
            memory = (ct.c_uint8 * 1).from_address(holder[0])
            model.freed.append(f"qori{family}Free_{letter}({name});")
            memory = np.ctypeslib.as_array(memory)
            model.names[name] = b"plan"
            plan = (name, None)
        else:
            maker.query(f"qori{family}GetSize_{letter}", *shape_pairs, flag, choice,
                        receives=["planBytes", "initBytes", "workBytes"])
            plan, memory = maker.allocate("QorFft2DPlan", "plan", "planBytes")
            init, _ = maker.allocate("uint8_t", "init", "initBytes", " + 1")
            maker.fill(f"qori{family}Init_{letter}", *shape_pairs, flag, choice, plan, init)
        kind = "CToC" if letter == "C_32fc" else None
        names = {f"{family}Fwd_{kind or 'RToPack'}", f"{family}Inv_{kind or 'PackToR'}"}
        return Plan(memory, names, tuple(shape[:2]), name=plan[0], element=element)
    return make


def dct_plan(model, shape, *, hint="fast"):
    """One plan for both ways."""
    way = "Fwd"
    maker = Maker(model)
    choice = model.enumerated("QorAccuracyHint", hint)
    maker.query(f"qoriDCT{way}GetSize_32f", size(shape), choice, receives=["planBytes", "initBytes", "workBytes"])
    plan, memory = maker.allocate("QorDct2DPlan", "plan", "planBytes")
    init, _ = maker.allocate("uint8_t", "init", "initBytes", " + 1")
    maker.fill(f"qoriDCT{way}Init_32f", size(shape), choice, plan, init)
    return Plan(memory, {"DCTFwd", "DCTInv"}, tuple(shape[:2]), name=plan[0])


def adaptive_gauss_plan(model, shape, *, sigma=0.0):
    maker = Maker(model)
    region = ("(QorImageSize){1, 1}", Pair(1, 1))
    maker.query("qoriThresholdAdaptiveGaussGetBufferSize", region, size(shape), data_type("qor8u"), number(1),
                receives=["planBytes", "bufferBytes"])
    plan, memory = maker.allocate("QorAdaptiveGaussSpec", "plan", "planBytes")
    maker.fill("qoriThresholdAdaptiveGaussInit", region, size(shape), data_type("qor8u"), number(1),
               (literal(sigma), float(sigma)), plan)
    return Plan(memory, {"ThresholdAdaptiveGauss"}, None, name=plan[0], size=shape)


def linear_filter_plan(model, kernel, dtype="uint8", channels=1, *, divisor=1, rounding="nearest_even"):
    maker = Maker(model)
    _, type_name = code_of(dtype)
    name, _ = model.name_of(kernel, "kernel")
    pointer = (name, ct.c_void_p(kernel.ctypes.data))
    kernel_type = "qor16s" if kernel.dtype == np.int16 else "qor32f"
    code = "16s" if kernel.dtype == np.int16 else "32f"
    maker.query("qoriFilterBorderGetSize", size(kernel.shape), ("(QorImageSize){1, 1}", Pair(1, 1)), data_type(type_name),
                data_type(kernel_type), number(channels), receives=["planBytes", "bufferBytes"])
    plan, memory = maker.allocate("QorLinearFilterPlan", "plan", "planBytes")
    pairs = [pointer, size(kernel.shape)] + ([number(divisor)] if code == "16s" else [])
    maker.fill(f"qoriFilterBorderInit_{code}", *pairs, data_type(type_name), number(channels),
               model.enumerated("QorRoundingMode", rounding), plan)
    return Plan(memory, {"FilterBorder"}, None, name=plan[0], size=kernel.shape, kernel=C_NAME[kernel.dtype])


def histogram_plan(model, levels, dtype="uint8", channels=1, *, lower=None, upper=None):
    """Levels as a list, or their number between two bounds."""
    maker = Maker(model)
    _, type_name = code_of(dtype)
    uniform = isinstance(levels, int)
    count = levels if uniform else len(levels)
    counts = (f"(const int32_t[]){{{', '.join([str(count)] * channels)}}}", (ct.c_int32 * channels)(*[count] * channels))
    maker.query("qoriHistogramGetBufferSize", data_type(type_name), ("(QorImageSize){1, 1}", Pair(1, 1)), counts,
                number(channels), number(int(uniform)), receives=["planBytes", "bufferBytes"])
    plan, memory = maker.allocate("QorHistogramSpec", "plan", "planBytes")
    if uniform:
        bounds = [(f"(const float[]){{{', '.join([literal(v)] * channels)}}}", (ct.c_float * channels)(*[v] * channels))
                  for v in (lower, upper)]
        maker.fill("qoriHistogramUniformInit", data_type(type_name), *bounds, counts, number(channels), plan)
    else:
        row = np.ascontiguousarray(levels, np.float32)
        model.keep.append(row)
        name = model.named("levels", row)
        pointers = (ct.c_void_p * channels)(*[row.ctypes.data] * channels)
        maker.fill("qoriHistogramInit", data_type(type_name),
                   (f"(const float*[]){{{', '.join([name] * channels)}}}", pointers), counts, number(channels), plan)
    return Plan(memory, {"Histogram"}, None, name=plan[0], levels=count, uniform=int(uniform))


def hog_plan(model, window=(128, 64), *, cell=8, stride=None, bins=9, sigma=8.0, limit=0.2, columns_first=False):
    class Config(ct.Structure):
        _fields_ = [("ints", ct.c_int32 * 5), ("floats", ct.c_float * 2), ("window", Pair)]

    stride = cell if stride is None else stride
    order, clip = int(columns_first), limit
    config = Config((ct.c_int32 * 5)(order, cell, 2 * cell, stride, bins), (ct.c_float * 2)(sigma, clip), Pair(window[1], window[0]))
    model.keep.append(config)
    model.lines.append(f"const QorHogConfig config = {{{order}, {cell}, {2 * cell}, {stride}, {bins}, {literal(sigma)}, "
                       f"{literal(clip)}, {{{window[1]}, {window[0]}}}}};")
    maker = Maker(model)
    pair = ("&config", ct.byref(config))
    maker.query("qoriHOGGetSize", pair, receives=["planBytes"])
    plan, memory = maker.allocate("QorHogPlan", "plan", "planBytes")
    maker.fill("qoriHOGInit", pair, plan)
    blocks = ((window[0] - 2 * cell) // stride + 1) * ((window[1] - 2 * cell) // stride + 1)
    return Plan(memory, {"HOG"}, None, name=plan[0], length=blocks * 4 * bins)


MAKERS = {"ResizePlan": resize_plan, "WarpAffinePlan": warp_affine_plan, "FftPlan": fourier_plan("FFT"),
          "DftPlan": fourier_plan("DFT"), "DctPlan": dct_plan, "AdaptiveGaussPlan": adaptive_gauss_plan,
          "LinearFilterPlan": linear_filter_plan, "HistogramPlan": histogram_plan, "HogPlan": hog_plan}
