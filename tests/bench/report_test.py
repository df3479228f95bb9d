"""The judging, searching and drawing parts of bench/report, on runs that are made up."""
import pathlib
import sys
import tempfile
import unittest
import xml.etree.ElementTree
from unittest import mock

ROOT = pathlib.Path(__file__).resolve().parent.parent.parent
sys.path.insert(0, str(ROOT / "bench/report"))

import chart
import latency
import measures
import output
import plan
import procfs
import runs
import search
import subject
import subjects
import tables
import targets


def run(rate, lost=0, **more):
    return {"rate": rate, "sent": 1000, "offered": rate, "seconds": 1.0, "lost": lost, "stored": 1000 - lost,
            "received": 1000 - lost, "lost_after": 0, "rows_per_second": more.get("offered", rate),
            "lag": 0.0, "cpu": {"receiving": 2000, "storing": 6000, "others": 0}, **more}


def losing_above(limit, sender_limit=float("inf")):
    """Stands in for runs.measure."""
    def measure(_, count, rate):
        offered = min(rate, sender_limit)
        return run(rate, int(offered > limit), offered=offered, sent=count, seconds=count / offered)
    return mock.patch.object(runs, "measure", measure)


def searched(**more):
    return search.highest_rate(None, plan.Plan(**more), lambda _: None)


class HighestRate(unittest.TestCase):
    def test_is_found_to_within_the_plans_exactness(self):
        for limit in (7_000, 50_000, 123_456, 800_000):
            with losing_above(limit):
                found = searched(exactness=1.05)["confirmed"]["offered"]
            self.assertLessEqual(found, limit)
            self.assertGreater(found * 1.06, limit)

    def test_is_confirmed_by_a_long_run(self):
        with losing_above(90_000):
            self.assertAlmostEqual(searched(confirm_seconds=20)["confirmed"]["seconds"], 20, 3)

    def test_is_the_senders_when_nothing_is_lost_at_its_limit(self):
        with losing_above(1e9, sender_limit=333_000):
            found = searched()
        self.assertTrue(found["limited_by_sender"])
        self.assertEqual(found["confirmed"]["offered"], 333_000)

    def test_is_not_the_senders_when_the_sender_was_held_up_once(self):
        slow = iter([0.5])
        def measure(_, count, rate):
            return run(rate, int(rate > 200_000), offered=rate * next(slow, 1), sent=count,
                       seconds=count / rate)
        with mock.patch.object(runs, "measure", measure):
            found = searched()
        self.assertFalse(found["limited_by_sender"])
        self.assertGreater(found["confirmed"]["offered"], 180_000)

    def test_is_none_when_every_run_loses(self):
        with losing_above(0):
            self.assertIsNone(searched()["confirmed"])

    def test_steps_down_when_the_long_run_loses_what_short_ones_did_not(self):
        def measure(_, count, rate):
            return run(rate, int(rate > (80_000 if count / rate > 5 else 100_000)), sent=count,
                       seconds=count / rate)
        with mock.patch.object(runs, "measure", measure):
            found = searched()["confirmed"]
        self.assertEqual((found["lost"], round(found["seconds"])), (0, 20))
        self.assertGreater(found["offered"], 76_000)

    def test_is_none_that_the_store_falls_behind(self):
        def measure(_, count, rate):
            seconds = count / rate
            took = max(seconds, count / 100_000)
            return run(rate, sent=count, seconds=seconds, lag=took - seconds, rows_per_second=count / took)
        with mock.patch.object(runs, "measure", measure):
            found = searched()["confirmed"]["offered"]
        self.assertLessEqual(found, 105_000)
        self.assertGreater(found, 94_000)

    def test_survives_a_single_loss_at_a_rate(self):
        lossy = iter([True])
        def measure(_, count, rate):
            lost = rate > 400_000 or (rate == 100_000 and next(lossy, False))
            return run(rate, int(lost), sent=count, seconds=count / rate)
        with mock.patch.object(runs, "measure", measure):
            self.assertGreater(searched(tries=2)["confirmed"]["offered"], 380_000)


