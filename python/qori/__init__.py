"""Image-processing primitives over arrays, NumPy's or any other buffer's.

Images are arrays (height, width) or (height, width, channels); sizes and positions are (rows, columns). Every function takes
out=, which it returns: the source itself runs in place. Without it a NumPy array is made, or a qori.Image where NumPy is not
installed. keep_alpha=True leaves the fourth channel of the destination alone, channel= works on one channel.

A call that the library refuses raises qori.Error, a ValueError with its status in code; a remark is a qori.Warning.
"""
from ._core import *  # noqa: F401,F403
from ._core import version

__version__ = version()
