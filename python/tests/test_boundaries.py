"""What other exporters of buffers, other owners of memory and odd calls make of the package's core."""
import ctypes
import subprocess
import sys

import numpy as np
import pytest
import qori
from qori import _core


def ramp(*shape, dtype="u1"):
    return (np.arange(np.prod(shape)) % 251).reshape(shape).astype(dtype)


# --- buffers

def test_arrays_of_ctypes_leave_out_their_strides():
    source = ramp(6, 8, 3)
    foreign = (((ctypes.c_ubyte * 3) * 8) * 6).from_buffer_copy(source.tobytes())
    assert (qori.mirror(foreign, "vertical") == source[:, ::-1]).all()
    out = ((ctypes.c_float * 8) * 6)()
    assert qori.convert(source[..., 0].copy(), out=out) is out and np.asarray(out)[5, 7] == source[5, 7, 0]
    levels, bins = (ctypes.c_int32 * 3)(0, 100, 251), (ctypes.c_int32 * 2)()
    assert qori.histogram_range(source[..., 0].copy(), levels, out=bins) is bins and sum(bins) == 48


def test_lists_of_buffers_that_are_their_own_shape():
    backwards = bytes(range(255, -1, -1))
    for table in (backwards, bytearray(backwards), memoryview(backwards), np.frombuffer(backwards, "u1")):
        assert (qori.lut_palette(ramp(8, 8), table) == 255 - ramp(8, 8)).all()
    with pytest.raises(ValueError, match="7 entries"):
        qori.lut_palette(ramp(8, 8), backwards[:7])


def test_images_of_the_library_are_no_block_of_bytes():
    class Buffer(ctypes.Structure):
        _fields_ = [("buf", ctypes.c_void_p), ("obj", ctypes.c_void_p), ("rest", ctypes.c_char * 128)]

    def asked(image, flags):
        view = Buffer()
        ctypes.pythonapi.PyObject_GetBuffer(ctypes.py_object(image), ctypes.byref(view), flags)
        ctypes.pythonapi.PyBuffer_Release(ctypes.byref(view))

    padded, packed = qori.empty((3, 5)), qori.empty((3, 64))
    strides, c_order, fortran_order, any_order = 0x18, 0x38, 0x58, 0x98
    for flags in (0, c_order, fortran_order, any_order):
        with pytest.raises(BufferError, match="strides are needed"):
            asked(padded, flags)
    asked(padded, strides)
    for flags in (0, strides, c_order, any_order):
        asked(packed, flags)
    with pytest.raises(BufferError):
        asked(packed, fortran_order)


def test_without_numpy_members_without_steps_write_whole_rows():
    code = """import sys; sys.modules['numpy'] = None
import qori
image = qori.empty((128, 96)); view = memoryview(image)
for y in range(128):
    for x in range(96): view[y, x] = x * y % 251
plan = qori.HogPlan((32, 32))
many = memoryview(qori.hog(image, plan, locations=[(0, 0), (16, 16), (40, 7)])).tolist()
print(all(memoryview(qori.hog(image, plan, locations=[at])).tolist() == [many[i]] for i, at in enumerate([(0, 0), (16, 16), (40, 7)])))
plan = qori.WarpAffinePlan((128, 96), (100, 33), ((1, 0, 1000), (0, 1, 0)), 'nearest', border='read_all')
print(sum(map(sum, memoryview(plan(image)).tolist())))"""
    done = subprocess.run([sys.executable, "-c", code], capture_output=True, text=True)
    assert done.stdout == "True\n0\n", done


def test_bytes_that_lie_anywhere():
    """Elements need not lie at multiples of their size, nor rows at multiples of them."""
    for dtype in ("u2", "i2", "i4", "f4"):
        item = np.dtype(dtype).itemsize
        memory = np.zeros(9 * (17 * item + 1) + 1, "u1")
        odd = np.ndarray((9, 17), dtype, memory, 1, (17 * item + 1, item))
        odd[...] = ramp(9, 17)
        assert (qori.copy(odd) == odd).all()
        even = odd.copy()
        if dtype != "i4":
            assert (qori.multiply(odd, odd) == qori.multiply(even, even)).all()


# --- what a call writes

def test_lists_written_lie_apart():
    image = np.zeros((8, 8, 3), "u1")
    grey, bins = np.zeros((8, 8), "u1"), np.zeros(4, "i4")
    levels = np.arange(5, dtype="i4")
    for call in (lambda: qori.histogram_range(grey, levels, out=grey.reshape(-1)[:16].view("i4")),
                 lambda: qori.histogram_range(grey, levels, out=levels[1:]),
                 lambda: qori.histogram_range(image, [levels] * 3, out=[bins, bins, bins])):
        with pytest.raises(ValueError, match="argument out: an array that shares memory"):
            call()
    wide = np.zeros(9, "i4")
    assert qori.histogram_range(grey, [0, 1], out=wide[::9]) [0] == 64      # the stride of one element is no stride


