"""The pages that tallyctl writes, in a browser: what they ask for, what they run, how they fit and read, what they say."""

import itertools
import os
import pathlib
import random
import unittest

from browser import Browser
from harness import YESTERDAY, Device
from wear_days import wear_rows

FOLDER = pathlib.Path(os.environ["TBDAILY_PAGE"])  # where the rules are installed, and pictures go
AXE = (FOLDER / "node_modules/axe-core/axe.min.js").read_text()
POLICY = "default-src 'none'; style-src 'unsafe-inline'; img-src data:"
WIDTHS = {"wide": 1280, "narrow": 390}
BOUNDARIES = [1, 2.5, 10, 100, 1000, 100000]

# Each sets window.ran where a browser takes it for more than text.
PLANTED = ["<script>window.ran=1</script>", "\"><img src=x onerror=\"window.ran=1\">", "' onload='window.ran=1", "javascript:window.ran=1",
           "</title></style></svg><svg onload=window.ran=1>", "<iframe srcdoc=\"<script>parent.ran=1</script>\">", "<!--", "&lt;b&gt;",
           "<link rel=stylesheet href=https://example.org/x.css>", "<meta http-equiv=refresh content=\"0;url=https://example.org/\">",
           "long." + "x" * 300, "עברית.key", "grün.schlüssel"]

# What the page says, read off its elements: the whole figure where one is shortened.
READ = """(() => {
  const whole = cell => cell.querySelector('data') ? cell.querySelector('data').value : cell.textContent;
  const rows = table => [...table.querySelectorAll('tbody tr')].map(row => [...row.children].map(whole));
  return {
    scalars: Object.fromEntries([...document.querySelectorAll('#scalars ~ .sheet')].slice(0, 1).flatMap(sheet => rows(sheet))),
    histograms: [...document.querySelectorAll('article')].filter(card => card.querySelector('svg')).map(card => {
      const image = card.querySelector('svg[role=img]');
      return {name: image.getAttribute('aria-label'), bars: image.querySelectorAll('rect').length, key: card.querySelector('h3').textContent,
              rows: rows(card.querySelector('table'))};
    }),
  };
})()"""

# Whatever is wider than its place, but for regions that scroll and can be reached by keys.
OVERFLOW = """(() => {
  const place = document.documentElement.clientWidth;
  const wide = [...document.body.querySelectorAll('*')].filter(element => !element.closest('.scroll, .skip, svg'))
    .filter(element => element.getBoundingClientRect().right > place + 0.5).map(element => element.outerHTML.slice(0, 120));
  const scrolled = [...document.querySelectorAll('*')].filter(element => ['auto', 'scroll'].includes(getComputedStyle(element).overflowX))
    .filter(element => element.getAttribute('role') !== 'region' || element.tabIndex !== 0 || !element.getAttribute('aria-label'))
    .map(element => element.outerHTML.slice(0, 120));
  return {page: document.documentElement.scrollWidth - place, wide, scrolled};
})()"""

# All rules, also those that are not on by themselves.
JUDGE = """axe.run(document, {rules: Object.fromEntries(axe.getRules().map(rule => [rule.ruleId, {enabled: true}])), resultTypes: ['violations']})
  .then(found => found.violations.map(rule => [rule.id, rule.help, rule.nodes.slice(0, 3).map(node => node.html.slice(0, 160))]))"""


def planted_report(device):
    """A report that a run wrote, with what is planted wherever a text from outside can stand."""
    device.allow(ScalarKeys={key: {} for key in [*PLANTED, "plain", "least"]},
                 DistributionKeys={key: {"intervals": BOUNDARIES} for key in [*PLANTED, "many"]} |
                 {"without": {}, "fine": {"intervals": list(range(1, 60))}})
    generator = random.Random(7)
    lines = [f"s\t{key}\t{YESTERDAY}\t{number * 1234567}" for number, key in enumerate([*PLANTED, "plain"])]
    lines.append(f"s\tleast\t{YESTERDAY}\t{-2 ** 63}")
    for key in [*PLANTED, "many", "without", "fine"]:
        lines += [f"d\t{key}\t{YESTERDAY}\t{second}\t{generator.lognormvariate(3, 2):.5f}" for second in range(200)]
    lines.append(f"d\tmany\t{YESTERDAY}\t300\tnan")
    device.tally("record", "import", stdin="\n".join(lines) + "\n")
    device.run("-f")
    report = device.reports()[0]
    assert set(PLANTED) < set(report["TBScalars"]) and set(PLANTED) < set(report["TBDistributionsHistogram"])
    report["TBMetadata"].update({text: text for text in PLANTED})
    report["TBTaskID"] = report["TBTaskDigest"] = report["TBWhitelistDigest"] = PLANTED[1]
    report["TBActivatedAppInfo"] = [{"bundle": text, "version": text, "kestrelID": 1, "arch": -2, "uuid": text} for text in PLANTED]
    report["TBTasking"] = [{"Domain": text, "Key": text, "Value": [text]} for text in PLANTED] + [PLANTED[0], {"Domain": "d", "Key": "k"}]
    return report


