#!/usr/bin/env python3
"""Writes a large Liberty file for the cell-library reader benchmark.

The real standard-cell library's cells are repeated under new names
(NAME_c0, NAME_c1, ...) until the file reaches the asked size. Its timing
tables were filtered out upstream, so each cell_rise table gets the other
three delay tables of a real timing arc beside it, and each output pin gets
internal_power tables, written the way foundry files write them: 7x7 values
over several lines joined by backslash-newline.

    bench/make-liberty.py SOURCE.lib OUT.lib [MEGABYTES]   (default 100)
"""

import random
import re
import sys


def table(kind, template, indent, rng):
    """A 7x7 table group, each line starting with `indent`."""
    rows = []
    for i in range(7):
        row = ", ".join("%.6g" % (rng.uniform(0.01, 2.0) * (1 + i)) for _ in range(7))
        rows.append('%s    "%s"' % (indent, row))
    return (
        "%s%s(%s) {\n" % (indent, kind, template)
        + '%s  index_1("0.0186, 0.0966, 0.174, 0.3294, 0.6408, 1.263, 2.5074") ;\n' % indent
        + '%s  index_2("0.001, 0.0234, 0.039, 0.0648, 0.108, 0.18, 0.3") ;\n' % indent
        + "%s  values( \\\n%s) ;\n" % (indent, ", \\\n".join(rows))
        + "%s}\n" % indent
    )


def main():
    if len(sys.argv) < 3:
        sys.exit(__doc__)
    source, out = sys.argv[1], sys.argv[2]
    target = int(float(sys.argv[3] if len(sys.argv) > 3 else 100) * 1e6)
    lines = open(source).read().split("\n")
    starts = [i for i, line in enumerate(lines) if re.match(r"  cell\(", line)]
    end = max(i for i, line in enumerate(lines) if line.strip() == "}")
    header = "\n".join(lines[: starts[0]]) + "\n"
    cells = [lines[a:b] for a, b in zip(starts, starts[1:] + [end])]
    rng = random.Random(1)
    written = 0
    copy = 0
    with open(out, "w") as f:
        f.write(header)
        written += len(header)
        while written < target:
            for cell in cells:
                text = []
                for line in cell:
                    m = re.match(r"(\s*)cell\((\w+)\)", line)
                    if m:
                        line = "%scell(%s_c%d) {" % (m.group(1), m.group(2), copy)
                    text.append(line + "\n")
                    indent = re.match(r"\s*", line).group(0)
                    if re.match(r"\s*direction : \"output\"", line):
                        text.append(
                            "%sinternal_power() {\n%s  related_pin : \"A\" ;\n" % (indent, indent)
                        )
                        for kind in ("rise_power", "fall_power"):
                            text.append(table(kind, "POWER_7x7", indent + "  ", rng))
                        text.append(indent + "}\n")
                    if re.match(r"\s*timing\(\) \{", line):
                        for kind in ("cell_fall", "rise_transition", "fall_transition"):
                            text.append(table(kind, "TIMING_DELAY_7x7ds1", indent + "  ", rng))
                chunk = "".join(text)
                f.write(chunk)
                written += len(chunk)
            copy += 1
        f.write("}\n")
    print("%s: %d copies of %d cells, %.1f MB" % (out, copy, len(cells), written / 1e6))


if __name__ == "__main__":
    main()
