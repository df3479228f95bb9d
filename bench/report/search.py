"""The highest rate at which everything is stored."""
import runs

FIRST_RATE = 50_000
STEP_DOWN = 1.05   # when the long run loses what the short ones did not
KEPT_UP = 0.97     # a sender that was slower than this part of its pace was the limit itself
TRIES = 2          # at each rate: a loss is the subject's doing when it happens again


def highest_rate(subject_class, plan, tell):
    """Searches with short runs, then confirms with a long one. Every run is part of the result, lossy ones included."""
    probes = []

    def is_lossless(rate, seconds):
        for _ in range(TRIES):
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
        low = low / STEP_DOWN if low > 1000 else 0
    confirmed = probes[-1] if low else None
    return {"confirmed": confirmed, "probes": probes, "limited_by_sender": bool(low) and high is None}


def _bracket(is_lossless, probes):
    """A rate without loss and one with; no upper one when the sender could go no faster."""
    low, rate = 0, FIRST_RATE
    while True:
        if not is_lossless(rate):
            return low, rate
        if probes[-1]["offered"] < KEPT_UP * rate:
            return probes[-1]["offered"], None
        low, rate = rate, rate * 2