class Verdict(unittest.TestCase):
    RESULTS = {"floods": {"service": run(0, rows_per_second=600.0), "daemon": run(0, rows_per_second=240.0),
                          "bare": run(0, cpu={"receiving": 1000, "storing": 0, "others": 0})},
               "rates": {"service": {"confirmed": run(3000)}, "daemon": {"confirmed": run(1201)}},
               "baselines": {"sqlite": {"1000": {"cpu_ns": 3000}}}}

    def verdict(self, start, results=None):
        found = [verdict for verdict in targets.verdicts(results or self.RESULTS)
                 if verdict.text.startswith(start)]
        self.assertEqual(len(found), 1)
        return found[0]

    def test_is_reached_exactly_at_the_limit(self):
        self.assertIs(self.verdict("rows a second of a flood").reached, True)
        self.assertIs(self.verdict("storing thread").reached, True)

    def test_is_not_reached_below_what_is_wanted_at_least(self):
        self.assertIs(self.verdict("highest rate").reached, False)

    def test_is_not_reached_above_what_is_wanted_at_most(self):
        slow = {**self.RESULTS, "baselines": {"sqlite": {"1000": {"cpu_ns": 2999}}}}
        self.assertIs(self.verdict("storing thread", slow).reached, False)

    def test_is_open_for_what_was_not_measured(self):
        self.assertIsNone(self.verdict("memory of a queued").reached)

    def test_takes_the_bare_loop_at_its_cheapest(self):
        cheap = {"confirmed": run(0, cpu={"receiving": 500, "storing": 0, "others": 0})}
        results = {**self.RESULTS, "rates": {**self.RESULTS["rates"], "bare": cheap}}
        self.assertIs(self.verdict("receiving thread").reached, True)
        self.assertIs(self.verdict("receiving thread", results).reached, False)


class Started(unittest.TestCase):
    def test_is_ended_when_the_start_fails_later(self):
        class Sleeper(subject.Subject):
            def command(self):
                return ["sleep", "60"]
        sleeper = Sleeper()
        with tempfile.TemporaryDirectory() as root, mock.patch.object(subject, "ROOT", pathlib.Path(root)), \
                mock.patch("os.sync"), mock.patch.object(procfs, "is_bound", side_effect=KeyboardInterrupt):
            (pathlib.Path(root) / "build").mkdir()
            with self.assertRaises(KeyboardInterrupt), sleeper:
                pass
            self.assertEqual(list((pathlib.Path(root) / "build").iterdir()), [])
        self.assertIsNotNone(sleeper.process.returncode)


class Losses(unittest.TestCase):
    def test_are_told_apart_by_place(self):
        places = runs._losses({"sent": 100, "received": 70, "kernel_lost": 29, "stored": 60, "last_row": 2})
        self.assertEqual((places["lost_before"], places["lost_after"], places["lost"]), (1, 10, 40))
        self.assertEqual(places["rows_per_second"], 30)

    def test_stand_in_the_table_each_in_its_place(self):
        lost = {"kernel_lost": 29, "lost_before": 1, "lost_after": 10, "stored": 60}
        rows = tables._lost({"service": {**lost, "refused": 4}, "daemon": {**lost, "refused": None},
                             "bare": {**lost, "refused": None, "stored": None}}).splitlines()[2:]
        self.assertEqual([[cell.strip() for cell in row.split("|")[2:-1]] for row in rows],
                         [["29", "1", "10", "4"], ["29", "1", "10", "-"], ["29", "1", "-", "-"]])

    def test_of_the_store_are_the_errors_in_the_services_log(self):
        service = subjects.Service()
        with tempfile.TemporaryDirectory() as folder:
            service.directory = pathlib.Path(folder)
            log = service.directory / "hublink/log/metrik"
            log.mkdir(parents=True)
            (log / "old").write_text("ERROR [1:2] [Frame/DBHelper:34 ExecSql] no such table-insert\n" * 2)
            (log / "new").write_text("ERROR [1:2] [Frame/DBHelper:34 ExecSql] no such table-insert\n"
                                     "INFO  [1:2] [App/ReportServer:42 Recv] {}\n"
                                     "ERROR [1:2] [Frame/DBHelper:53 BatExecSql] no such table\n")
            self.assertEqual(service.refused(), 3)


class Baseline(unittest.TestCase):
    def test_says_how_its_rows_are_committed_and_made(self):
        self.assertEqual([tables.baseline(kind) for kind, _ in plan.FULL.baselines],
                         ["1 row to a commit", "1,000 rows to a commit",
                          "1,000 rows to a commit, prepared once"])


