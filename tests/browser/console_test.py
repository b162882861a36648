#!/usr/bin/python3
"""The management console in a real browser: headless Chromium driven by Selenium against a
fileindex-web on a seeded simulated appliance. Arguments: the console's URL, the token file and
the directory for the screenshot."""
import sys
import unittest

from selenium import webdriver
from selenium.common.exceptions import StaleElementReferenceException
from selenium.webdriver.chrome.options import Options
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.common.by import By
from selenium.webdriver.support import expected_conditions as EC
from selenium.webdriver.support.ui import Select, WebDriverWait

URL, TOKEN_FILE, OUTPUT = sys.argv[1:4]


class ConsoleTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        options = Options()
        options.binary_location = "/usr/bin/chromium"
        for argument in ("--headless=new", "--no-sandbox", "--disable-gpu", "--window-size=1280,1000"):
            options.add_argument(argument)
        cls.browser = webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)
        cls.wait = WebDriverWait(cls.browser, 15, ignored_exceptions=(StaleElementReferenceException,))

    @classmethod
    def tearDownClass(cls):
        cls.browser.quit()

    def rows(self):
        return self.browser.find_elements(By.CSS_SELECTOR, "#folders tbody tr")

    def first_cell(self, column):
        return self.rows()[0].find_elements(By.TAG_NAME, "td")[column].text

    def click(self, selector):
        self.browser.find_element(By.CSS_SELECTOR, selector).click()

    def test_an_administrator_works_through_the_page(self):
        b = self.browser
        b.get(URL)
        self.wait.until(lambda _: len(self.rows()) == 10)
        self.assertIn("(15 folders)", b.find_element(By.ID, "page-info").text)

        with open(TOKEN_FILE, encoding="ascii") as token:
            b.find_element(By.ID, "token").send_keys(token.read().strip())
        self.click("#token-form button")

        self.click('button.sort[data-key="name"]')  # ascending
        self.wait.until(lambda _: self.first_cell(1) == "Folder 00")
        self.click('button.sort[data-key="name"]')  # descending
        self.wait.until(lambda _: self.first_cell(1) == "Folder 14")

        self.click("#next")
        self.wait.until(EC.text_to_be_present_in_element((By.ID, "page-info"), "Page 2 of 2"))
        self.assertEqual(len(self.rows()), 5)

        Select(b.find_element(By.ID, "per-page")).select_by_visible_text("50")
        b.find_element(By.ID, "folder-path").send_keys("/music/added")
        b.find_element(By.ID, "folder-name").send_keys("Added by hand")
        self.click("#folder-audio")
        self.click("#save-folder")
        self.wait.until(EC.text_to_be_present_in_element((By.ID, "folders"), "Added by hand"))
        self.assertIn("(16 folders)", b.find_element(By.ID, "page-info").text)

        hours = b.find_element(By.ID, "pause-hours")
        hours.clear()
        hours.send_keys("0")
        self.click("#pause")
        self.wait.until(EC.text_to_be_present_in_element((By.ID, "pause-text"), "paused until resumed"))

        b.find_element(By.ID, "explain-path").send_keys("/music/#recycle/old")
        self.click("#explain-form button")
        self.wait.until(EC.text_to_be_present_in_element((By.ID, "explain-verdict"), "refused by recycle_bin"))

        self.click("#resume")
        self.wait.until(EC.text_to_be_present_in_element((By.ID, "pause-text"), "running"))
        b.save_screenshot(OUTPUT + "/console.png")


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1], verbosity=2)
