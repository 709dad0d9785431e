"""Measures rows: floor, library, floor, library …, so that what else the machine does meets both."""

import statistics

import programs
import rows as table

# What one run is to take, as far as the row's limit of iterations allows.
SECONDS = 0.4


def _iterations(place, row):
    """As many as fit, by a short run of the floor's; and how many turns that used."""
    if row.most == 1:
        return 1, 0
    trial = 5
    took = programs.measure(place, row, programs.FLOOR, trial, 0)["wall"]
    return max(10, min(row.most, int(SECONDS / took))), 2 * trial


def _spread(values):
    return {"median": statistics.median(values), "min": min(values), "max": max(values)}


def _result(row, runs, iterations):
    result = {"row": row.name, "operation": row.operation, "links": row.links,
              "expired": row.expired, "pairs": len(runs[programs.FLOOR]),
              "iterations": iterations}
    for side in programs.SIDES:
        result[side] = {
            key: _spread([run[key] for run in runs[side]])
            for key in ("wall", "cpu", "peak_kib", "grown_kib", "kept_kib")
        }
    for key in ("wall", "cpu"):
        result[key + "_ratio"] = _spread([
            library[key] / floor[key]
            for floor, library in zip(runs[programs.FLOOR], runs[programs.LIBRARY])])
    return result


def measure(place, row, pairs):
    """One row on a database of its own."""
    place.lay_out(row.links)
    iterations, turn = _iterations(place, row)
    runs = {side: [] for side in programs.SIDES}
    for _ in range(min(pairs, row.pairs or pairs)):
        for side in programs.SIDES:
            runs[side].append(programs.measure(place, row, side, iterations, turn))
            turn += 2 * iterations + 2  # the warm-up's among them
    return _result(row, runs, iterations)


def measure_once(place, rows, pairs):
    """Rows of one database that each can be done only once, in their order on every copy."""
    runs = {row: {side: [] for side in programs.SIDES} for row in rows}
    for _ in range(min(pairs, rows[0].pairs or pairs)):
        for side in programs.SIDES:
            place.lay_out(rows[0].links, rows[0].expired)
            for row in rows:
                runs[row][side].append(programs.measure(place, row, side, 1, 0))
    return [_result(row, runs[row], 1) for row in rows]


def judge(result, row):
    """Adds what the row is held to and whether it keeps it."""
    result["targets"] = targets = []
    if row.cpu_target:
        targets.append(_target("CPU", result["cpu_ratio"]["median"], row.cpu_target))
    if row.memory_target:
        library = result[programs.LIBRARY]
        targets.append(_target("memory", library["grown_kib"]["median"] /
                               library["kept_kib"]["median"], row.memory_target))


def _target(what, value, most):
    return {"what": what, "value": value, "most": most, "kept": value <= most}


def growth(results):
    """How the check grows from a thousand links to a million, against the floor; None without."""
    by_links = {result["links"]: result for result in results
                if result["row"].startswith("check")}
    if not {table.SMALL, table.LARGE} <= by_links.keys():
        return None
    grown = {side: by_links[table.LARGE][side]["cpu"]["median"] /
             by_links[table.SMALL][side]["cpu"]["median"] for side in programs.SIDES}
    return {"row": "check growth", **grown,
            "targets": [_target("growth", grown[programs.LIBRARY] / grown[programs.FLOOR],
                                table.GROWTH)]}