class Floor(unittest.TestCase):
    PARTS = {"receive": 700, "write": 400, "parse": 100, "queue": 100, "insert": 700}

    def results(self, **more):
        return {"floor": {"service": self.PARTS}} | more

    def test_is_the_sum_of_its_parts_and_the_service_a_multiple_of_it(self):
        results = self.results(floods={"service": run(0)})  # 8 µs
        self.assertIn("| the floor: all of these | 2.00 µs |", tables.floor(results))
        self.assertIn("| the service, in a flood | 8.00 µs, 4.00 × the floor |", tables.floor(results))
        self.assertEqual(targets._floor_ratio(results), 4)

    def test_names_each_part_that_it_adds(self):
        self.assertEqual(tables.floor(self.results()).count("| a bare "), len(self.PARTS))


class Quantile(unittest.TestCase):
    def test_is_the_smallest_value_that_so_many_are_not_above(self):
        self.assertEqual(latency.quantile(list(range(1, 101)), 0.99), 99)
        self.assertEqual(latency.quantile([1, 2, 3], 0.5), 2)
        self.assertEqual(latency.quantile([7], 0.99), 7)


class Chart(unittest.TestCase):
    PROBES = [run(50_000), run(100_000, 0), run(100_000, 10), run(100_000, 900), run(200_000, 1000)]

    def points(self, floods):
        text = chart.draw({"service": {"probes": self.PROBES}, "daemon": {"probes": self.PROBES[:1]}}, floods)
        dots = xml.etree.ElementTree.fromstring(text).iter("{http://www.w3.org/2000/svg}circle")
        return [(float(dot.get("cx")), float(dot.get("cy"))) for dot in dots]

    def test_has_a_point_for_each_rate_inside_its_axes(self):
        points = self.points({})
        self.assertEqual(len(points), 4)
        for x, y in points:
            self.assertTrue(chart.LEFT <= x <= chart.WIDTH - chart.RIGHT, x)
            self.assertTrue(chart.TOP <= y <= chart.HEIGHT - chart.BOTTOM, y)
        for (_, y), part in zip(points, (0, 0.01, 1)):  # at 100,000/s, the median of three
            self.assertAlmostEqual(y, chart._y(part), 1)

    def test_ends_each_line_with_the_subjects_flood(self):
        points = self.points({"service": run(0, 640, offered=900_000)})
        self.assertEqual(len(points), 5)
        x, y = points[3]
        self.assertAlmostEqual(x, chart._x(900_000, 1_000_000), 1)
        self.assertAlmostEqual(y, chart._y(0.64), 1)


def full():
    return {name: dict.fromkeys(of) for name, (of, *_) in measures.MEASURES.items()}


class Page(unittest.TestCase):
    def updated(self, page, **changes):
        sections = dict.fromkeys(tables.SECTIONS, "new")
        report = {"quick": False, "results": full()} | changes
        with mock.patch.object(output, "PAGE", mock.Mock(read_text=lambda: page)) as file, \
                mock.patch.object(output, "write"), mock.patch.object(tables, "sections", lambda _: sections):
            output.update_page(report)
            return file.write_text.call_args[0][0]

    def test_gets_the_figures_between_its_marks_and_keeps_its_text(self):
        page = ("before\n<!-- figures: rest -->\nold\n<!-- end -->\nbetween\n"
                "<!-- figures: floods -->\n<!-- end -->\nafter\n")
        self.assertEqual(self.updated(page),
                         "before\n<!-- figures: rest -->\n\nnew\n\n<!-- end -->\nbetween\n"
                         "<!-- figures: floods -->\n\nnew\n\n<!-- end -->\nafter\n")

    def test_takes_the_figures_of_a_full_run_only(self):
        for change in ({"quick": True}, {"results": {"rest": {}}}, {"results": {}}):
            with self.assertRaises(SystemExit):
                self.updated("", **change)

    def test_takes_no_figures_of_a_run_that_lacks_a_subject_of_a_measure(self):
        for measure, of in full().items():
            for one in of:
                results = full()
                del results[measure][one]
                with self.subTest(measure=measure, subject=one), self.assertRaises(SystemExit):
                    self.updated("", results=results)


if __name__ == "__main__":
    unittest.main()
