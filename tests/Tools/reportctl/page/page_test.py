"""page_test.py PAGE_SAMPLE [SCREENSHOT_DIRECTORY]: the page of `reportctl page` in a real browser."""

import os
import subprocess
import sys
import tempfile
import unittest

sys.path.insert(0, os.path.dirname(__file__))
from browser import Browser  # noqa: E402

SAMPLE = sys.argv[1]
SCREENSHOTS = sys.argv[2] if len(sys.argv) > 2 else None
LOOKS = {"light": (1280, 900, "light"), "dark": (1280, 900, "dark"), "phone": (360, 740, "light")}


class Page(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.directory = tempfile.TemporaryDirectory()
        cls.path = os.path.join(cls.directory.name, "page.html")
        subprocess.run([SAMPLE, cls.path], check=True)
        cls.browser = Browser()
        cls.browser.zone("Europe/Berlin")

    @classmethod
    def tearDownClass(cls):
        cls.browser.__exit__()
        cls.directory.cleanup()

    def open(self, look="light"):
        self.browser.look(*LOOKS[look])
        self.browser.open(self.path)
        return self.browser

    def text(self, selector):
        return self.browser.value(f"document.querySelector({selector!r}).innerText")

    def rows(self, section):
        return self.browser.value(
            f"[...document.querySelectorAll('#{section} details tbody tr')]"
            ".map(row => [...row.cells].map(cell => cell.textContent.replace(/[^\\x20-\\x7e]/g, '')))")

    def test_complains_of_nothing_and_asks_for_nothing_in_any_look(self):
        for look in LOOKS:
            with self.subTest(look):
                page = self.open(look)
                self.assertEqual(page.complaints, [])
                self.assertEqual([url for url in page.requests if not url.startswith("data:")],
                                 ["file://" + self.path])
                if SCREENSHOTS:
                    page.screenshot(os.path.join(SCREENSHOTS, f"page-{look}.png"))

    def test_fits_a_phone(self):
        page = self.open("phone")
        self.assertLessEqual(page.value("document.documentElement.scrollWidth"), 360)

    def test_has_other_colours_in_the_dark(self):
        grounds = [self.open(look).value("getComputedStyle(document.body).backgroundColor")
                   for look in ("light", "dark")]
        self.assertEqual(grounds, ["rgb(255, 255, 255)", "rgb(13, 17, 23)"])

    def test_tells_the_verdict_with_its_reasons(self):
        self.open()
        self.assertEqual(self.text("#verdict strong"), "degraded")
        self.assertIn("12 reports were refused by the store", self.text("#verdict li"))

    def test_shows_where_reports_ended(self):
        self.open()
        flow = self.browser.value("[...document.querySelectorAll('#flow .flow li')]"
                                  ".map(item => item.innerText.replace(/\\s+/g, ' '))")
        self.assertEqual(flow, ["received 123,456", "→ in the store 120,000", "→ to analytics 3,000",
                                "→ control messages 40", "→ other control messages 2",
                                "→ empty datagrams 1", "→ waiting now 3",
                                "→ dropped by the system before the service saw them 77",
                                "→ refused: no JSON 398", "→ refused: by the store 12"])

    def test_has_the_numbers_of_each_chart_in_a_table(self):
        self.open()
        self.assertEqual([row[1] for row in self.rows("hours")], ["20", "7"])
        self.assertEqual([row[1] for row in self.rows("days")], ["1,000", *["0"] * 9, "27"])
        self.assertEqual([row[1] for row in self.rows("growth")], [*["1,500"] * 10, "1,527"])
        self.assertEqual(self.rows("modules"), [["B100", "1,020"], ["(no bar in the event id)", "7"]])
        self.assertEqual(self.rows("refused")[0][1:3], ["4", "12"])
        self.assertEqual(self.rows("outbox"), [["A759<img src=x onerror=alert(1)>", "55", "3,000"]])

    def test_counts_hours_and_days_in_the_viewers_zone_and_names_it(self):
        self.open()
        self.assertIn("Europe/Berlin", self.text("#generated"))
        berlin = self.rows("hours")[0][0]
        self.browser.zone("Asia/Kathmandu")
        self.open()
        self.assertIn("Asia/Kat", self.text("#generated"))
        self.assertNotEqual(self.rows("hours")[0][0], berlin)
        self.browser.zone("Europe/Berlin")

    def test_keeps_the_two_hours_apart_that_have_one_name_when_summer_time_ends(self):
        path = os.path.join(self.directory.name, "autumn.html")
        subprocess.run([SAMPLE, path, "0", "1792892100000"], check=True)  # 2026-10-25, 02:35 in winter time
        self.browser.open(path)
        self.assertEqual(self.rows("hours"), [["10/25/2026 02:00 GMT+2", "20"],
                                              ["10/25/2026 02:00 GMT+1", "7"]])

    def test_draws_each_chart(self):
        page = self.open()
        self.assertEqual(page.value("charts.length"), 7)
        self.assertTrue(page.value("charts.every(chart => chart.width > 100 && chart.height > 100)"))

    def test_takes_no_text_for_markup(self):
        page = self.open()
        self.assertEqual(page.value("document.title"), "Usage reports on this machine")
        self.assertEqual(page.value("document.querySelectorAll('img, b').length"), 0)
        self.assertIn("<script>document.title='forged'</script>", self.rows("events")[0][0])
        self.assertIn("<b>bold</b> & <!--", self.text("#log"))

    def test_lists_the_last_warnings_and_errors_with_time_and_place(self):
        self.open()
        self.assertEqual(self.text("#log li").replace("\u202f", " ").split("\n")[0],
                         "ERROR Nov 21, 2026, 3:05:06 PM, Frame/DBHelper:1 ExecSql")

    def test_can_be_used_with_a_keyboard_and_read_aloud(self):
        page = self.open()
        self.assertEqual(page.value("document.documentElement.lang"), "en")
        self.assertTrue(page.value("[...document.querySelectorAll('canvas')]"
                                   ".every(canvas => canvas.getAttribute('aria-label'))"))
        self.assertEqual(page.value("[...document.querySelectorAll('th')]"
                                    ".filter(head => !head.textContent || !head.scope).length"), 0)
        self.assertEqual(page.value("document.querySelector('#service th[scope=row]').textContent"),
                         "running")
        self.assertTrue(page.value("[...document.querySelectorAll('section')].every(section =>"
                                   " document.getElementById(section.getAttribute('aria-labelledby')))"))
        page.command("Input.dispatchKeyEvent",
                     {"type": "rawKeyDown", "key": "Tab", "code": "Tab", "windowsVirtualKeyCode": 9})
        page.command("Input.dispatchKeyEvent", {"type": "keyDown", "key": "Enter", "code": "Enter",
                                                "windowsVirtualKeyCode": 13, "text": "\r"})
        self.assertEqual(page.value("document.activeElement.tagName"), "SUMMARY")
        self.assertTrue(page.value("document.activeElement.parentElement.open"))

    def test_reloads_itself_until_it_is_told_not_to(self):
        path = os.path.join(self.directory.name, "watched.html")
        subprocess.run([SAMPLE, path, "1"], check=True)
        self.browser.open(path)
        self.browser.value("window.isOld = true")
        self.browser.value("document.querySelectorAll('#days summary, #outbox summary')"
                           ".forEach(summary => summary.click())")
        self.browser.wait("document.documentElement?.dataset.ready === 'yes' && !window.isOld")
        self.browser.value("document.getElementById('pause').click()")
        self.assertEqual(self.text("#pause"), "Go on reloading")
        self.assertEqual(self.browser.value("[...document.querySelectorAll('details[open]')]"
                                            ".map(details => details.closest('section').id)"),
                         ["days", "outbox"])


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1])
