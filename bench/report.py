"""The rows of a run: their verdicts, and how they are shown as a table, as JSON and in docs/performance.md."""
import json
import platform
import time

import figures

BEGIN = "<!-- figures: written by scripts/bench --record -->"
END = "<!-- end of figures -->"
STEEPEST = 1.25  # exponent of a cost that still counts as linear; caches alone account for some of it


def readable(nanoseconds):
    for limit, factor, unit in ((1e3, 1, "ns"), (1e6, 1e3, "us"), (1e9, 1e6, "ms")):
        if nanoseconds < limit:
            return f"{nanoseconds / factor:.3g} {unit}" if nanoseconds / factor < 100 else f"{nanoseconds / factor:.0f} {unit}"
    return f"{nanoseconds / 1e9:.2f} s"


def percentiles(side):
    return " / ".join(readable(side[p]) for p in ("p50", "p95", "p99")) if side else ""


class Rows:
    def __init__(self):
        self.rows = []
        self.growths = []

    def add(self, what, figure, unit, target, met, ours=None, rival=None, **more):
        verdict = "ok" if met else "MISSED"
        self.rows.append({"row": what, "figure": figure, "unit": unit, "target": target, "verdict": verdict, "ours": ours, "rival": rival, **more})

    def at_least(self, what, series, ours, rival, target, gate=None, strictly=False):
        """Rate of ours over rate of the rival. `gate` is the answer of figures.gate()."""
        ratio = figures.rate_ratio(series[ours], series[rival])
        met = ratio > target if strictly else ratio >= target
        self.add(what, ratio, "x", f"{'>' if strictly else '>='} {target}", met, figures.summary(series[ours]), figures.summary(series[rival]))
        if gate:
            fast_enough, reached, least = gate
            self.rows[-1]["gate"] = {"rival_rate": reached, "least": least}
            if not fast_enough:
                self.rows[-1]["verdict"] = "rival too slow here"

    def at_most(self, what, figure, limit, unit, ours=None, rival=None, text=None, **more):
        self.add(what, figure, unit, text or f"<= {limit:g}", figure <= limit, ours, rival, **more)

    def below(self, what, figure, limit, unit, **more):
        self.add(what, figure, unit, f"< {limit:g}", figure < limit, **more)

    def growth(self, what, points, unit):
        """`points` are (n, nanoseconds for all n)."""
        exponent = figures.growth_exponent(points)
        self.growths.append({"row": what, "unit": unit, "points": points})
        self.add(f"growth: {what}", exponent, "exp", f"<= {STEEPEST}", exponent <= STEEPEST)

    def all_met(self):
        return all(row["verdict"] == "ok" for row in self.rows)

    def table(self):
        head = ("row", "ours p50 / p95 / p99", "rival p50 / p95 / p99", "figure", "target", "verdict")
        body = [(r["row"], percentiles(r["ours"]), percentiles(r["rival"]), f"{r['figure']:.2f} {r['unit']}", r["target"], r["verdict"])
                for r in self.rows]
        widths = [max(len(line[column]) for line in [head, *body]) for column in range(len(head))]
        return "".join("  ".join(cell.ljust(width) for cell, width in zip(line, widths)).rstrip() + "\n" for line in [head, *body])

    def growth_table(self):
        text = ""
        for growth in self.growths:
            cells = ", ".join(f"{n:,}: {readable(cost)} ({readable(cost / n)} each)" for n, cost in growth["points"])
            text += f"{growth['row']} ({growth['unit']}): {cells}\n"
        return text

    def markdown(self, machine):
        text = f"Measured {machine}.\n\n| row | ours p50 / p95 / p99 | rival p50 / p95 / p99 | figure | target | |\n|---|---|---|---|---|---|\n"
        for r in self.rows:
            figure = f"{r['figure']:.2f} {r['unit']}"
            text += f"| {r['row']} | {percentiles(r['ours'])} | {percentiles(r['rival'])} | {figure} | {r['target']} | {r['verdict']} |\n"
        for growth in self.growths:
            text += f"\n{growth['row']}:\n\n| {growth['unit']} | all | each |\n|---|---|---|\n"
            text += "".join(f"| {n:,} | {readable(cost)} | {readable(cost / n)} |\n" for n, cost in growth["points"])
        return text

    def json(self, machine):
        return json.dumps({"machine": machine, "rows": self.rows, "growth": self.growths}, indent=1) + "\n"


def machine(note):
    model = next((line.split(":")[1].strip() for line in open("/proc/cpuinfo", encoding="utf-8") if line.startswith("model name")), platform.machine())
    return f"{time.strftime('%Y-%m-%d %H:%M UTC', time.gmtime())} on {note}, {model}, Linux {platform.release().split('-')[0]}"


def replaced(text, figures_text):
    """`text` with what stands between the marks replaced."""
    begin, end = text.find(BEGIN), text.find(END)
    if begin < 0 or end < begin:
        raise ValueError("the page has no place for the figures")
    return text[:begin + len(BEGIN)] + "\n" + figures_text + text[end:]
