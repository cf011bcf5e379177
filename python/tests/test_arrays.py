"""Views, layouts and keywords of arrays, and what is refused: by an exception that says what to do."""
import array
import threading
import warnings

import numpy as np
import pytest
import qori


def ramp(*shape, dtype="u1"):
    return (np.arange(np.prod(shape)) % 251).reshape(shape).astype(dtype)


# --- what is taken

def test_views_cropped_flipped_padded_and_of_length_one():
    big, out = ramp(20, 30), np.full((24, 40), 7, "u1")
    crop, inner = big[3:13, 5:25], out[2:12, 4:24]
    assert qori.add(crop, crop[::-1].copy(), out=inner) is inner
    assert (inner == np.minimum(crop.astype(int) + crop[::-1], 255)).all()
    assert (out[:2] == 7).all() and (out[12:] == 7).all() and (out[:, :4] == 7).all() and (out[:, 24:] == 7).all()
    upwards = np.zeros((10, 20), "u1")[::-1]
    assert (qori.copy(crop[::-1], out=upwards) == crop[::-1]).all()
    row = np.lib.stride_tricks.as_strided(big, (1, 8), (1 << 40, 1))            # a stride that is never taken
    assert (qori.copy(row) == big[:1, :8]).all()
    column = big[:, 4:5]
    assert (qori.absolute(column.astype("i2")) == column).all()
    assert qori.copy(ramp(4, 5, 1)).shape == (4, 5, 1)


def test_planes_alpha_and_channels():
    rgb = ramp(6, 7, 3)
    planes = np.zeros((3, 6, 7), "u1").transpose(1, 2, 0)
    assert (qori.copy(rgb, out=planes) == rgb).all() and (qori.copy(planes) == rgb).all()
    rgba = np.full((6, 7, 4), 9, "u1")
    qori.copy(rgb, out=rgba, keep_alpha=True)
    assert (rgba[..., :3] == rgb).all() and (rgba[..., 3] == 9).all()
    qori.add(rgba, rgba, out=rgba, keep_alpha=True)
    assert (rgba[..., 3] == 9).all() and (qori.sum(rgba, keep_alpha=True) == rgba[..., :3].sum((0, 1))).all()
    assert (qori.copy(rgb) == rgb).all() and (qori.copy(rgb, channel=2) == rgb[..., 2]).all()
    qori.copy(rgb[..., 0].copy(), out=rgba, channel=1)
    assert (rgba[..., 1] == rgb[..., 0]).all() and (rgba[..., 3] == 9).all()
    mask = rgb[..., 0] > 3
    qori.fill(rgb, (1, 2, 3), mask=mask)
    assert (rgb[mask] == (1, 2, 3)).all()


def test_in_place_is_the_array_itself():
    for dtype in ("u1", "u2", "i2", "f4", "c8"):
        a, b = ramp(9, 5, dtype=dtype), ramp(9, 5, dtype=dtype) + np.ones(1, dtype)
        wanted = qori.subtract(a, b)
        for target in (a, b):
            copies = a.copy(), b.copy()
            out = copies[0] if target is a else copies[1]
            assert qori.subtract(*copies, out=out) is out and (out == wanted).all()
    picture = ramp(12, 12)
    wanted = qori.filter_box(picture, 3)
    assert (qori.filter_box(picture, 3, out=picture[1:-1, 1:-1]) == wanted).all()
    grown = np.zeros((8, 9), "u1")
    grown[2:6, 3:7] = ramp(4, 4)
    wanted = np.pad(ramp(4, 4), ((2, 2), (3, 2)), "edge")
    assert (qori.pad_replicate(grown[2:6, 3:7], out=grown, before=(2, 3)) == wanted).all()


def test_arguments_stand_in_natural_order():
    a, b = np.full((2, 3), 9, "i2"), np.full((2, 3), 4, "i2")
    assert (qori.subtract(a, b) == 5).all() and (qori.divide(a, b) == 2).all() and (qori.divide(a, b, rounding="toward_zero") == 2).all()
    assert (qori.subtract(a, 4) == 5).all() and (qori.divide(a, 3) == 3).all()
    assert qori.max_index(ramp(3, 4)) == (11, (2, 3))
    assert qori.min_max(ramp(3, 4, 3)) == ((0, 1, 2), (33, 34, 35))
    assert qori.ResizePlan((4, 8, 3), (2, 16, 3)).src_shape == (4, 8)                 # photo.shape serves as it is
    photo = ramp(16, 16)
    assert (qori.HogPlan((16, 16), cell=4)(photo) == qori.HogPlan((16, 16), cell=4, block=8, stride=4)(photo)).all()
    tall = qori.ResizePlan((4, 8), (2, 16))
    assert tall(ramp(4, 8)).shape == (2, 16) and (tall.src_shape, tall.dst_shape) == ((4, 8), (2, 16))
    shift = qori.WarpAffinePlan((5, 6), (5, 6), ((1, 0, 1), (0, 1, 2)), "nearest")      # one row down, two columns right
    assert (shift(ramp(5, 6))[1:, 2:] == ramp(5, 6)[:-1, :-2]).all()