def test_a_plans_direct_way_is_the_general_one():
    plan, source, out = qori.ResizePlan((8, 8), (4, 4)), ramp(8, 8), np.full((4, 4), 9, "u1")
    wanted = plan(source)
    assert plan(source, out=out) is out and (out == wanted).all()
    assert plan(source, out[::-1]) is not None and (out[::-1] == wanted).all()
    assert (plan(source, None) == wanted).all() and (plan(source, out=None) == wanted).all()
    held = ramp(12, 12)
    refused = [(held[2:10, 2:10], held[3:7, 3:7], ValueError, "shares memory|does not run in place"),
               (source, np.zeros((4, 5), "u1"), ValueError, "accepted is .4, 4."),
               (source[:7], out, ValueError, "the plan is for"), (source, np.zeros((4, 4), "u2"), TypeError, "no form"),
               (source, np.broadcast_to(out[:1], (4, 4)), ValueError, "read-only"), (source, [1], TypeError, "argument out"),
               ([1], out, TypeError, "argument src"), (source.astype("f4"), out.astype("f4"), TypeError, "no form"),
               (source, np.lib.stride_tricks.as_strided(out, (4, 4), (2, 1)), ValueError, "rows that do not overlap")]
    for a, b, kind, text in refused:
        for call in (lambda: plan(a, b), lambda: plan(a, out=b)):
            with pytest.raises(kind, match=text):
                call()
    with pytest.raises(TypeError, match="no argument 'into'"):
        plan(source, into=out)
    assert plan(source, offset=(0, 0), out=out[:2]) is not None             # keywords beside out= and alone
    with pytest.raises(ValueError, match="needs out="):
        plan(source, offset=(0, 0))


def test_weighted_rows_make_one_row():
    source = ramp(3, 5, dtype="f4")
    made = qori.sum_weighted_rows(source, [1.0, 2.0, 3.0])
    assert made.shape == (5,) and (made == np.float32([1, 2, 3]) @ source).all()
    for out in (np.zeros(5, "f4"), np.zeros((1, 5), "f4")):
        assert qori.sum_weighted_rows(source, [1.0, 2.0, 3.0], out=out) is out and (out == made).all()


# --- what is refused

REFUSED = [
    (lambda: qori.ResizePlan((8, 8), (16, 16), "super"), "argument dst_shape: .16, 16. came; 'super' reduces"),
    (lambda: qori.ResizePlan((1, 8), (4, 4)), "argument src_shape: .1, 8. came; .* from 2 on"),
    (lambda: qori.ResizePlan((5, 8), (4, 4), "lanczos3"), "from 6 on"),
    (lambda: qori.ResizePlan((0, 8), (4, 4)), "ResizePlan: "),
    (lambda: qori.WarpAffinePlan((0, 5), (4, 4), ((1, 0, 0), (0, 1, 0))), "WarpAffinePlan: "),
    (lambda: qori.DctPlan((0, 5)), "DctPlan: "),
    (lambda: qori.DftPlan((5, 0)), "DftPlan: "),
    (lambda: qori.HistogramPlan(0, lower=0, upper=3), "HistogramPlan: "),
    (lambda: qori.HistogramPlan([0, 1], channels=1 << 40), "HistogramPlan: an integer came that 32 bits do not hold"),
    (lambda: qori.ResizePlan((8, 8), (4, 4), lobes=-1 << 40), "ResizePlan: an integer came"),
    (lambda: qori.HogPlan(cell=1 << 31), "HogPlan: an integer came"),
    (lambda: qori.ResizePlan((8, 8), (4, 4)).src_roi((1 << 40, 0, 1, 1)), "src_roi: an integer came"),
    (lambda: qori.pad_constant(np.broadcast_to(ramp(1, 4), (2**31 - 1, 4)), 0, np.zeros((4, 4), "u1"),
                               before=(2**31 - 1, 0)), "argument before: a frame"),
    (lambda: qori.divide(ramp(2, 2), 0, out=None), r"qoriDivC_8u_C1RSfs"),
]


@pytest.mark.parametrize("number", range(len(REFUSED)))
def test_refusals(number):
    call, text = REFUSED[number]
    with pytest.raises(ValueError, match=text):
        call()


def test_an_error_names_the_member_that_was_called():
    image = ramp(2, 2)
    with pytest.raises(qori.Error, match=r"qoriDivC_8u_C1IRSfs"):
        qori.divide(image, 0, out=image)


def test_a_lack_of_memory_is_an_error_of_both_kinds():
    code = """import resource, qori
resource.setrlimit(resource.RLIMIT_AS, (400 << 20, 400 << 20))
try:
    qori.DftPlan((104729, 104729), 'uint8')
except qori.Error as error:
    print(error.code, isinstance(error, MemoryError))"""
    done = subprocess.run([sys.executable, "-c", code], capture_output=True, text=True)
    assert done.stdout == "-9 True\n", done


def test_bounds_of_a_plan_may_be_none():
    assert repr(qori.HistogramPlan([0, 1, 2], lower=None, upper=None)) == repr(qori.HistogramPlan([0, 1, 2]))


def test_processors_without_avx2_or_fma_do_not_import():
    _core._require(True, True)
    for avx2, fma, text in ((True, False, "has no FMA$"), (False, True, "has no AVX2$"), (False, False, "no AVX2 and no FMA$")):
        with pytest.raises(ImportError, match=text):
            _core._require(avx2, fma)
    # The module itself must get as far as to say so: none of its instructions is one of these extensions'.
    listed = subprocess.run(["objdump", "-d", "--no-show-raw-insn", _core.__file__], capture_output=True, text=True, check=True).stdout
    assert "%xmm" in listed and "%ymm" not in listed and "vfmadd" not in listed
