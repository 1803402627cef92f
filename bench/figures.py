"""The arithmetic of the benchmarks: percentiles, ratios of two sides, the gate for a slow rival, the growth of a cost.

A series is a list of batches, a batch a list of nanoseconds. The two sides of a row took turns batch by batch."""
import math
import statistics

# Round trips of one byte between two processes on one core, a second, on the machine on which FIELD_RATES were measured.
FIELD_PING_RATE = 1e9 / 15000
# Queries a second that bare clients reached there, against a simulator of that machine.
FIELD_RATES = {"socket": 42000, "hislip": 49000, "vxi11": 26000}
GATE = 0.8


def samples(series):
    return [sample for batch in series for sample in batch]


def percentile(values, percent):
    """The smallest value that at least `percent` of a hundred values do not exceed (nearest rank)."""
    if not values:
        raise ValueError("no values")
    ordered = sorted(values)
    return ordered[max(0, math.ceil(len(ordered) * percent / 100) - 1)]


def summary(series):
    every = sorted(samples(series))
    return {f"p{percent}": percentile(every, percent) for percent in (50, 95, 99)}


def rate_ratio(ours, rival):
    """How many times the rival's rate ours is: the median over all pairs of batches that were measured next to each other, each batch by
    its median. What disturbs the machine for longer than a batch meets both sides of a pair."""
    if len(ours) != len(rival) or not ours:
        raise ValueError("the sides have not the same number of batches")
    return statistics.median(statistics.median(theirs) / statistics.median(own) for own, theirs in zip(ours, rival))


def difference(more, less):
    """Nanoseconds by which the first side takes longer, pair by pair as in rate_ratio()."""
    if len(more) != len(less) or not more:
        raise ValueError("the sides have not the same number of batches")
    return statistics.median(statistics.median(a) - statistics.median(b) for a, b in zip(more, less))


def gate(kind, rival, ping):
    """Whether the rival of a query row is as fast as it ought to be on this machine: a slow rival would make any row look good.

    Returns whether it is, its queries a second, and the least that it has to reach: 0.8 of the field's figure, scaled by how fast a
    plain round trip is here."""
    reached = 1e9 / percentile(samples(rival), 50)
    here = 1e9 / percentile(samples(ping), 50)
    least = GATE * FIELD_RATES[kind] * here / FIELD_PING_RATE
    return reached >= least, reached, least


def growth_exponent(points):
    """The exponent k of cost ~ n^k over the upper half of the sizes (by their logarithm), where fixed costs no longer hide it: 1 is linear, 2 is
    quadratic. `points` are (n, cost of all n); the slope is that of least squares."""
    if len(points) < 2:
        raise ValueError("growth needs two points")
    logs = sorted((math.log(n), math.log(cost)) for n, cost in points)
    middle = (logs[0][0] + logs[-1][0]) / 2
    upper = [point for point in logs if point[0] >= middle - 1e-9]
    if len(upper) < 2:
        upper = logs[-2:]
    mean_x = sum(x for x, _ in upper) / len(upper)
    mean_y = sum(y for _, y in upper) / len(upper)
    return sum((x - mean_x) * (y - mean_y) for x, y in upper) / sum((x - mean_x) ** 2 for x, _ in upper)
