"""The simulation behind bench/fleet: that its counts add up, that a seed gives the same figures, and that it
notices a rule that does not work. Takes the program's path."""
import json
import subprocess
import sys
import unittest

PROGRAM = sys.argv.pop(1)


def run(*options, desktops=1000):
    command = [PROGRAM, "--json", "--collectors", "2", "--desktops", str(desktops), *map(str, options)]
    return json.loads(subprocess.run(command, check=True, capture_output=True, text=True).stdout)


class Fleet(unittest.TestCase):
    def assert_adds_up(self, result):
        counts = result["counts"]
        ends = ("delivered", "waiting", "dropped", "dead_lettered")
        self.assertEqual(counts["stored"], sum(counts[name] for name in ends))
        self.assertEqual(counts["taken"] - counts["duplicates"],
                         counts["delivered"] + counts["unconfirmed"] + counts["dropped_taken"])
        self.assertLessEqual(counts["unconfirmed"], counts["waiting"])
        hours = result["hours"]
        self.assertEqual(len(hours), 24 * result["days"])
        for rate, count in (("stored_per_s", "stored"), ("events_per_s", "taken")):
            total = sum(hour[rate] for hour in hours) * 3600
            self.assertAlmostEqual(total, counts[count], delta=len(hours) * 2)

    def test_tells_its_options_in_plain_words(self):
        text = subprocess.run([PROGRAM, "--help"], check=True, capture_output=True, text=True).stdout
        self.assertIn("--desktops NUMBER:from 1 to 2000000", text)
        self.assertIn("--away WORD ", text)
        for word in ("INT", "FLOAT", "ENUM", "->", "--json NUMBER"):
            self.assertNotIn(word, text)

    def test_delivers_each_event_of_a_usual_day_once(self):
        result = run()
        self.assert_adds_up(result)
        self.assertAlmostEqual(result["counts"]["stored"], 200_000, delta=2_000)
        self.assertEqual(result["counts"]["duplicates"], 0)
        self.assertEqual(result["counts"]["dropped"], 0)
        # Some were switched off within the second that an event waits for others.
        self.assertLess(result["counts"]["waiting"], 30)

    def test_gives_the_same_figures_for_the_same_seed_whatever_the_threads(self):
        day = ("--outage", 1, "--capacity", 2, "--retry-after", 10)
        one = run(*day, "--threads", 1)
        self.assertEqual(one, run(*day, "--threads", 2))
        self.assertNotEqual(one["counts"], run(*day, "--seed", 2)["counts"])

    def test_loses_nothing_while_the_collector_is_away(self):
        for way in ("refused", "503", "silent"):
            with self.subTest(way):
                result = run("--outage", 1, "--away", way)
                self.assert_adds_up(result)
                self.assertGreater(result["counts"]["waiting_at_return"], 15_000)
                self.assertEqual(result["counts"]["dropped"] + result["counts"]["dead_lettered"], 0)
                self.assertLess(result["drained_99_s"], 400)
                self.assertGreater(result["away"]["unanswered"] + result["away"]["answered_later"], 1000)

    def test_drops_the_oldest_when_a_cap_is_reached(self):
        for cap in (("--max-bytes", 3000), ("--max-age", 1800)):
            with self.subTest(cap):
                result = run("--outage", 3, *cap)
                self.assert_adds_up(result)
                self.assertGreater(result["counts"]["dropped"], 10_000)
                self.assertGreater(result["counts"]["drop_runs"], 0)

    def test_counts_what_a_collector_takes_again_because_its_answer_came_too_late(self):
        result = run("--outage", 1, "--return-capacity", 1.2, "--queue", 60)
        self.assert_adds_up(result)
        self.assertGreater(result["counts"]["duplicates"], 1000)

    def test_takes_no_more_than_a_collector_can(self):
        result = run("--outage", 1, "--return-capacity", 3, "--queue", 1)
        self.assert_adds_up(result)
        capacity = 3 * 1000 * 200 / (7.75 * 3600)
        self.assertLess(result["after"]["events_per_s"], capacity * 1.05)
        self.assertGreater(result["after"]["answered_later"], 0)

    def test_notices_when_a_first_request_does_not_wait(self):
        restart = ("--restart", 10.5)
        together = run(*restart, "--start-spread", 0)["restart"]["peak_requests_per_s"]
        spread = run(*restart)["restart"]["peak_requests_per_s"]
        self.assertGreater(together, 500)
        self.assertLess(spread, together / 8)

    def test_notices_when_a_retry_after_does_not_spread(self):
        wave = ("--outage", 24, "--return-capacity", 20, "--retry-after", 120)
        together = run(*wave, "--retry-after-spread", 0)["after"]
        spread = run(*wave)["after"]
        self.assertGreater(together["answered_later"], spread["answered_later"])

    def test_notices_when_nobody_waits_longer_after_each_failure(self):
        usual = run("--outage", 1)["away"]["unanswered"]
        impatient = run("--outage", 1, "--max-wait", 10)["away"]["unanswered"]
        self.assertGreater(impatient, 8 * usual)


if __name__ == "__main__":
    unittest.main()
