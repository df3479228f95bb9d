"""bench/run as a whole: that it measures everything and loses track of no report."""
import json
import pathlib
import subprocess
import unittest
import xml.etree.ElementTree

ROOT = pathlib.Path(__file__).resolve().parent.parent.parent
FOLDER = ROOT / "build/bench"


class QuickRun(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        for file in FOLDER.glob("quick.*"):
            file.unlink()
        # The other daemon is left out, so that the test is the same on a machine that has it.
        of = [word for subject in ("service", "analytics", "bare", "sqlite") for word in ("--of", subject)]
        cls.outcome = subprocess.run([ROOT / "bench/run", "--quick", *of], capture_output=True, text=True)
        if cls.outcome.returncode != 0:
            raise AssertionError(cls.outcome.stderr)
        cls.results = json.loads((FOLDER / "quick.json").read_text())["results"]

    def test_leaves_no_target_of_the_service_alone_open(self):
        lines = [line for line in self.outcome.stdout.splitlines() if line.startswith("| ")]
        self.assertEqual([line for line in lines if "not measured" in line and "daemon" not in line], [])

    def test_finds_each_report_of_a_flood_in_the_table_or_in_the_kernels_count_of_losses(self):
        for name in ("service", "analytics"):
            flood = self.results["floods"][name]
            self.assertEqual(flood["sent"], 50_000)
            self.assertEqual(flood["stored"] + flood["kernel_lost"], flood["sent"], name)

    def test_sees_each_report_become_a_row_after_it_was_sent(self):
        for name in ("service", "analytics"):
            for run in self.results["latencies"][name]:
                self.assertEqual(run["seen"], run["sent"], name)
                self.assertGreater(run["p50_ms"], 0)

    def test_stores_what_waited_in_the_queue(self):
        queue = self.results["queue"]["service"]
        self.assertEqual(queue["stored"], queue["queued"])
        self.assertGreater(queue["bytes_per_item"], 180)  # the report itself

    def test_has_all_parts_of_the_processor_time(self):
        for flood in self.results["floods"].values():
            self.assertGreater(flood["cpu"]["receiving"] + flood["cpu"]["storing"], 0)
        self.assertGreater(self.results["floods"]["service"]["cpu"]["receiving"],
                           self.results["floods"]["bare"]["cpu"]["receiving"])

    def test_draws_a_chart(self):
        xml.etree.ElementTree.parse(FOLDER / "quick.svg")


if __name__ == "__main__":
    unittest.main()
