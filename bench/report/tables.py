"""The report as Markdown: a section for each measure that was taken."""
import targets

TITLES = {"service": "service, reports to the store", "analytics": "service, events to the outbox",
          "daemon": "syslog-ng, tuned, rows to SQLite", "bare": "bare `recvfrom` loop"}


def sections(report):
    """Name to text. A result that is missing has no section."""
    results = report["results"]
    written = {"machine": machine(report), "targets": verdicts(results)}
    if "floor" in results:
        written["floor"] = floor(results)
    for name, write in SECTIONS.items():
        if name in results:
            written[name] = write(results[name])
    return written


def table(head, rows):
    """All columns but the first are figures."""
    lines = [head, ["---"] + ["--:"] * (len(head) - 1), *rows]
    return "\n".join("| " + " | ".join(str(cell) for cell in line) + " |" for line in lines)


def machine(report):
    m = report["machine"]
    limit = f"{m['receive_buffer_limit']:,} bytes" if m["receive_buffer_limit"] else "not shown"
    rows = [("processor", f"{m['processor']}, {m['cores']} cores, {m['architecture']}"),
            ("memory", f"{m['memory_gib']} GiB"), ("system", f"{m['system']}, kernel {m['kernel']}"),
            ("disk", m["disk"]), ("largest socket buffer that may be asked for", limit),
            ("compiler, SQLite, daemon", f"{m['compiler']}; {m['sqlite']}; {m['daemon']}"),
            ("load before the run", f"{m['load']:.2f}"), ("version measured", f"`{m['commit']}`"),
            ("size of the run", "quick: figures for a look only" if report["quick"] else "full")]
    return table(["", "what it was measured on"], rows).replace("--:", "---")


def verdicts(results):
    words = {True: "reached", False: "**not reached**", None: "not measured"}
    rows = [(v.text, v.limit, v.measured, words[v.reached]) for v in targets.verdicts(results)]
    return table(["target", "wanted", "measured", "verdict"], rows)


def floods(runs):
    head = ["unpaced flood", "sent", "sent/s", "stored", "last row after", "rows/s", "peak memory"]
    return "\n\n".join((table(head, [_flood(name, run) for name, run in runs.items()]), _lost(runs),
                        _processor_time(runs)))


def _flood(name, run):
    nothing = run["stored"] is None
    return (TITLES[name], f"{run['sent']:,}", f"{run['offered']:,.0f}",
            f"{run['received']:,} received" if nothing else f"{run['stored']:,}",
            "-" if nothing else f"{run['last_row']:.1f} s",
            "-" if nothing else f"{run['rows_per_second']:,.0f}", f"{run['peak_bytes'] / 2**20:,.0f} MiB")


def _lost(runs):
    """The queue's losses are what is left; only the service tells what its store refused."""
    rows = []
    for name, run in runs.items():
        later = "-" if run["stored"] is None else f"{run['lost_after']:,}"
        refused = "-" if run["refused"] is None else f"{run['refused']:,}"
        rows.append((TITLES[name], f"{run['kernel_lost']:,}", f"{run['lost_before']:,}", later, refused))
    return table(["reports lost", "socket's buffer", "sent, never counted", "queue or store",
                  "of these, store"], rows)


def _processor_time(runs):
    """The daemon hands sockets and tables to its threads as it likes, so only their sum tells something."""
    rows = []
    for name, run in runs.items():
        cpu = run["cpu"]
        receiving = "-" if name == "daemon" else _us(cpu["receiving"])
        storing = "-" if name in ("daemon", "bare") else _us(cpu["storing"])
        rows.append((TITLES[name], receiving, storing, _us(sum(cpu.values())), _us(run["sender_cpu_ns"])))
    head = ["processor time for a datagram", "receiving thread", "storing thread", "whole program", "sender"]
    return table(head, rows)


def _us(nanoseconds):
    return f"{nanoseconds / 1000:.2f} µs"


