"""How results become pictures of bytes. Recipes name these functions."""
import numpy as np
from PIL import Image, ImageDraw

LIMIT = 20 * 1024
ACCENT = (11, 110, 114)


def scaled(array):
    """From the least to the greatest value."""
    array = np.asarray(array, float)
    low, high = array.min(), array.max()
    return ((array - low) * (255 / (high - low or 1))).astype(np.uint8)


def unit(array):
    """Values from 0 to 1."""
    return (np.clip(array, 0, 1) * 255 + 0.5).astype(np.uint8)


def signed(array, gain=1.0):
    """Zero is mid-grey."""
    return np.clip(128 + np.asarray(array, float) * gain, 0, 255).astype(np.uint8)


def bits12(array):
    """Twelve bits in sixteen."""
    return np.clip(np.asarray(array) >> 4, 0, 255).astype(np.uint8)


def loglight(array):
    """Magnitudes, logarithmically."""
    return scaled(np.log1p(np.abs(array)))


def centred_spectrum(array):
    """Frequency 0 in the middle, logarithmically."""
    return loglight(np.fft.fftshift(array))


def bars(lists, levels=None):
    """One chart of a list, three above each other of three."""
    lists = [np.asarray(lists)] if np.ndim(lists[0]) == 0 else [np.asarray(row) for row in lists]
    height, width = 168, 252
    picture = Image.new("RGB", (width, height), (250, 250, 250))
    draw = ImageDraw.Draw(picture)
    colours = [ACCENT] if len(lists) == 1 else [(190, 60, 50), (60, 140, 70), (50, 90, 180)]
    part = height // len(lists)
    for index, (row, colour) in enumerate(zip(lists, colours)):
        base, high = (index + 1) * part - 4, max(int(row.max()), 1)
        step = (width - 8) / len(row)
        for i, value in enumerate(row):
            left = 4 + i * step
            draw.rectangle((left, base - value / high * (part - 10), left + max(step - (step > 4), 0.6), base), colour)
    return np.array(picture)


def frame(array, row, column, height, width):
    """The picture with a rectangle."""
    picture = Image.fromarray(np.asarray(array)).convert("RGB")
    corners = column, row, column + width - 1, row + height - 1
    ImageDraw.Draw(picture).rectangle(corners, outline=(255, 190, 40), width=2)
    return np.array(picture)


def best(scores):
    """(row, column) of the greatest score."""
    return np.unravel_index(np.argmax(scores), scores.shape)


def beside(*arrays):
    colour = [np.asarray(a) if np.ndim(a) == 3 else np.repeat(np.asarray(a)[..., None], 3, 2) for a in arrays]
    height = max(a.shape[0] for a in colour)
    padded = [np.pad(a, ((0, height - a.shape[0]), (0, 4), (0, 0)), constant_values=255) for a in colour]
    return np.concatenate(padded, 1)[:, :-4]


def enlarged(array, factor):
    return np.repeat(np.repeat(np.asarray(array), factor, 0), factor, 1)


def over_checks(array):
    """Alpha over a pattern of squares."""
    array = np.asarray(array)
    y, x = np.mgrid[0:array.shape[0], 0:array.shape[1]]
    checks = np.where((y // 8 + x // 8) % 2, 190, 230)[..., None]
    alpha = array[..., 3:4] / 255
    return (array[..., :3] * alpha + checks * (1 - alpha)).astype(np.uint8)


def graph(values, low=None, high=None):
    """Values over their index, 0 to 255 or between bounds."""
    values = np.asarray(values, float).ravel()
    low, high = values.min() if low is None else low, values.max() if high is None else high
    picture = Image.new("RGB", (252, 168), (250, 250, 250))
    draw = ImageDraw.Draw(picture)
    x, y = 244 / max(len(values) - 1, 1), 156 / (high - low or 1)
    points = [(4 + i * x, 162 - (v - low) * y) for i, v in enumerate(values)]
    draw.line(points, ACCENT, 2)
    return np.array(picture)


def gradients(descriptor, window, cell=8, bins=9):
    """Of each cell the edges that its histogram tells, one stroke a bin, as bright as the mean of its blocks."""
    rows, columns = window[0] // cell, window[1] // cell
    blocks = np.asarray(descriptor).reshape(rows - 1, columns - 1, 2, 2, bins)
    total, count = np.zeros((rows, columns, bins)), np.zeros((rows, columns, 1))
    for i in range(2):
        for j in range(2):
            total[i:rows - 1 + i, j:columns - 1 + j] += blocks[:, :, i, j]
            count[i:rows - 1 + i, j:columns - 1 + j] += 1
    mean, size = total / count, 3 * cell
    light = np.clip(mean * (255 / mean.max()), 0, 255).astype(int)
    picture = Image.new("L", (columns * size, rows * size))
    draw = ImageDraw.Draw(picture)
    for row, column, index in sorted(np.ndindex(mean.shape), key=lambda place: light[place]):
        along = (index + 0.5) * np.pi / bins + np.pi / 2
        x, y = (column + 0.5) * size, (row + 0.5) * size
        dx, dy = 0.45 * size * np.cos(along), 0.45 * size * np.sin(along)
        draw.line((x - dx, y - dy, x + dx, y + dy), int(light[row, column, index]), 2)
    return np.array(picture.resize((columns * size // 2, rows * size // 2), Image.Resampling.BOX))


def picture_of(array, crop=None):
    """Bytes as they are shown: a part magnified, small ones enlarged, alpha over squares."""
    array = np.asarray(array)
    if array.dtype == bool:
        array = array * np.uint8(255)
    if array.dtype != np.uint8:
        raise TypeError(f"a picture of {array.dtype}: say in the recipe how it is drawn")
    if crop:
        row, column, height, width = crop
        array = enlarged(array[row:row + height, column:column + width], max(1, 252 // width))
    if array.ndim == 3 and array.shape[2] == 4:
        array = over_checks(array)
    if array.ndim == 3 and array.shape[2] == 1:
        array = array[..., 0]
    if max(array.shape[:2]) < 100:
        array = enlarged(array, max(1, 160 // max(array.shape[:2])))
    return Image.fromarray(np.ascontiguousarray(array))


def save(picture, path):
    """WebP, of few colours and little detail without loss."""
    if path.exists():                           # an input of many recipes
        return path.name
    path.parent.mkdir(parents=True, exist_ok=True)
    if max(picture.size) > 520:
        picture.thumbnail((520, 520))
    quality = 90
    if picture.getcolors(256) is None:
        picture.save(path, "WEBP", quality=quality, method=2)
    else:
        picture.save(path, "WEBP", lossless=True, quality=40, method=2)
    while path.stat().st_size > LIMIT and quality > 10:
        quality -= 16
        if quality < 50:
            picture.thumbnail([side * 4 // 5 for side in picture.size])
        picture.save(path, "WEBP", quality=quality, method=2)
    return path.name
