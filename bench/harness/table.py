"""The table that a person reads."""

from programs import FLOOR, LIBRARY

HEAD = ("row", "links", "library [min-max]", "floor [min-max]", "wall [min-max]", "CPU library", "CPU floor",
        "CPU [min-max]", "instructions", "fsyncs", "peak MiB", "target", "")


def _time(seconds):
    if seconds >= 1:
        return f"{seconds:.2f} s"
    if seconds >= 1e-3:
        return f"{seconds * 1e3:.2f} ms"
    return f"{seconds * 1e6:.0f} us"


def _spread(values):
    return f"{_time(values['median'])} [{_time(values['min'])}-{_time(values['max'])}]"


def _ratio(values):
    return f"{values['median']:.2f} [{values['min']:.2f}-{values['max']:.2f}]"


def _links(result):
    return f"{result['links']}" + (f"+{result['expired']}" if result["expired"] else "")


def _both(values, form):
    return "-" if not values else f"{form(values[LIBRARY])} / {form(values[FLOOR])}"


def _instructions(values):
    if not values:
        return "-"
    return (_both(values, lambda count: f"{count / 1e3:.0f}k") +
            f" = {values[LIBRARY] / values[FLOOR]:.2f}")


def _verdict(targets):
    said = "; ".join(f"{target['what']} {target['value']:.2f} of {target['most']:.2f}"
                     for target in targets)
    kept = all(target["kept"] for target in targets)
    return said, "" if not targets else "ok" if kept else "MISSED"


def _cells(result):
    if "wall_ratio" not in result:  # the growth
        return (result["row"], "", f"x {result[LIBRARY]:.2f}", f"x {result[FLOOR]:.2f}", "", "", "",
                "", "", "", "", *_verdict(result["targets"]))
    library, floor = result[LIBRARY], result[FLOOR]
    return (result["row"], _links(result), _spread(library["wall"]), _spread(floor["wall"]),
            _ratio(result["wall_ratio"]), _time(library["cpu"]["median"]),
            _time(floor["cpu"]["median"]), _ratio(result["cpu_ratio"]),
            _instructions(result.get("instructions")),
            _both(result.get("fsyncs"), lambda count: f"{count:g}"),
            f"{library['peak_kib']['median'] / 1024:.1f} / {floor['peak_kib']['median'] / 1024:.1f}",
            *_verdict(result["targets"]))


def _lines(rows):
    widths = [max(len(row[column]) for row in rows) for column in range(len(rows[0]))]
    for row in rows:
        yield "| " + " | ".join(cell.ljust(width) for cell, width in zip(row, widths)) + " |"


def text(results):
    """All rows, as a Markdown table that also reads as it is."""
    lines = list(_lines([HEAD, *map(_cells, results)]))
    rule = "|" + "|".join("-" * len(part) for part in lines[0].strip("|").split("|")) + "|"
    return "\n".join([lines[0], rule, *lines[1:]])
