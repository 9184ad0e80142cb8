"""What the browser tests share: arguments, the browser, a workbench for each test, pictures of the page."""
import os
import sys
import unittest

import workbench_page as at

VLMAIL, EXAMPLES, PICTURES = sys.argv[1:4]
THE_BROWSER = []


def browser():
    """One for all tests: starting one takes longer than a test."""
    if not THE_BROWSER:
        THE_BROWSER.append(at.start_browser())
    return THE_BROWSER[0]


class BrowserTest(unittest.TestCase):
    def setUp(self):
        self.driver = browser()
        at.look(self.driver)
        self.driver.get_log("browser")

    def begin(self, folder, settings="settings.json", *options):
        """A workbench with a folder of its own, which is a copy of one of the examples, or of another folder."""
        bench = at.Workbench(VLMAIL, os.path.join(EXAMPLES, folder), settings, *options)
        self.addCleanup(bench.end)
        return bench

    def open(self, folder, settings="settings.json"):
        self.bench = self.begin(folder, settings)
        return self.page_of(self.bench)

    def page_of(self, bench):
        page = at.Page(self.driver, bench.url).wait_until_read()
        self.addCleanup(at.leave, self.driver)
        return page

    def accept(self, page):
        page.press('dialog[open] button[value="accept"]')

    def see_both_sides(self, page, theirs):
        """Saves a repair over what somebody else has saved meanwhile."""
        page.press(".repair")
        page.wait_for_field("total", "12.3")
        page.press("#save")
        self.accept(page)
        page.wait(lambda: len(page.find("dialog[open] .diff")) == 3, "both sides")
        self.assertIn(theirs, page.texts(".diff")[0])
        self.assertIn("(?i)", page.texts(".diff")[1])

    def second_tab(self):
        self.first = self.driver.current_window_handle
        self.driver.switch_to.new_window("tab")
        self.addCleanup(at.look, self.driver)
        return self.driver

    def leave_second_tab(self):
        self.driver.close()
        self.driver.switch_to.window(self.first)

    def write_picture(self, page, name):
        """The picture that a page of the documents shows; it has to be there."""
        file = os.path.join(PICTURES, name)
        if os.environ.get("UPDATE_GOLDEN") == "1":
            os.makedirs(PICTURES, exist_ok=True)
            page.picture(file)
        self.assertTrue(os.path.exists(file), "no picture %s; UPDATE_GOLDEN=1 makes it" % file)


def main():
    missing = at.missing_parts()
    if missing:
        print("no browser can be driven here: %s; scripts/setup tests installs what it takes" % missing)
        return 77
    try:
        program = unittest.main("__main__", argv=sys.argv[:1] + sys.argv[4:], exit=False, verbosity=2)
    finally:
        for driver in THE_BROWSER:
            driver.quit()
    return int(not program.result.wasSuccessful())
