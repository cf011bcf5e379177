"""What the Python package costs beside NumPy, the C call and, where it is installed, another package; minima of rounds that
take turns, in one process. Ratios of one run count; nanoseconds are this machine's."""
import ctypes as ct
import subprocess
import sys
import threading
import time
import timeit

import numpy as np
import qori

try:
    import cv2
    cv2.setNumThreads(1)
except ImportError:
    cv2 = None


def minima(statements, names, rounds=60, number=4000):
    timers = {key: timeit.Timer(text, globals=names) for key, text in statements.items()}
    best = dict.fromkeys(statements, float("inf"))
    for _ in range(rounds):
        for key, timer in timers.items():
            best[key] = min(best[key], timer.timeit(number) / number * 1e9)
    return best


def report(title, value, bound, better="at most"):
    good = value <= bound if better == "at most" else value >= bound
    print(f"{title:58} {value:7.3f}   {better} {bound:5.3f}   {'' if good else 'MISSED'}")


def small_calls():
    a = np.arange(64, dtype="u1").reshape(8, 8)
    names = dict(qori=qori, np=np, cv2=cv2, a=a, b=a[::-1].copy(), o=np.zeros_like(a), half=np.zeros((4, 4), "u1"),
                 large=np.zeros((16, 16), "u1"), down=qori.ResizePlan((8, 8), (4, 4)), up=qori.ResizePlan((8, 8), (16, 16)))
    statements = {"add": "qori.add(a, b, out=o)", "made": "qori.add(a, b)", "numpy": "np.add(a, b, out=o)",
                  "down": "down(a, out=half)", "up": "up(a, out=large)"}
    if cv2:
        statements |= {"peer add": "cv2.add(a, b, dst=o)", "peer made": "cv2.add(a, b)",
                       "peer down": "cv2.resize(a, (4, 4), dst=half)", "peer up": "cv2.resize(a, (16, 16), dst=large)"}
    best = minima(statements, names)
    print("8x8 uint8, ns: " + ", ".join(f"{key} {value:.0f}" for key, value in best.items()))
    report("add(out=) / numpy.add(out=)", best["add"] / best["numpy"], 0.9)
    if cv2:
        report("add(out=) / peer's", best["add"] / best["peer add"], 0.45)
        report("add() / peer's", best["made"] / best["peer made"], 0.7)
        report("resize plan to 4x4 / peer's", best["down"] / best["peer down"], 0.4)
        report("resize plan to 16x16 / peer's", best["up"] / best["peer up"], 0.4)


def large_calls(folder):
    library = ct.CDLL(folder + "/libqorik5.so.8")
    size = type("Size", (ct.Structure,), {"_fields_": [("width", ct.c_int32), ("height", ct.c_int32)]})
    a, b, out = (np.random.default_rng(i).integers(0, 255, (1080, 1920, 3), "u1") for i in range(3))
    pointers = [x.ctypes.data_as(ct.c_void_p) for x in (a, b, out)]
    step, roi = ct.c_int32(1920 * 3), size(1920, 1080)
    arguments = (pointers[0], step, pointers[1], step, pointers[2], step, roi, ct.c_int32(0))
    names = dict(qori=qori, a=a, b=b, out=out, f=library.qoriAdd_8u_C3RSfs, arguments=arguments)
    best = minima({"python": "qori.add(a, b, out=out)", "c": "f(*arguments)"}, names, rounds=150, number=2)
    report("add of 1920x1080x3 / C", best["python"] / best["c"], 1.01)


def two_threads():
    source = np.random.default_rng(1).integers(0, 255, (1080, 1920), "u1")
    kernel = np.ones((7, 7), "i4")
    outs = [np.zeros((1074, 1914), "u1") for _ in range(2)]

    def work(out):
        for _ in range(8):
            qori.filter_linear(source, kernel, divisor=49, out=out)

    def timed(count):
        threads = [threading.Thread(target=work, args=(outs[i],)) for i in range(count)]
        start = time.perf_counter()
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        return (time.perf_counter() - start) / count

    one, two = (min(timed(n) for _ in range(9)) for n in (1, 2))
    report("7x7 filter: two threads over one", one / two, 1.8, "at least")


def importing():
    def seconds(code):
        return min(float(subprocess.run([sys.executable, "-c", "import time; t = time.perf_counter()\n" + code +
                                         "\nprint(time.perf_counter() - t)"], capture_output=True, text=True).stdout)
                   for _ in range(15))
    report("import after NumPy, ms more", (seconds("import numpy, qori") - seconds("import numpy")) * 1e3, 20)


if __name__ == "__main__":
    from pathlib import Path
    small_calls()
    large_calls(str(Path(qori.__file__).parent))
    two_threads()
    importing()