class Pages(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.browser = Browser()
        cls.addClassCleanup(cls.browser.close)
        cls.device = Device()
        cls.addClassCleanup(cls.device.close)
        cls.report = planted_report(cls.device)
        cls.device.write("planted.193", cls.report)
        cls.pages = {name: FOLDER / f"{name}.html" for name in ("report", "planted", "wear", "wear-nothing")}
        cls.device.tally("report", str(cls.device.path("planted.193")), "--html", str(cls.pages["planted"]))

        sample = Device(sample=True)
        cls.addClassCleanup(sample.close)
        sample.run("-f")
        sample.tally("report", "--html", str(cls.pages["report"]))
        worn = Device()
        cls.addClassCleanup(worn.close)
        worn.tally("record", "import", stdin="".join(wear_rows()))
        for name, days in (("wear", "41"), ("wear-nothing", "1")):
            worn.tally("wear", "--history", "--days", days, "--endurance", "3000", "--html", str(cls.pages[name]))

    def test_a_page_asks_for_nothing_and_runs_nothing(self):
        for name, place in self.pages.items():
            with self.subTest(page=name):
                self.browser.open(place)
                head = "[...document.head.children].slice(0, 2).map(element => element.outerHTML)"
                self.assertEqual(self.browser.value(head), ['<meta charset="utf-8">', f'<meta http-equiv="Content-Security-Policy" content="{POLICY}">'])
                asked = [event["request"]["url"] for event in self.browser.happened("Network.requestWillBeSent")]
                self.assertEqual([url for url in asked if not url.startswith("data:")], [place.resolve().as_uri()])
                # A handler or script that the policy held back would be told of here.
                self.assertEqual(self.browser.happened("Log.entryAdded"), [])
                self.assertEqual(self.browser.value("[typeof window.ran, document.scripts.length, document.images.length]"), ["undefined", 0, 0])
        self.browser.open(self.pages["planted"])
        text = self.browser.value("document.body.textContent")
        for planted in PLANTED:
            self.assertGreaterEqual(text.count(planted), 8, planted)

    def test_a_page_fits_and_reads_in_light_and_dark(self):
        for name, place in self.pages.items():
            grounds = set()
            for size, scheme in itertools.product(WIDTHS, ("light", "dark")):
                with self.subTest(page=name, size=size, scheme=scheme):
                    self.browser.open(place, WIDTHS[size], scheme)
                    self.browser.screenshot(FOLDER / f"{name}-{size}-{scheme}.png")
                    self.assertEqual(self.browser.value(OVERFLOW), {"page": 0, "wide": [], "scrolled": []})
                    self.browser.value(AXE + "; true")
                    self.assertEqual(self.browser.value(JUDGE), [])
                grounds.add(self.browser.value("getComputedStyle(document.body).backgroundColor"))
            self.assertEqual(len(grounds), 2)

    def test_a_page_says_what_the_report_does(self):
        self.browser.open(self.pages["planted"])
        page = self.browser.value(READ)
        self.assertEqual({key: int(value) for key, value in page["scalars"].items()}, self.report["TBScalars"])
        histograms = {entry["key"]: entry for entry in page["histograms"]}
        self.assertEqual(set(histograms), set(self.report["TBDistributionsHistogram"]))
        for key, buckets in self.report["TBDistributionsHistogram"].items():
            drawn = histograms[key]
            self.assertIn(key, drawn["name"])
            self.assertEqual(drawn["bars"], len(buckets), key)
            bounds = {label.strip("(])").replace(", ", " "): count for label, count in buckets.items()}
            self.assertEqual({f"{lower} {upper}": int(count) for lower, upper, count in drawn["rows"]}, bounds)

    def test_a_page_prints_whole(self):
        for name, place in self.pages.items():
            with self.subTest(page=name):
                self.browser.open(place)
                pdf = self.browser.pdf()
                (FOLDER / f"{name}.pdf").write_bytes(pdf)
                self.assertTrue(pdf.startswith(b"%PDF-") and b"/Type /Page" in pdf)
                self.browser.call("Emulation.setEmulatedMedia", media="print")
                cut = self.browser.value("[...document.querySelectorAll('.scroll')].filter(e => e.scrollHeight > e.clientHeight + 1).length")
                self.assertEqual(cut, 0)
                self.browser.call("Emulation.setEmulatedMedia", media="")

    def test_many_keys_stand_in_parts_that_print_too(self):
        report = dict(self.report, TBScalars={f"key.{number}": number for number in range(2001)})
        self.device.write("many.193", report)
        place = FOLDER / "many.html"
        self.device.tally("report", str(self.device.path("many.193")), "--html", str(place))
        self.browser.open(place)
        parts = self.browser.value("[...document.querySelectorAll('details')].map(part => [part.open, part.querySelectorAll('tbody tr').length])")
        self.assertEqual(parts, [[True, 500], [False, 500], [False, 500], [False, 500], [False, 1]])
        last = "document.querySelectorAll('details')[3].getBoundingClientRect().height"
        closed = self.browser.value(last)
        self.browser.call("Emulation.setEmulatedMedia", media="print")
        self.assertGreater(self.browser.value(last), 20 * closed)
        self.browser.call("Emulation.setEmulatedMedia", media="")


if __name__ == "__main__":
    FOLDER.mkdir(parents=True, exist_ok=True)
    unittest.main()
