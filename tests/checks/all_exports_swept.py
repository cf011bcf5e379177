"""Every export was compared with its reference by a test binary."""
import sys
from pathlib import Path

exports = set(Path(sys.argv[1]).read_text().split())
missing_files = [f for f in sys.argv[2:] if not Path(f).exists()]
if missing_files:
    sys.exit(f"these tests left no list of what they swept: {missing_files}")
swept = set()
for file in sys.argv[2:]:
    swept |= set(Path(file).read_text().split())
if exports - swept or not exports:
    sys.exit(f"never swept: {len(exports - swept)} of {len(exports)}: {sorted(exports - swept)[:20]}")
if swept - exports:
    sys.exit(f"swept but not exported: {sorted(swept - exports)}")
print(f"{len(exports)} exports, all swept")
