"""The highest rate at which everything is stored, and as fast as it comes.

A queue in memory hides for a while that the store does not keep up. Without a bound on how late the last row
may be, the search would find how much memory a subject takes.
"""
import runs

FIRST_RATE = 50_000
LEAST_RATE = 1_000   # no lower rate is tried
STEP_DOWN = 1.05     # the smallest step down when the long run fails at a rate at which short runs succeeded
WORTH_IT = 1.1       # the sender is the limit when a doubled rate makes it less than this many times as fast


def highest_rate(subject_class, plan, tell):
    """Searches with short runs, then confirms with a long one. Every run is part of the result, lossy ones
    included."""
    probes = []

    def keeps_up(rate, seconds):
        for _ in range(plan.tries):
            run = runs.measure(subject_class, int(rate * seconds), rate)
            probes.append(run)
            tell(f"{run['offered']:,.0f}/s for {run['seconds']:.0f} s: {run['lost']:,} lost, "
                 f"last row {run['lag']:.1f} s late")
            if run["lost"] == 0 and run["lag"] <= plan.lag * run["seconds"]:
                return True
        return False

    low, high = _bracket(lambda rate: keeps_up(rate, plan.probe_seconds), probes)
    while low and high and high / low > plan.exactness:
        middle = (low * high) ** 0.5
        low, high = (middle, high) if keeps_up(middle, plan.probe_seconds) else (low, middle)
    while low and not keeps_up(low, plan.confirm_seconds):
        low = min(low / STEP_DOWN, probes[-1]["rows_per_second"]) if low > LEAST_RATE else 0
    confirmed = probes[-1] if low else None
    return {"confirmed": confirmed, "probes": probes, "limited_by_sender": bool(low) and high is None}


def _bracket(keeps_up, probes):
    """A rate that is kept up with (0 when there is none) and one that is not (None when the sender could go
    no faster)."""
    rate = FIRST_RATE
    if not keeps_up(rate):
        while rate > LEAST_RATE:
            rate /= 2
            if keeps_up(rate):
                return rate, rate * 2
        return 0, rate
    fastest = 0
    while probes[-1]["offered"] > WORTH_IT * fastest:
        fastest = max(fastest, probes[-1]["offered"])
        rate *= 2
        if not keeps_up(rate):
            return rate / 2, rate
    return probes[-1]["offered"], None
