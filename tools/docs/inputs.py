"""The pictures that recipes begin with, by name. One photograph; everything else is drawn, noise from fixed seeds."""
import functools

import numpy as np
from PIL import Image, ImageDraw, ImageFont

from paths import PHOTOGRAPH, TYPEFACE

HEIGHT, WIDTH = 168, 252


def scene():
    """Stands for the photograph where there is none: sky, hills, a roof of straight edges and fine lines."""
    y, x = np.mgrid[0:427, 0:640].astype(float)
    rgb = np.stack([120 + 90 * y / 427, 160 + 60 * y / 427, 235 - 40 * y / 427], -1)
    for k, (base, colour) in enumerate((((230, (90, 120, 80)), (290, (60, 95, 55))))):
        rgb[y > base + 40 * np.sin(x / (70 + 30 * k) + k)] = colour
    roof = (np.abs(x - 400) < (y - 150) * 1.4) & (y < 270) & (y > 150)
    rgb[roof] = (150, 60, 40)
    rgb[roof & ((x + y).astype(int) % 9 < 2)] = (95, 35, 25)
    rgb[(np.abs(x - 400) < 120) & (y >= 270) & (y < 370)] = (205, 190, 150)
    rgb[(np.abs(x - 400) < 110) & (y >= 280) & (y < 360) & (x.astype(int) % 22 < 4)] = (90, 70, 50)
    return Image.fromarray(rgb.clip(0, 255).astype(np.uint8))


@functools.cache
def original():
    return Image.open(PHOTOGRAPH).convert("RGB") if PHOTOGRAPH.exists() else scene()


def grey(rgb):
    return (rgb @ np.array([0.299, 0.587, 0.114]) + 0.5).astype(np.uint8)


def page():
    """A printed page in uneven light."""
    picture = Image.new("L", (WIDTH, HEIGHT), 255)
    draw = ImageDraw.Draw(picture)
    font, small = (ImageFont.truetype(str(TYPEFACE), s) for s in (19, 12))
    draw.text((14, 8), "Of light and lenses", 0, font)
    words = ("The shadow of a hand lies on the", "page, and no one grey tells ink", "from paper: what is dark here is",
             "bright there. So each place is", "held against its neighbours, and", "the ink stands out again. Lamps,",
             "folds and gutters do no harm.")
    for line, text in enumerate(words):
        draw.text((14, 40 + 17 * line), text, 0, small)
    y, x = np.mgrid[0:HEIGHT, 0:WIDTH]
    light = 1.05 - 0.75 * np.exp(-((x - 235) ** 2 / 9000 + (y - 150) ** 2 / 7000)) - 0.15 * x / WIDTH
    noise = np.random.default_rng(5).normal(0, 4, (HEIGHT, WIDTH))
    return ((60 + 0.72 * np.asarray(picture, float)) * light + noise).clip(0, 255).astype(np.uint8)


def shapes():
    picture = Image.new("L", (WIDTH, HEIGHT), 0)
    draw = ImageDraw.Draw(picture)
    draw.ellipse((20, 20, 100, 100), 255)
    draw.rectangle((130, 24, 225, 78), 255)
    draw.polygon([(40, 150), (80, 112), (120, 150)], 255)
    for i in range(6):
        draw.line((138 + 15 * i, 100, 138 + 15 * i, 152), 255, 1 + i)
    array = np.array(picture)
    random = np.random.default_rng(3)
    array[random.random(array.shape) < 0.012] ^= 255
    return array


def zone():
    """Rings that get finer outwards: frequencies to half the sampling rate at the edge."""
    y, x = np.mgrid[0:HEIGHT, 0:WIDTH].astype(float)
    r2 = (y - HEIGHT / 2) ** 2 + (x - WIDTH / 2) ** 2
    return (127.5 + 127.5 * np.cos(np.pi * r2 / WIDTH)).astype(np.uint8)


def disc():
    y, x = np.mgrid[0:HEIGHT, 0:WIDTH]
    return (((y - HEIGHT / 2) ** 2 + (x - WIDTH / 2) ** 2 < (0.42 * HEIGHT) ** 2) * 255).astype(np.uint8)


def speckle(array, share, seed=1):
    random = np.random.default_rng(seed)
    chosen, found = random.random(array.shape[:2]), array.copy()
    found[chosen < share / 2], found[chosen > 1 - share / 2] = 0, 255
    return found


def gauss_noise(array, deviation, seed=2):
    noise = np.random.default_rng(seed).normal(0, deviation, array.shape)
    return (array + noise).clip(0, 255).astype(np.uint8)


@functools.cache
def everything():
    photo = np.asarray(original().crop((20, 0, 620, 400)).resize((WIDTH, HEIGHT), Image.Resampling.BOX))
    gray = grey(photo)
    large = np.asarray(original().crop((20, 0, 620, 400)))
    y, x = np.mgrid[0:HEIGHT, 0:WIDTH]
    square = np.ascontiguousarray(large[40:296, 200:456])
    named = {
        "photo": photo, "gray": gray, "large": large, "square": grey(square),
        "dim": (photo * 0.28).astype(np.uint8), "noisy": gauss_noise(gray, 22), "speckled": speckle(gray, 0.1),
        "speckled_photo": speckle(photo, 0.1), "page": page(), "shapes": shapes(), "zone": zone(), "disc": disc(),
        "ramp": (x * 255 // (WIDTH - 1)).astype(np.uint8), "mirrored": np.ascontiguousarray(photo[:, ::-1]),
        "gray_f": gray.astype(np.float32) / 255, "square_f": grey(square).astype(np.float32) / 255,
        "balanced": gray.astype(np.int16) - 128, "tile": np.ascontiguousarray(gray[60:96, 96:144]),
        "stars": star_field(),
    }
    for array in named.values():
        array.setflags(write=False)
    return named


def star_field():
    random = np.random.default_rng(8)
    field = np.zeros((HEIGHT, WIDTH))
    y, x = np.mgrid[0:HEIGHT, 0:WIDTH]
    for row, column, light in random.uniform((0, 0, 40), (HEIGHT, WIDTH, 255), (40, 3)):
        field += light * np.exp(-((y - row) ** 2 + (x - column) ** 2) / 3)
    return (field + random.normal(12, 4, field.shape)).clip(0, 255).astype(np.uint8)
