#!/usr/bin/python3
"""The management console in a real browser: headless Chromium driven by Selenium against a
fileindex-web on a seeded simulated appliance, with fileindexctl changing things beside it.
Arguments: the console's URL, the token file, the directory for the screenshots and the directory
of the tools; FILEINDEXD_PID names the indexing daemon stand-in."""
import os
import re
import signal
import subprocess
import sys
import unittest

from selenium import webdriver
from selenium.common.exceptions import StaleElementReferenceException, TimeoutException
from selenium.webdriver.chrome.options import Options
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.common.by import By
from selenium.webdriver.support import expected_conditions as EC
from selenium.webdriver.support.ui import Select, WebDriverWait

URL, TOKEN_FILE, OUTPUT, TOOLS = sys.argv[1:5]


def ctl(*args):
    """fileindexctl on the same appliance, as another administrator would run it."""
    subprocess.run([os.path.join(TOOLS, "fileindexctl"), *args], check=True, capture_output=True)


def write_song(path, title, artist, album, year):
    """An MPEG audio file of about a second with these ID3v2.3 tags."""
    frames = b""
    for frame_id, text in (("TIT2", title), ("TPE1", artist), ("TALB", album), ("TYER", str(year))):
        data = b"\x00" + text.encode("latin-1")
        frames += frame_id.encode() + len(data).to_bytes(4, "big") + b"\x00\x00" + data
    size = bytes((len(frames) >> shift) & 0x7F for shift in (21, 14, 7, 0))  # seven bits a byte
    with open(path, "wb") as file:
        file.write(b"ID3\x03\x00\x00" + size + frames + (b"\xff\xfb\x90\x64" + bytes(413)) * 40)


def write(path, text="some text"):
    with open(path, "w", encoding="utf-8") as file:
        file.write(text)


# The controls a screen reader cannot name: no aria-label, no label, no text of their own.
UNNAMED = """return [...document.querySelectorAll('button, input, select, summary, [role=progressbar]')]
  .filter((e) => e.offsetParent !== null || e.tagName === 'SUMMARY')
  .filter((e) => !(e.getAttribute('aria-label') || '').trim() && !e.getAttribute('aria-labelledby')
    && !(e.labels && [...e.labels].some((l) => l.textContent.trim())) && !e.textContent.trim())
  .map((e) => e.outerHTML.slice(0, 80));"""


class ConsoleTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        options = Options()
        options.binary_location = "/usr/bin/chromium"
        for argument in ("--headless=new", "--no-sandbox", "--disable-gpu", "--window-size=1280,1000",
                         "--disable-background-networking", "--disable-component-update", "--no-first-run"):
            options.add_argument(argument)
        cls.browser = webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)
        # The page polls every 3 s: a change made elsewhere shows within a few polls.
        cls.wait = WebDriverWait(cls.browser, 20, ignored_exceptions=(StaleElementReferenceException,))

    @classmethod
    def tearDownClass(cls):
        cls.browser.quit()

    def rows(self):
        return self.browser.find_elements(By.CSS_SELECTOR, "#folders tbody tr")

    def first_cell(self, column):
        return self.rows()[0].find_elements(By.TAG_NAME, "td")[column].text

    def click(self, selector):
        """Clicks it, found again should a poll redraw the page between finding and clicking."""
        def clicked(_):
            self.browser.find_element(By.CSS_SELECTOR, selector).click()
            return True

        self.wait.until(clicked)

    def search_until(self, words, path):
        """Searches again until the hits hold `path`: the daemon indexes it meanwhile."""
        query = self.browser.find_element(By.ID, "search-query")
        for _ in range(100):
            query.clear()
            query.send_keys(words)
            self.click("#search-form button")
            self.wait_text("message", "Search for " + words + ": done.")
            if path in self.text("search-hits"):
                return
        self.fail(path + " never found by " + words)

    def text(self, element_id):
        return self.browser.find_element(By.ID, element_id).text

    def wait_text(self, element_id, text):
        try:
            self.wait.until(EC.text_to_be_present_in_element((By.ID, element_id), text))
        except TimeoutException:
            self.fail("#%s never showed %r; it shows %r" % (element_id, text, self.text(element_id)))

    def row_of(self, path):
        for row in self.rows():
            if row.find_elements(By.TAG_NAME, "td")[0].text == path:
                return row
        return None

    def status_of(self, path):
        row = self.row_of(path)
        return row.find_element(By.CSS_SELECTOR, 'td[data-label="Status"]').text if row else None

    def test_an_administrator_works_through_the_page(self):
        b = self.browser
        b.get(URL)
        self.wait.until(lambda _: len(self.rows()) == 10)
        self.assertIn("(16 folders)", self.text("page-info"))
        self.wait.until(lambda _: self.text("banner") not in ("", "…"))  # one sentence on top, whatever the state
        self.click("#service-details summary")  # the details behind it, one click away
        self.wait_text("daemon", "Indexing daemon: answers.")

        with open(TOKEN_FILE, encoding="ascii") as token:
            b.find_element(By.ID, "token").send_keys(token.read().strip())
        self.click("#token-form button")

        self.click('button.sort[data-key="name"]')  # ascending
        self.wait.until(lambda _: self.first_cell(1) == "Folder 00")
        self.click('button.sort[data-key="name"]')  # descending
        self.wait.until(lambda _: self.first_cell(1) == "Photos")
        sorted_by = b.find_element(By.CSS_SELECTOR, 'button.sort[data-key="name"]').find_element(By.XPATH, "..")
        self.assertEqual(sorted_by.get_attribute("aria-sort"), "descending")
        self.click("#next")
        self.wait_text("page-info", "Page 2 of 2")
        self.assertEqual(len(self.rows()), 6)
        # The page after the first, not its repeat (read again should a poll redraw the rows meanwhile).
        self.wait.until(lambda _: self.first_cell(1) == "Folder 05")

        # Saving adds the row and empties the form for the next folder.
        Select(b.find_element(By.ID, "per-page")).select_by_visible_text("50")
        b.find_element(By.ID, "folder-path").send_keys("/music/added")
        b.find_element(By.ID, "folder-name").send_keys("Added by hand")
        self.click("#folder-audio")
        self.click("#save-folder")
        self.wait_text("folders", "Added by hand")
        self.assertIn("(17 folders)", self.text("page-info"))
        self.assertEqual(b.find_element(By.ID, "folder-path").get_attribute("value"), "")
        self.assertFalse(b.find_element(By.ID, "folder-audio").is_selected())

        # A folder that cannot be indexed is added with a warning and says why in its row.
        b.find_element(By.ID, "folder-path").send_keys("/music/ghost")
        self.click("#save-folder")
        self.wait_text("message", "cannot be indexed now: the directory does not exist")
        self.wait.until(lambda _: self.status_of("/music/ghost") == "not indexable: canonical_path")
        # The result sits next to the form used.
        self.assertEqual(b.execute_script("return document.getElementById('folder-form').nextElementSibling.id"), "message")

        # Edit keeps the path and can be cancelled; Delete says the files stay, and focus stays on the page.
        self.click('button[aria-label="Edit /music/ghost"]')
        self.assertEqual(b.find_element(By.ID, "folder-path").get_attribute("readonly"), "true")
        self.click("#cancel-edit")
        self.assertEqual(b.find_element(By.ID, "folder-path").get_attribute("value"), "")
        self.click('button[aria-label="Delete /music/ghost"]')
        alert = b.switch_to.alert
        self.assertIn("Its files stay on the share", alert.text)
        alert.accept()
        self.wait.until(lambda _: self.row_of("/music/ghost") is None)
        self.assertEqual(b.switch_to.active_element.get_attribute("id"), "folders-title")

        # A path the library would only call malformed gets a reason.
        b.find_element(By.ID, "folder-path").send_keys("/music/added/")
        self.click("#save-folder")
        self.wait_text("message", 'drop the trailing "/": /music/added')

        # Changes made by another tool appear without a reload.
        ctl("folder", "add", "/music/other", "--name", "From the command line")
        self.wait_text("folders", "From the command line")
        ctl("share", "no-space", "music", "on")
        self.wait_text("shares", "Share music: out of space")
        self.wait.until(lambda _: self.status_of("/music/f00") == "err_no_space")
        self.click("#shares button")
        self.wait.until(lambda _: "out of space" not in self.text("shares"))
        self.wait.until(lambda _: self.status_of("/music/f00") != "err_no_space")

        # Paused with work held back; the idle share's bar is full, and says since when it is up to date.
        hours = b.find_element(By.ID, "pause-hours")
        hours.clear()
        hours.send_keys("0")
        self.click("#pause")
        self.wait_text("banner", "Paused until resumed")
        self.wait_text("pause-text", "paused until resumed")
        ctl("reindex", "/music/f01", "/music/f02")
        self.wait_text("progress", "music")
        self.wait.until(lambda _: "2 files left" in self.text("progress"))
        photo = [p for p in b.find_elements(By.CSS_SELECTOR, ".share-progress") if p.text.startswith("photo")][0]
        self.assertIn("0 files left, 0.0/s, done", photo.text)
        done = photo.find_element(By.CSS_SELECTOR, ".bar")  # nothing left is a full bar, for every share alike
        self.assertEqual((done.get_attribute("aria-valuenow"), done.get_attribute("aria-valuetext")), ("100", "done"))
        self.assertIn("up to date since", photo.text)
        progress = self.text("progress")
        self.assertRegex(progress, r"music\s+2 files left, 0\.0/s, time left unknown")
        # Per folder: the two with work left on their own lines, the rest folded under one.
        self.assertRegex(progress, r"/music/f01\s+1 file left, 0\.0/s, time left unknown")
        self.assertRegex(progress, r"/music/f02\s+1 file left")
        self.assertRegex(progress, r"\d+ folders of music up to date")

        # An explanation in words: the problem, the rules with their facts as text.
        b.find_element(By.ID, "explain-path").send_keys("/music/#recycle/old")
        self.click("#explain-form button")
        self.wait_text("explain-verdict", "not indexed: the path lies in the share's recycle bin (refused by recycle_bin)")
        self.assertIn("Governing folder: none", self.text("explanation"))
        self.click("#explanation summary")  # the rules are folded away until asked for
        explanation = self.text("explanation")
        self.assertIn("refuse: recycle bin", explanation)
        self.assertIn("marked yes, recycle bin yes", explanation)
        self.assertNotIn("{", explanation)
        self.assertNotIn("null", explanation)

        self.click("#resume")
        self.wait_text("pause-text", "running")

        # A search finds a file by a word of its text, without its accent, the word marked.
        with open(os.path.join(os.environ["QIRA_ROOT"], "volume1/music/f03/notes.txt"), "w", encoding="utf-8") as notes:
            notes.write("An old manuscript from Crète")
        ctl("reindex", "/music/f03")
        query = b.find_element(By.ID, "search-query")
        self.search_until("manus cret", "/music/f03/notes.txt")
        marks = [m.text for m in b.find_elements(By.CSS_SELECTOR, "#search-hits mark")]
        self.assertEqual(marks, ["manuscript", "Crète"])
        self.assertEqual(self.text("search-total"), "1 found.")
        # A facet's chip adds its filter to the query and searches again.
        self.click('#search-facets button[aria-label="Only type document, 1 found"]')
        self.wait.until(lambda _: query.get_attribute("value") == "manus cret type:document")
        self.wait_text("search-total", "1 found.")
        # A song, typed by its content, shows what it is about; its artist's chip keeps to it.
        write_song(os.path.join(os.environ["QIRA_ROOT"], "volume1/music/f03/track01"), "So What", "Miles Davis", "Kind of Blue", 1959)
        ctl("folder", "set", "/music/f03", "--document", "--audio")
        self.search_until("artist:davis", "/music/f03/track01")
        self.assertIn("So What, Miles Davis, Kind of Blue, 1959, 0:01", self.text("search-hits"))
        self.click('#search-facets button[aria-label="Only artist Miles Davis, 1 found"]')
        self.wait.until(lambda _: query.get_attribute("value") == 'artist:davis artist:"Miles Davis"')
        self.wait_text("search-total", "1 found.")
        self.click("#search-clear")  # the results can be cleared
        self.assertEqual(self.text("search-hits"), "")
        query.clear()
        query.send_keys("!!")  # no word: a hint, not a failure
        self.click("#search-form button")
        self.wait_text("message", "Search for !!: the query holds no word. Type a word or the start of one")
        self.assertEqual(b.find_element(By.ID, "message").get_attribute("class"), "warning")
        self.assertEqual(self.text("search-total"), "")
        self.wait.until(lambda _: "done" in self.text("progress") and "2 pending" not in self.text("progress"))
        self.assertLessEqual(b.execute_script("return document.documentElement.scrollWidth"), 1280)
        b.execute_script("window.scrollTo(0, 0)")
        b.save_screenshot(OUTPUT + "/console.png")

        # At 400 px wide nothing needs a horizontal scroll, not even a long path, and every row shows its
        # status, actions and switches in one line.
        long_path = "/music/" + "a-folder-name-that-never-breaks-" * 3
        os.makedirs(os.environ["QIRA_ROOT"] + "/volume1" + long_path, exist_ok=True)
        ctl("folder", "add", long_path, "--audio", "--photo")
        self.wait_text("folders", long_path)
        b.set_window_size(400, 1000)
        self.wait.until(lambda _: b.execute_script("return document.documentElement.scrollWidth") <= 400)
        self.wait.until(lambda _: self.row_of(long_path).find_element(
            By.CSS_SELECTOR, 'td[data-label="Indexes"]').text == "audio, photos")

        def one_line_row(_):
            row = self.row_of("/music/f00")
            cells = [row.find_element(By.CSS_SELECTOR, 'td[data-label="%s"]' % label) for label in ("Status", "Actions", "Indexes")]
            return all(cell.is_displayed() and cell.rect["x"] + cell.rect["width"] <= 400 for cell in cells)

        self.wait.until(one_line_row)
        b.execute_script("window.scrollTo(0, 0)")
        b.save_screenshot(OUTPUT + "/console-400.png")

        # The banner in each state, at both widths. A stopped daemon still accepts connections
        # but drains nothing, so work stays left to do: here a burst of new files, each queued as
        # created and then written, counted once.
        daemon = int(os.environ["FILEINDEXD_PID"])
        os.kill(daemon, signal.SIGSTOP)
        other = os.path.join(os.environ["QIRA_ROOT"], "volume1/music/other")
        write(other + "/probe.txt")
        self.wait.until(lambda _: "1 file left" in self.text("banner") or "1 change left" in self.text("banner"))
        for i in range(119):
            write("%s/burst-%03d.txt" % (other, i))
        self.wait_text("banner", "120 changes left to index, time left unknown")
        self.shoot("working")
        # The daemon applies 5 records a pass: the share's and the folder's files left fall while
        # it works, and the banner gives a rate and a time left.
        os.kill(daemon, signal.SIGCONT)
        seen = {"share": [], "folder": [], "banner": []}

        def note(_):
            bars = {bar.get_attribute("aria-label"): bar.get_attribute("aria-valuetext")
                    for bar in b.find_elements(By.CSS_SELECTOR, "#progress .bar")}
            for key, label in (("share", "Indexing of music"), ("folder", "Indexing of /music/other")):
                value = bars.get(label)
                if value and (not seen[key] or seen[key][-1] != value):
                    seen[key].append(value)
            seen["banner"].append(self.text("banner"))
            return seen["share"] and seen["share"][-1] == "done"

        WebDriverWait(b, 180, poll_frequency=0.2, ignored_exceptions=(StaleElementReferenceException,)).until(note)
        for key in ("share", "folder"):
            lefts = [int(value.split()[0]) for value in seen[key] if value != "done"]
            self.assertGreaterEqual(len(lefts), 3, seen[key])  # it moved, more than once, while work was done
            self.assertTrue(all(a > b for a, b in zip(lefts, lefts[1:])), seen[key])
        self.assertEqual(seen["share"][0], "120 files left")
        self.assertTrue(any(re.search(r"changes left to index, [0-9.]+ per second, about .+ left", text)
                            for text in seen["banner"]), seen["banner"][-5:])
        self.wait_text("banner", "Up to date: ")
        self.shoot("up-to-date")
        ctl("service", "pause", "--hours", "2")
        self.wait_text("banner", "Paused until")
        self.assertTrue(b.find_element(By.ID, "resume").is_enabled())
        self.shoot("paused")
        ctl("service", "resume")
        os.kill(daemon, signal.SIGTERM)
        self.wait_text("banner", "The indexing daemon does not answer")
        self.shoot("daemon-down")
        # A pause saved while the daemon is down is a warning that says what happens next.
        self.click("#pause")
        self.wait_text("message", "Pause: saved, not applied yet.")
        self.wait_text("message", "It takes effect when the indexing daemon answers again.")
        self.assertEqual(b.find_element(By.ID, "message").get_attribute("class"), "warning")
        self.wait_text("banner", "The indexing daemon does not answer")

    def shoot(self, state):
        for width in (1280, 400):
            self.browser.set_window_size(width, 1000)
            try:
                self.wait.until(lambda b: b.execute_script("return document.documentElement.scrollWidth") <= width)
            except TimeoutException:
                wide = self.browser.execute_script(
                    "return [...document.querySelectorAll('body *')].filter((e) => e.getBoundingClientRect().right > %d)"
                    ".map((e) => e.tagName + '#' + e.id + '.' + e.className + ' ' + e.textContent.slice(0, 40))" % width)
                self.fail("the %s page is wider than %d px: %s" % (state, width, wide[:5]))
            self.assertEqual(self.browser.execute_script(UNNAMED), [], "%s at %d px" % (state, width))
            self.browser.execute_script("window.scrollTo(0, 0)")
            self.browser.save_screenshot("%s/banner-%s-%d.png" % (OUTPUT, state, width))


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1], verbosity=2)
