"""The highest rate at which everything is stored."""
import runs

FIRST_RATE = 50_000
LEAST_RATE = 1_000   # below, nothing is searched
STEP_DOWN = 1.05     # at least, when the long run loses what the short ones did not
WORTH_IT = 1.1       # a sender that doubles its pace and does not get so much faster is the limit itself


def highest_rate(subject_class, plan, tell):
    """Searches with short runs, then confirms with a long one. Every run is part of the result, lossy ones included."""
    probes = []

    def is_lossless(rate, seconds):
        for _ in range(plan.tries):
            run = runs.measure(subject_class, int(rate * seconds), rate)
            probes.append(run)
            tell(f"{run['offered']:,.0f}/s for {run['seconds']:.0f} s: {run['lost']:,} lost")
            if run["lost"] == 0:
                return True
        return False

    low, high = _bracket(lambda rate: is_lossless(rate, plan.probe_seconds), probes)
    while low and high and high / low > plan.exactness:
        middle = (low * high) ** 0.5
        low, high = (middle, high) if is_lossless(middle, plan.probe_seconds) else (low, middle)
    while low and not is_lossless(low, plan.confirm_seconds):
        low = min(low / STEP_DOWN, _kept_rate(probes[-1])) if low > LEAST_RATE else 0
    confirmed = probes[-1] if low else None
    return {"confirmed": confirmed, "probes": probes, "limited_by_sender": bool(low) and high is None}


def _kept_rate(run):
    """At which what was not lost came: hardly more can be had without loss."""
    return run["offered"] * (1 - run["lost"] / run["sent"])


def _bracket(is_lossless, probes):
    """A rate without loss (0 when there is none) and one with (None when the sender could go no faster)."""
    rate = FIRST_RATE
    if not is_lossless(rate):
        while rate > LEAST_RATE:
            rate /= 2
            if is_lossless(rate):
                return rate, rate * 2
        return 0, rate
    fastest = 0
    while probes[-1]["offered"] > WORTH_IT * fastest:
        fastest = max(fastest, probes[-1]["offered"])
        rate *= 2
        if not is_lossless(rate):
            return rate / 2, rate
    return probes[-1]["offered"], None
