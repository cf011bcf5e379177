"""The README shows the examples of Python and C++ as they stand in the files that the tests run, but for their first line."""
import sys
from pathlib import Path

readme, *examples = map(Path, sys.argv[1:])
text = readme.read_text()
wrong = [str(e) for e in examples if "\n" + e.read_text().split("\n", 1)[1] + "```" not in text]
sys.exit(f"{readme} shows others than {wrong}" if wrong else 0)