def test_other_buffers_and_images_of_the_library():
    data = array.array("H", range(12))
    image = memoryview(data).cast("B").cast("H", (3, 4))
    assert (qori.convert(image, dtype="float32") == np.arange(12).reshape(3, 4)).all()
    made = qori.empty((3, 5, 3), "uint16")
    view = np.asarray(made)
    assert made.shape == (3, 5, 3) and view.strides[0] == 64 and view.dtype == "u2"
    assert qori.fill(made, (1, 2, 3)) is made and (view == (1, 2, 3)).all()
    pair = np.zeros((2, 2), [("re", "i2"), ("im", "i2")])
    assert (qori.add(pair, 3 - 2j)["im"] == -2).all()


def test_tiles_of_a_plan_are_the_whole():
    plan, source = qori.ResizePlan((40, 60), (31, 47), "lanczos3"), ramp(40, 60, 3)
    whole, tiles = plan(source), np.zeros((31, 47, 3), "u1")
    for y in range(0, 31, 10):
        for x in range(0, 47, 16):
            tile = tiles[y:y + 10, x:x + 16]
            plan(source, out=tile, offset=(y, x))
    assert (tiles == whole).all()


def test_borders_in_memory_take_larger_sources():
    source = ramp(12, 14)
    inner = qori.filter_box_border(source, (3, 5), border="read_all")
    assert inner.shape == (10, 10) and (inner == qori.filter_box(source, (3, 5))).all()
    half = qori.filter_box_border(source, 3, border="replicate|read_top")
    assert half.shape == (11, 14) and (half == qori.filter_box_border(source, 3)[1:]).all()


# --- what is refused

