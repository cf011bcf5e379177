"""Many calls: drawn ones, a million of them, and threads on one plan."""
import functools
import gc
import random
import sys
import threading
import time
import warnings

import numpy as np
import qori
from hypothesis import HealthCheck, Phase, given, settings
from hypothesis import strategies as st

from cases import OPERATIONS, Case

warnings.simplefilter("ignore", qori.Warning)
PLANS = [qori.ResizePlan((5, 6), (3, 9)), qori.WarpAffinePlan((5, 6), (5, 6), ((1, 0, 1), (0, 1, 0))), qori.DctPlan((5, 6)),
         qori.DftPlan((5, 6)), qori.FftPlan((4, 8)), qori.HistogramPlan(5, lower=0, upper=256), qori.AdaptiveGaussPlan(3),
         qori.LinearFilterPlan(np.ones((3, 3), "f4")), qori.HogPlan((8, 8), cell=2, block=4, stride=2)]
FENCE = 173


class Fenced:
    """An array's elements inside a larger one whose other bytes must stay: padded, and upwards where `flip` says so."""

    def __init__(self, like, pad, flip):
        rows, row = like.shape[0], like[0].nbytes if like.shape[0] else 0
        self.base = np.full((rows + 2, row + 16 + pad), FENCE, "u1")
        self.used = np.zeros(self.base.shape, bool)
        self.used[1:rows + 1, 8:8 + row] = True
        steps = (self.base.strides[0], *np.empty(like.shape, like.dtype).strides[1:])
        self.view = np.ndarray(like.shape, like.dtype, self.base, self.base.strides[0] + 8, steps)[::-1 if flip else 1]
        self.view[...] = like

    def intact(self):
        return (self.base[~self.used] == FENCE).all()


NUMBERS = [-3, 0, 1, 2, 3, 7, 255, 300, 1 << 40, 0.5, float("nan"), float("inf"), 1 + 2j]
WORDS = ["horizontal", "diagonal", "3x3", "5x5", "less", "read_all", "replicate|read_top", "full", "float32", "uint8", "accurate"]
OTHERS = [None, True, (1, 2), (3, 3), (9, 9), (1, 2, 3), [0, 5, 9], [[1, 2], [3, 4]], b"x", object(), *PLANS]
DTYPES = ["u1", "i1", "u2", "i2", "u4", "i4", "f4", "f8", "c8", "?", "i8", "f2", ">u2"]
ARRAYS = [np.ones(shape, dtype) for dtype in DTYPES for shape in ((), (4,), (0, 3), (3, 4), (5, 6), (5, 6, 1), (5, 6, 2), (5, 6, 3),
                                                               (5, 6, 4), (2, 2, 2, 2))]
ANYTHING = [*NUMBERS, *WORDS, *OTHERS, *ARRAYS]
KEYWORDS = ["out", "scale", "keep_alpha", "channel", "mask", "dtype", "anchor", "border", "offset", "size", "src", "a", "b"]
MEMBERS = sorted(OPERATIONS)
OUTCOMES = {"result": 0, "reason": 0}


@functools.lru_cache(maxsize=None)
def keywords_of(name):
    return Case(OPERATIONS[name]).python


def one_call(draw):
    """A member's own arguments, in padded and flipped arrays, some of them exchanged for anything."""
    member = OPERATIONS[MEMBERS[draw(len(MEMBERS))]]
    keywords, fences = dict(keywords_of(member.name)), {}
    for _ in range(max(draw(4) - 1, 0)):
        key = sorted(keywords)[draw(len(keywords))] if draw(3) else KEYWORDS[draw(len(KEYWORDS))]
        keywords[key] = keywords["out"] if not draw(8) and "out" in keywords else ANYTHING[draw(len(ANYTHING))]
    for key, value in keywords.items():
        if isinstance(value, np.ndarray) and value.ndim in (2, 3) and value.flags.c_contiguous and draw(4):
            keywords[key] = fences.setdefault(id(value), Fenced(value, 8 * draw(2), not draw(5))).view
    try:
        getattr(qori, member.operation.snake)(**keywords)
        OUTCOMES["result"] += 1
    except (TypeError, ValueError) as error:
        assert str(error).startswith(member.operation.snake + ": "), error
        OUTCOMES["reason"] += 1
    assert all(x.intact() for x in fences.values())


@settings(max_examples=1000, deadline=None, database=None, derandomize=True, phases=[Phase.generate, Phase.shrink],
          suppress_health_check=list(HealthCheck))
@given(st.integers(0, 1 << 64))
def test_drawn_calls_end_in_a_result_or_a_reason(seed):
    draw = random.Random(seed).randrange
    for _ in range(10):
        one_call(draw)


def test_drawn_calls_were_of_both_kinds():
    assert min(OUTCOMES.values()) > 2000, OUTCOMES


def resident():
    with open("/proc/self/statm") as file:
        return int(file.read().split()[1]) * 4096


def test_a_million_calls_keep_memory_and_references():
    a, b, out = np.ones((8, 8), "u1"), np.ones((8, 8), "u1"), np.zeros((8, 8), "u1")
    small, plan, counts = np.ones((4, 4), "f4"), PLANS[0], np.zeros(4, "i4")
    source, halves = np.ones((5, 6), "u1"), [0, 9, 99]
    add, subtract, sum_, resize = qori.add, qori.subtract, qori.sum, qori.resize

    def failing(function, *arguments, **keywords):
        try:
            function(*arguments, **keywords)
        except (TypeError, ValueError):
            pass

    def round_of_calls():
        for _ in range(10):
            add(a, b, out=out)
            add(a, b)
            subtract(a, 1, scale=0)
            sum_(a)
            plan(source)
        resize(source, plan)
        failing(add, a, small)
        failing(add, a, 300)
        failing(add, a, b, out=out[:, ::2])
        failing(qori.divide, a, 0)
        failing(plan, a)
        qori.histogram_range(a, halves)
        qori.histogram_range(a, [0, 1, 2, 3, 4], out=counts)
        qori.filter_linear(a, small[:3, :3].copy())

    for _ in range(200):
        round_of_calls()
    gc.collect()
    objects = [a, b, out, small, plan, counts, source, halves, np.dtype("u1"), None, qori.Error]
    references, memory = list(map(sys.getrefcount, objects)), resident()
    for _ in range(1_000_000 // 59 + 1):
        round_of_calls()
    gc.collect()
    changed = [after - before for after, before in zip(map(sys.getrefcount, objects), references)]
    assert max(map(abs, changed[:8] + changed[10:])) == 0 and max(map(abs, changed)) < 50, changed
    assert resident() - memory < 1 << 20


def test_threads_share_a_plan():
    source = np.random.default_rng(3).integers(0, 255, (300, 400, 3), "u1")
    plan = qori.ResizePlan((300, 400), (211, 307), "cubic")
    wanted, wrong = plan(source), []

    def work():
        out = np.zeros_like(wanted)
        for _ in range(20):
            plan(source, out=out)
            if not (out == wanted).all():
                wrong.append(1)

    threads = [threading.Thread(target=work) for _ in range(8)]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    assert not wrong


def test_other_threads_run_while_a_large_call_does():
    source, ticks, stop = np.zeros((2000, 2000), "u1"), [], threading.Event()

    def tick():
        while not stop.is_set():
            ticks.append(time.perf_counter())
            time.sleep(0.0005)

    thread = threading.Thread(target=tick)
    thread.start()
    start = time.perf_counter()
    qori.filter_median(source, 31)
    end = time.perf_counter()
    stop.set()
    thread.join()
    assert sum(start < t < end for t in ticks) > 3
