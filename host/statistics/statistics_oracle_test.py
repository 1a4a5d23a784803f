"""Compares the figures with those of scipy and statsmodels, on generated data sets.

usage: statistics_oracle_test.py PROGRAM [DATA_SETS]

QUAZOR_THOROUGH=1 in the environment takes 1,000 data sets. Without the Debian packages python3-scipy and
python3-statsmodels, which take 310 MB, it says that nothing was compared and exits with 77.
"""

import json
import os
import random
import subprocess
import sys

NEAR = 1e-9


def is_near(a, b):
    return abs(a - b) <= NEAR * max(1, abs(a), abs(b))


def data_set(chance):
    """What the program is asked: a rate, the values of days, and the readings of a full table."""
    trials = chance.randrange(1, 10 ** chance.randrange(1, 7))
    mean, spread = chance.uniform(-1e4, 1e4), 10 ** chance.uniform(-3, 3)
    drift = chance.choice((0, 0, 0.3)) * spread
    days = [[chance.gauss(mean + day * drift, spread) for _ in range(chance.randrange(2, 9))]
            for day in range(chance.randrange(10, 30))]
    readings = []
    parts, places, times = (chance.randrange(2, 6) for _ in range(3))
    of_part = [chance.gauss(0, chance.choice((0, 5))) for _ in range(parts)]
    of_place = [chance.gauss(0, chance.choice((0, 2))) for _ in range(places)]
    for part in range(parts):
        for place in range(places):
            readings += [[f"P{part}", f"S{place}", mean + of_part[part] + of_place[place] + chance.gauss(0, 1)]
                         for _ in range(times)]
    return {"hits": chance.randrange(trials + 1), "trials": trials, "days": days, "lower": mean - 4 * spread,
            "upper": mean + chance.uniform(1, 9) * spread, "readings": readings,
            "tied": [chance.randrange(5) for _ in range(chance.randrange(10, 60))],
            "rate": chance.choice((0, 1, chance.random(), chance.random() ** 6))}


def rules_broken(distances):
    """Each rule by its definition, point by point."""
    found = []
    for rule, needed, among, limit in ((1, 1, 1, 3), (2, 2, 3, 2), (3, 4, 5, 1), (4, 8, 8, 0)):
        for at in range(len(distances)):
            window = distances[max(0, at + 1 - among):at + 1]
            if any(side * window[-1] > limit and sum(side * one > limit for one in window) >= needed for side in (1, -1)):
                found.append([rule, at])
                break
    return found


def expected(asked, numpy, scipy, proportion, frames, formula, anova):
    """The figures by the libraries."""
    found = {"wilson": list(proportion(asked["hits"], asked["trials"], method="wilson"))}
    values = numpy.concatenate(asked["days"])
    described = scipy.describe(values)
    found["mean"], found["deviation"] = described.mean, described.variance ** 0.5
    within = (sum(scipy.describe(day).variance * (len(day) - 1) for day in asked["days"]) /
              (len(values) - len(asked["days"]))) ** 0.5
    found["within"] = within
    distances = [(numpy.mean(day) - described.mean) / (within / len(day) ** 0.5) for day in asked["days"]]
    found["broken"] = rules_broken(distances)
    room = min(described.mean - asked["lower"], asked["upper"] - described.mean) / 3
    if not found["broken"] and len(values) >= 25:
        found["cpk"], found["ppk"] = room / within, room / found["deviation"]
    for key, column in (("trend", [numpy.mean(day) for day in asked["days"]]), ("tied", asked["tied"])):
        found[key] = list(scipy.kendalltau(range(len(column)), column, method="asymptotic"))
    found["binomial"] = scipy.binom.sf(asked["hits"] - 1, asked["trials"], asked["rate"])
    frame = frames.DataFrame(asked["readings"], columns=["part", "place", "value"])
    frame["value"] -= frame["value"].mean()  # the libraries' sums lose digits around a large mean
    table = anova(formula("value ~ C(part) * C(place)", frame).fit())
    part, place, both, rest = (table.loc[row, "mean_sq"] for row in
                               ("C(part)", "C(place)", "C(part):C(place)", "Residual"))
    parts, places = frame["part"].nunique(), frame["place"].nunique()
    times = len(frame) / parts / places
    reproducibility = max(0, (place - both) / parts / times) + max(0, (both - rest) / times)
    part_to_part = max(0, (part - both) / places / times)
    found["gauge"] = [rest, reproducibility, part_to_part, table.loc["C(part):C(place)", "F"],
                      ((rest + reproducibility) / (rest + reproducibility + part_to_part)) ** 0.5]
    return found


def differences(asked, ours, theirs):
    for name in ("wilson", "gauge"):
        if len(ours.get(name, [])) != len(theirs[name]) or not all(map(is_near, ours[name], theirs[name])):
            yield f"{name}: {ours.get(name)}, and not {theirs[name]}, of {json.dumps(asked)[:500]}"
    for name in ("mean", "deviation", "within", "cpk", "ppk"):
        if (name in ours) != (name in theirs) or (name in ours and not is_near(ours[name], theirs[name])):
            yield f"{name}: {ours.get(name)}, and not {theirs.get(name)}; {ours['refusal']}"
    if ours["broken"] != theirs["broken"]:
        yield f"rules: {ours['broken']}, and not {theirs['broken']}"


def main():
    try:
        import numpy
        import pandas
        from scipy import stats
        from statsmodels.formula.api import ols
        from statsmodels.stats.anova import anova_lm
        from statsmodels.stats.proportion import proportion_confint
    except ImportError as missing:
        print(f"NOTHING WAS COMPARED: {missing}; install python3-scipy and python3-statsmodels")
        return 77
    number = int(sys.argv[2]) if len(sys.argv) > 2 else 1000 if os.environ.get("QUAZOR_THOROUGH") == "1" else 20
    chance = random.Random(number)
    asked = [data_set(chance) for _ in range(number)]
    told = subprocess.run([sys.argv[1]], input="".join(json.dumps(one) + "\n" for one in asked), capture_output=True,
                          text=True, check=True).stdout
    figures = [json.loads(line) for line in told.splitlines()]
    assert len(figures) == number, told[-500:]
    wrong = 0
    for one, ours in zip(asked, figures):
        for difference in differences(one, ours, expected(one, numpy, stats, proportion_confint, pandas, ols, anova_lm)):
            print(difference)
            wrong += 1
    with_cpk = sum("cpk" in one for one in figures)
    print(f"{number} data sets, {with_cpk} of them with a Cpk, {wrong} differences")
    return 1 if wrong or not 0 < with_cpk < number else 0


if __name__ == "__main__":
    sys.exit(main())