REFUSED = [
    (lambda a: qori.add([[1]], a), TypeError, "argument a: .*list.*accepted are arrays.*numpy.asarray"),
    (lambda a: qori.add(a, a.astype("f2")), TypeError, "argument b: .*float16.*astype"),
    (lambda a: qori.add(a.astype(">i2"), a), TypeError, "argument a: .*big-endian.*native byte order"),
    (lambda a: qori.add(a.astype("O"), a), TypeError, "argument a: "),
    (lambda a: qori.add(a.astype("?"), a), TypeError, "boolean"),
    (lambda a: qori.add(a.astype("M8[s]"), a), TypeError, "argument a: "),
    (lambda a: qori.add(a[0], a), (TypeError, ValueError), "add: "),
    (lambda a: qori.add(a[None, None], a), ValueError, "4 dimensions.*accepted are .height, width."),
    (lambda a: qori.add(np.zeros((2, 2, 5), "u1"), a), ValueError, "5 channels.*1, 3 or 4"),
    (lambda a: qori.add(a, a[:4]), ValueError, r"argument b: uint8 \(4, 8\) came; accepted .*uint8 \(8, 8\)"),
    (lambda a: qori.add(a, a.astype("i2")), ValueError, "argument b: int16"),
    (lambda a: qori.add(a, a, out=np.zeros((8, 8), "u2")), TypeError, "no form takes .*into uint16"),
    (lambda a: qori.add(a, a, out=np.zeros((8, 9), "u1")), ValueError, "argument out: .*accepted is .8, 8."),
    (lambda a: qori.add(a, a, out=bytes(64)), (TypeError, ValueError), "argument out|no form"),
    (lambda a: qori.copy(a[:7], out=a[1:]), ValueError, "shares memory.*pass a copy"),
    (lambda a: qori.filter_gauss(a, "3x3", out=a[1:-1, 1:-1]), ValueError, "does not run in place"),
    (lambda a: qori.add(a[:, ::2], a), ValueError, "steps of 2 bytes.*ascontiguousarray"),
    (lambda a: qori.add(a, a, out=np.broadcast_to(a[:1], (8, 8))), ValueError, "read-only"),
    (lambda a: qori.add(a, a, out=np.lib.stride_tricks.as_strided(a, (8, 8), (0, 1))), ValueError, "rows that do not overlap"),
    (lambda a: qori.copy(np.lib.stride_tricks.as_strided(a, (2, 8), (1 << 33, 1))), ValueError, "steps of 32 bits"),
    (lambda a: qori.add(a, 256), ValueError, "argument b: 256 came; accepted are integers from 0 to 255"),
    (lambda a: qori.add(a, 1.5), TypeError, "argument b: 1.5 of type float came; accepted is an integer"),
    (lambda a: qori.add(a, float("nan")), TypeError, "accepted is an integer"),
    (lambda a: qori.add(a, (1, 2)), ValueError, "2 values came; accepted are 1"),
    (lambda a: qori.add(a, a, scale=1 << 40), ValueError, "argument scale"),
    (lambda a: qori.add(a.astype("f4"), 1e300), ValueError, "range of float32"),
    (lambda a: qori.add(a), TypeError, "argument b: is missing"),
    (lambda a: qori.add(a, a, None, 3), TypeError, "4 positional arguments came; accepted are at most 3"),
    (lambda a: qori.add(a, a, size=3), TypeError, "no argument 'size'"),
    (lambda a: qori.add(a, a, a=a), TypeError, "came twice"),
    (lambda a: qori.convert(a), TypeError, "say which by dtype="),
    (lambda a: qori.convert(a, dtype="int64"), TypeError, "no form"),
    (lambda a: qori.mirror(a, "sideways"), ValueError, "argument axis: 'sideways' came; accepted are 'horizontal', 'vertical'"),
    (lambda a: qori.filter_box(a, 9), ValueError, "accepted are larger images"),
    (lambda a: qori.filter_box(a, "3x3"), TypeError, "pair .rows, columns."),
    (lambda a: qori.filter_linear(a, np.ones((3, 3), "i8")), TypeError, "no form"),
    (lambda a: qori.filter_linear(a, np.ones((3, 3), "i4"), anchor=(3, 0)), ValueError, "positions in the kernel"),
    (lambda a: qori.copy(np.zeros((2, 2, 3), "u1"), channel=3), ValueError, "argument channel"),
    (lambda a: qori.add(np.zeros((2, 2, 4), "u1"), 1, keep_alpha=True), ValueError, "keep_alpha= and channel="),
    (lambda a: qori.ResizePlan((8, 8), (4, 4))(a[:7]), ValueError, "the plan is for .8, 8."),
    (lambda a: qori.ResizePlan((8, 8), (4, 4))(a.astype("f4")), TypeError, "no form"),
    (lambda a: qori.resize(a, qori.DctPlan((8, 8))), TypeError, "argument plan: .*DctPlan came; accepted is a ResizePlan"),
    (lambda a: qori.resize(a, "linear"), TypeError, "argument plan"),
    (lambda a: qori.ResizePlan((8, 8, 5), (4, 4)), ValueError, "src_shape"),
    (lambda a: qori.ResizePlan((8, 8), (4, 4), "best"), ValueError, "'lanczos3'"),
    (lambda a: qori.FftPlan((8, 12)), ValueError, "powers of 2"),
    (lambda a: qori.lut_palette(a, np.zeros(100, "u1")), ValueError, "powers of 2"),
    (lambda a: qori.lut_palette(np.zeros((2, 2, 4), "u1"), [np.zeros(n, "u1") for n in (8, 8, 8, 2)]), ValueError, "2 entries"),
    (lambda a: qori.histogram_range(a, np.arange(5)), TypeError, "accepted is int32"),
]


@pytest.mark.parametrize("number", range(len(REFUSED)))
def test_refusals_say_what_to_do(number):
    function, kind, text = REFUSED[number]
    with pytest.raises(kind, match=text):
        function(ramp(8, 8))


def test_statuses_raise_and_warn():
    a = ramp(4, 4)
    with pytest.raises(qori.Error, match="QOR_ERR_DIV_BY_ZERO") as caught:
        qori.divide(a, 0)
    assert caught.value.code == -10 and isinstance(caught.value, ValueError)
    with pytest.raises(qori.Error) as caught:
        qori.sqrt(np.zeros((0, 5), "u1"), out=np.zeros((0, 5), "u1"))
    assert caught.value.code == -6
    with pytest.raises(qori.Error, match="rows -4 bytes apart.*ascontiguousarray") as caught:
        qori.multiply_fraction(a[::-1], a, out=np.zeros_like(a))
    with pytest.warns(qori.Warning, match="QOR_WARN_DIV_BY_ZERO"):
        qori.divide(a, np.zeros_like(a))
    with warnings.catch_warnings():
        warnings.simplefilter("error")
        with pytest.raises(qori.Warning):
            qori.divide(a, np.zeros_like(a))


def test_a_buffer_is_held_while_a_call_runs():
    source = bytearray(64 << 20)
    image = memoryview(source).cast("B", (8192, 8192))
    refused = threading.Event()

    def grow():
        for _ in range(10000):
            try:
                source.append(0)
                source.pop()
            except BufferError:
                refused.set()

    thread = threading.Thread(target=grow)
    with pytest.raises(BufferError):
        source.append(0)                                # a memoryview holds it too
    thread.start()
    qori.filter_median(image, 3)
    thread.join()
    assert refused.is_set()
