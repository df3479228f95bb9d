"""Each measure: its name, what it is measured of, about how long one takes, and how."""
import runs
import search
import subjects

SUBJECTS = {subject.name: subject for subject in
            (subjects.Service, subjects.Analytics, subjects.Daemon, subjects.BareReceiver)}


def flood(subject, plan, _):
    return runs.measure(SUBJECTS[subject], plan.flood_reports)


def rate(subject, plan, tell):
    return search.highest_rate(SUBJECTS[subject], plan, tell)


MEASURES = {
    "floods": (tuple(SUBJECTS), lambda plan: plan.flood_reports / 60_000 + 2, flood),
    "rates": (tuple(SUBJECTS), lambda plan: 8 * (plan.probe_seconds + 2) + plan.confirm_seconds, rate),
}


def steps(plan, only, wanted):
    """Name of the step, measure, subject, seconds."""
    for name, (subjects_of, seconds, _) in MEASURES.items():
        for subject in subjects_of:
            if (not only or name in only) and (not wanted or subject in wanted):
                yield f"{name}: {subject}", name, subject, seconds(plan)
