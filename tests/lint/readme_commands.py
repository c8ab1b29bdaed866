"""The README shows the two main commands, and every ./dev command it shows is one that ./dev knows."""
import pathlib
import re
import sys

readme = pathlib.Path("README.md").read_text()
dev = pathlib.Path("dev").read_text()
faults = [f"README.md does not show ./dev {name}" for name in ("demo", "test") if f"./dev {name}" not in readme]
for name in set(re.findall(r"\./dev ([a-z]+)", readme)):
    if not re.search(rf"^    {name}\)|\b{name} \|", dev, re.M):
        faults.append(f"README.md shows ./dev {name}, which does not exist")
if "./dev test" not in pathlib.Path(".ci/run").read_text():
    faults.append(".ci/run does not run ./dev test")
print("\n".join(faults), end="\n" if faults else "")
sys.exit(bool(faults))
