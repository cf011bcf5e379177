"""Thumbnails of a folder of pictures, on all cores, with progress: thumbnails.py FOLDER TARGET [SIDE]

Threads share the plans: pictures of one size are resized by one plan, and while a resize runs the others go on.
"""
import functools
import os
import sys
from concurrent.futures import ThreadPoolExecutor, as_completed
from pathlib import Path

import numpy as np
import qori
from PIL import Image

PICTURES = {".png", ".jpg", ".jpeg", ".bmp", ".tif", ".tiff"}


@functools.lru_cache(maxsize=64)
def plan_for(height: int, width: int, side: int) -> qori.ResizePlan:
    scale = side / max(height, width)
    size = max(round(height * scale), 1), max(round(width * scale), 1)
    return qori.ResizePlan((height, width), size, "linear", antialias=True)


def thumbnail(path: Path, target: Path, side: int) -> Path:
    with Image.open(path) as picture:
        pixels = np.asarray(picture.convert("RGB"))
    height, width, _ = pixels.shape
    made = plan_for(height, width, side)(pixels)
    place = target / (path.stem + ".png")
    Image.fromarray(made).save(place)
    return place


def main(folder: Path, target: Path, side: int) -> int:
    pictures = sorted(p for p in folder.iterdir() if p.suffix.lower() in PICTURES)
    target.mkdir(parents=True, exist_ok=True)
    failed = 0
    with ThreadPoolExecutor(os.cpu_count()) as pool:
        tasks = {pool.submit(thumbnail, p, target, side): p for p in pictures}
        for done, task in enumerate(as_completed(tasks), 1):
            if error := task.exception():
                failed += 1
                print(f"\r{tasks[task].name}: {error}", file=sys.stderr)
            print(f"\r{done} of {len(pictures)}", end="", file=sys.stderr, flush=True)
    print(file=sys.stderr)
    return 1 if failed else 0


if __name__ == "__main__":
    if len(sys.argv) not in (3, 4):
        sys.exit(__doc__)
    sys.exit(main(Path(sys.argv[1]), Path(sys.argv[2]), int(sys.argv[3]) if len(sys.argv) == 4 else 256))