def rates(found):
    rows = []
    for name, result in found.items():
        run = result["confirmed"]
        if not run:
            rows.append((TITLES[name], "none", "-", "-", "-", "-"))
            continue
        limit = " (the sender's limit)" if result["limited_by_sender"] else ""
        rows.append((TITLES[name], f"{run['offered']:,.0f}{limit}", f"{run['seconds']:.0f} s",
                     f"{run['sent']:,}", "-" if name == "bare" else f"{run['lag']:.1f} s",
                     f"{run['peak_bytes'] / 2**20:,.0f} MiB"))
    confirmed = {name: result["confirmed"] for name, result in found.items() if result["confirmed"]}
    head = ["highest rate without loss", "reports/s", "for", "reports", "last row after the last report",
            "peak memory"]
    return table(head, rows) + "\n\n" + _processor_time(confirmed)


def latencies(found):
    rows = [(f"{TITLES[name]}, {run['rate']:,}/s",
             *(_ms(run[part]) for part in ("p50_ms", "p99_ms", "max_ms")),
             f"{run['seen']:,} of {run['sent']:,}",
             f"{run['look_ms_p50']:.2f}, {run['look_ms_p99']:.2f} ms") for name, runs in found.items()
            for run in runs]
    return table(["from sending to a row that others see", "half within", "99 of 100 within", "longest",
                  "seen", "time between looks (half, 99 of 100)"], rows)


def _ms(milliseconds):
    return "-" if milliseconds is None else f"{milliseconds:.2f} ms"


def baselines(found):
    return table(["bare SQLite", "rows/s", "processor time for a row"],
                 [(baseline(kind), f"{run['rows_per_second']:,.0f}", _us(run["cpu_ns"]))
                  for kind, run in found["sqlite"].items()])


def baseline(kind):
    rows, _, prepared = kind.partition(" ")
    plural = "s" if int(rows) > 1 else ""
    return f"{int(rows):,} row{plural} to a commit{', prepared once' if prepared else ''}"


def growth(found):
    return table(["rows in the table before", "rows/s", "storing thread's processor time for a row"],
                 [(f"{int(size):,}", f"{run['rows_per_second']:,.0f}", _us(run["storing_cpu_ns"]))
                  for size, run in found["service"].items()])


def queue(found):
    full = found["service"]
    rows = [("reports that waited in the service's queue", f"{full['queued']:,}"),
            ("memory of each", f"{full['bytes_per_item']:,.0f} bytes"),
            ("memory still held after they were stored", f"{full['held_bytes'] / 2**20:,.0f} MiB"),
            ("storing thread's processor time for each, all told", _us(full["storing_cpu_ns"]))]
    rows += [(f"queue alone, in and out, {int(size):,} waiting", _us(ns))
             for size, ns in full["item_ns"].items()]
    return table(["the queue", ""], rows)


def ledger(found):
    times = found["service"]
    with_it, without = times["QueuedWithLedger"], times["QueuedWithoutLedger"]
    return table(["processor time for a report", ""],
                 [("what both threads count of it, alone", f"{times['CountedReport']:.1f} ns"),
                  ("into the queue and out of it, without the ledger", f"{without:.1f} ns"),
                  ("the same with the ledger", f"{with_it:.1f} ns"),
                  ("difference", f"{with_it - without:.1f} ns")])


def floor(results):
    """The service's own figure is that of the flood, in which it has the least reason to wait."""
    parts = results["floor"]["service"]
    names = {"receive": "receive of a datagram", "write": "write of its log line",
             "parse": "parse of its JSON",
             "queue": "way through a queue", "insert": "insert, prepared once, 1,000 rows to a commit"}
    least = sum(parts.values())
    rows = [(f"a bare {name}", _us(parts[part])) for part, name in names.items()]
    rows.append(("the floor: all of these", _us(least)))
    if "service" in results.get("floods", {}):
        whole = sum(results["floods"]["service"]["cpu"].values())
        rows.append(("the service, in a flood", f"{_us(whole)}, {whole / least:.2f} × the floor"))
    return table(["processor time for a report", ""], rows)


def rest(found):
    run = found["service"]
    return table(["while no program sends", ""], [("from start to bound socket", f"{run['ready_ms']:.1f} ms"),
                                              ("processor", f"{run['core_part']:.3%} of a core"),
                                              ("memory", f"{run['resident_bytes'] / 2**20:.1f} MiB")])


SECTIONS = {"rates": rates, "floods": floods, "latencies": latencies, "baselines": baselines,
            "growth": growth, "queue": queue, "ledger": ledger, "rest": rest}
