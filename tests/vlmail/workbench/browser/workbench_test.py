#!/usr/bin/python3
"""workbench_test.py VLMAIL EXAMPLES PICTURES [TEST...]: uses the workbench in a browser as a person does.

With UPDATE_GOLDEN=1 it writes the pictures that the documents show anew, into the folder PICTURES."""
import json
import os
import shutil
import subprocess
import sys
import tempfile

sys.dont_write_bytecode = True
import workbench_page as at
from browser_test import EXAMPLES, VLMAIL, BrowserTest, main

BROKEN = os.path.join(EXAMPLES, "broken")
XSS = "<img src=x onerror=\"document.title='taken'\"><script>document.title='taken'</script>"


class Reading(BrowserTest):
    def test_documents_page_fields_and_settings_are_shown(self):
        page = self.open("office").wait_for_picture()
        page.wait_for_field("number", "2024-17")
        self.assertEqual(page.texts("#list .name")[0], "Invoice 17.pdf")
        self.assertEqual(page.run("return document.querySelectorAll('#stage .zone').length"), 2)
        self.assertIn('"Invoices"', page.settings())
        self.assertEqual(page.logged(), [])

    def test_another_document_is_read_when_it_is_chosen(self):
        page = self.open("office")
        page.wait(lambda: len(page.find("#list .row")) == 4, "the list")
        page.choose("Invoice 18.pdf")
        page.wait_for_field("number", "2024-18")
        self.assertEqual(page.texts("#list [aria-selected=true] .name"), ["Invoice 18.pdf"])

    def test_a_letter_as_the_texts_of_its_zones_has_fields_and_no_page(self):
        bench = self.begin("broken/other-letter-case")
        with open(os.path.join(bench.folder, "invoice 18.zones"), "w", encoding="utf-8") as file:
            file.write("[Text]\nTotal: 7.50 EUR\n")
        page = self.page_of(bench)
        page.choose("invoice 18.zones")
        page.wait_for_field("total", "7.5")
        self.assertIn("Letter 1 of 1, texts of its zones", page.texts("#fields-body h3")[0])
        self.assertEqual(page.texts("#picture-note"), ["a letter as the texts of its zones has no pages"])
        page.press("#golden")
        page.wait(lambda: page.texts("#message") == ["Kept in invoice 18.zones.expected.json."], "the case")
        page.type_settings(page.settings().replace("^Total", "^Sum"))
        page.wait(lambda: "1 not as kept" in page.texts("#tab-effect")[0], "the difference")
        self.assertEqual(page.logged(), [])

    def test_the_list_filters_by_name_and_by_verdict(self):
        page = self.open("office")
        page.wait(lambda: page.texts("#counts")[0].startswith("4 of 4 shown") and "not read" not in page.texts("#counts")[0], "the verdicts")
        page.one("#filter").send_keys("march")
        page.wait(lambda: page.texts("#list .name") == ["Invoices March.pdf"], "the filter")
        page.one("#kind").send_keys("with trouble")
        page.wait(lambda: page.texts("#counts")[0].startswith("0 of 4 shown"), "no trouble")

    def test_a_thousand_documents_are_a_few_rows(self):
        bench = self.begin("office")
        source = os.path.join(bench.folder, "Invoice 17.pdf")
        for number in range(1000):
            os.link(source, os.path.join(bench.folder, "Invoice %04d.pdf" % number))
        page = self.page_of(bench)
        page.wait(lambda: "of 1004 shown" in page.texts("#counts")[0], "all documents")
        self.assertLess(len(page.find("#list .row")), 60)
        page.one("#list").send_keys(at.keys().END)
        page.wait(lambda: page.texts("#list [aria-selected=true] .name") == ["Invoices March.pdf"], "the last one")


    def test_pages_of_a_long_document_are_drawn_when_they_are_turned_to(self):
        bench = self.begin("broken/other-letter-case")
        document = os.path.join(bench.folder, "invoice 17.txt")
        with open(document, "a", encoding="utf-8") as file:
            file.write("".join("\fPage %d" % page for page in range(2, 501)))
        page = self.page_of(bench).wait_for_picture()
        self.assertEqual(page.texts("#page-count"), ["of 500"])
        page.one("#page-number").send_keys(at.keys().BACKSPACE, "500", at.keys().TAB)
        page.wait(lambda: page.run("return document.querySelector('#stage img').alt") == "page 500 of invoice 17.txt", "the last page")
        page.wait_for_picture()
        drawn = "return performance.getEntriesByType('resource').filter((one) => one.name.endsWith('/api/picture')).length"
        self.assertEqual(page.run(drawn), 2)

    def test_a_document_that_has_vanished_is_told_in_a_line(self):
        page = self.open("office")
        page.wait(lambda: "4 of 4 shown" in page.texts("#counts")[0], "the list")
        os.remove(os.path.join(self.bench.folder, "Invoice 18.pdf"))
        page.choose("Invoice 18.pdf")
        page.wait(lambda: "Invoice 18.pdf" in "".join(page.texts("#alert, #fields-body .why")), "the complaint")
        page.choose("Invoice 17.pdf")
        page.wait_for_field("number", "2024-17")

    def test_a_document_that_changes_is_read_anew(self):
        bench = self.begin("broken/other-letter-case")
        page = self.page_of(bench).wait_for_picture()
        file = os.path.join(bench.folder, "invoice 17.txt")
        with open(file, encoding="utf-8") as letter:
            text = letter.read()
        picture = "document.querySelector('#stage img').src"
        before = page.run("return " + picture)
        with open(file, "w", encoding="utf-8") as letter:
            letter.write(text.replace("TOTAL", "Total") + "\n\nand more\n")
        page.run("document.dispatchEvent(new Event('visibilitychange'))")
        page.wait_for_field("total", "12.3")
        page.until("document.querySelector('#list .verdict').innerText.startsWith('\u2713')", "the verdict")
        page.until(picture + " !== a[0]", "the picture of what it holds", before)
        with open(file, "w", encoding="utf-8") as letter:
            letter.write(text)
        page.type_settings(page.settings() + "\n")
        page.until("%s[0] === '\u2717 missing'" % at.FIELD, "the field is missing again", "total")

    def test_a_document_that_stops_its_reader_is_marked_and_the_others_go_on(self):
        bench = self.begin("office", "settings.json", "--document-seconds", "1")
        with open(os.path.join(bench.folder, "Invoice 16.pdf"), "wb") as file:
            file.write(at.endless_pdf())
        page = self.page_of(bench)
        refused = "\u2717 cannot read \"Invoice 16.pdf\": it took more than 1 s of processor time"
        page.until("[...document.querySelectorAll('#fields-body .why, #alert')].filter((one) => one.innerText.startsWith(a[0])).length === 2", "the refusal", refused)
        page.choose("Invoice 17.pdf")
        page.wait_for_field("number", "2024-17")
        marked = "[...document.querySelectorAll('#list .failed .name')].map((one) => one.innerText).join() === 'Invoice 16.pdf'"
        page.until(marked + " && !document.querySelector('#list .waiting')", "the mark, and the verdicts of the others")
        page.type_settings(page.settings().replace("^Invoice:", "^No such label:"))
        page.until("document.querySelectorAll('#list .row').length === 5 && document.querySelector('#tab-effect').innerText.includes('4 worse')", "the effect on the others")
        page.choose("Invoice 18.pdf")
        page.until("document.querySelector('#stage img').alt.endsWith('Invoice 18.pdf')", "the picture")
        page.press("#undo")
        page.wait_for_field("number", "2024-18")

    def test_a_folder_without_rights_is_told_in_a_line(self):
        bench = self.begin_without_rights("office")
        locked = os.path.join(bench.folder, "locked")
        os.mkdir(locked, 0)
        page = self.page_of(bench)
        page.until("document.querySelector('#alert').innerText.includes(a[0])", "the complaint", "cannot look into \"%s\": " % locked)
        page.wait_for_field("number", "2024-17")

    def begin_without_rights(self, folder):
        """As a user who may not read everything."""
        user = 65534 if os.geteuid() == 0 else None
        old = os.umask(0o022)
        self.addCleanup(os.umask, old)
        try:
            bench = at.Workbench(VLMAIL, os.path.join(EXAMPLES, folder), "settings.json", user=user)
        except PermissionError as failure:
            self.skipTest("whoever has no rights cannot start the program here: %s" % failure)
        self.addCleanup(bench.end)
        return bench

    def test_a_pattern_that_runs_away_is_refused_and_the_page_lives(self):
        bench = self.begin("broken/other-letter-case")
        with open(os.path.join(bench.folder, "invoice 17.txt"), "a", encoding="utf-8") as file:
            file.write("\n" + "a" * 60 + "\n")
        page = self.page_of(bench)
        text = page.settings()
        page.type_settings(text.replace("^Total: (?<VAL>[\\\\d.]+) EUR$", "^(a|aa)+(?<VAL>)b$"))
        page.wait(lambda: "cannot be searched in this text" in "".join(page.texts("#fields-body")), "the refusal")
        page.type_settings(text.replace("^Total", "^TOTAL"))
        page.wait_for_field("total", "12.3")


class Changing(BrowserTest):
    def test_every_near_miss_of_the_broken_examples_is_repaired_by_its_button(self):
        bench = self.begin("broken/other-letter-case")
        open(os.path.join(bench.folder, "invoice 17.pdf"), "wb").close()
        page = self.page_of(bench)
        for place, name in enumerate(sorted(os.listdir(BROKEN))):
            if os.path.isdir(os.path.join(BROKEN, name)):
                with self.subTest(name):
                    self.show(page, bench, name, place)
                    self.repair_each(page)

    def show(self, page, bench, example, place):
        """Puts an example in the place of the one before, so that the page need not be loaded again."""
        document = next(one for one in sorted(os.listdir(os.path.join(BROKEN, example))) if one.startswith("invoice 17"))
        shutil.copyfile(os.path.join(BROKEN, example, document), os.path.join(bench.folder, document))
        page.choose(document)
        with open(os.path.join(BROKEN, example, "settings.json"), encoding="utf-8") as file:
            page.type_settings(file.read() + "\n" * place)
        page.wait_until_read()

    def repair_each(self, page):
        before, misses = page.settings(), len(page.find(".near li"))
        press = """
            const miss = document.querySelectorAll('.near li')[arguments[0]];
            miss.querySelector('.repair')?.click();
            return miss.querySelector('.repair') && miss.closest('.field').ariaLabel;
        """
        repaired = 0
        for place in range(misses):
            field = page.run(press, place)
            if field is None:
                continue
            repaired += 1
            page.until("%s !== a[1] && %s[0] === '\u2713 found'" % (at.SETTINGS, at.FIELD), "%s, mended by miss %d" % (field, place + 1), field, before)
            page.press("#undo")
            page.until("%s === a[0] && document.querySelectorAll('.near li').length === a[1] && !document.querySelector('[aria-busy]')" % at.SETTINGS, "the settings before", before, misses)
        self.assertGreater(repaired, 0)

    def test_a_pattern_that_is_typed_shows_its_effect(self):
        page = self.open("broken/other-letter-case")
        pattern = page.one("[aria-label=total] .pattern input")
        pattern.clear()
        pattern.send_keys("^TOTAL: (?<VAL>[\\d.]+) EUR$")
        page.wait_for_field("total", "12.3")
        self.assertIn('"^TOTAL: (?<VAL>[\\\\d.]+) EUR$"', page.settings())

    def test_undo_and_redo_go_through_the_whole_session(self):
        page = self.open("broken/other-letter-case")
        first = page.settings()
        page.press(".repair")
        page.wait_for_field("total", "12.3")
        second = page.settings()
        page.type_settings(second.replace("Invoices", "Bills"))
        page.wait(lambda: "Bills" in "".join(page.texts("#fields-body .quietly")), "the new name")
        page.press("#undo")
        page.press("#undo")
        page.wait(lambda: page.settings() == first and page.field("total")[0] == "\u2717 missing", "the settings at first")
        page.press("#redo")
        page.wait_for_field("total", "12.3")
        self.assertEqual(page.settings(), second)

    def test_broken_json_names_its_line_and_keeps_the_last_picture(self):
        page = self.open("broken/other-letter-case").wait_for_picture()
        text = page.settings()
        page.type_settings(text.replace('"pack_preset"', 'pack_preset"', 1))
        page.wait(lambda: "Line 5:" in "".join(page.texts("#alert")), "the line")
        self.assertEqual(page.texts("#lint li button"), ["Line 5"])
        self.assertGreater(len(page.find("#stage .zone")), 0)
        self.assertTrue(page.run("return document.querySelector('#stage img').naturalWidth"))
        page.type_settings(text)
        page.wait(lambda: page.texts("#alert") == [""], "the end of the complaint")

    def test_findings_of_lint_stand_at_their_lines(self):
        page = self.open("broken/other-letter-case")
        page.type_settings(page.settings().replace('"obligatory"', '"obligatry"'))
        line = page.settings().split("\n").index('       "obligatry": true') + 1
        page.wait(lambda: "Line %d" % line in page.texts("#lint li button"), "the finding at line %d" % line)
        page.press("#lint li button")
        self.assertEqual(page.run("return document.querySelector('#editor .CodeMirror').CodeMirror.getCursor().line"), line - 1)

    def test_a_key_is_completed_with_its_documentation(self):
        page = self.open("broken/other-letter-case")
        line = page.settings().split("\n").index('       "obligatory": true')
        page.run("const m = document.querySelector('#editor .CodeMirror').CodeMirror; m.focus(); m.setCursor({line: arguments[0], ch: 7});", line)
        page.keys('"mak')
        hint = page.one(".CodeMirror-hint")
        self.assertIn("make_one_line: delete line breaks", hint.text)
        page.keys(at.keys().ENTER)
        page.wait(lambda: '"make_one_line": true"obligatory"' in page.settings(), "the completed key")

    def test_a_form_changes_a_key_and_tells_what_it_is_for(self):
        page = self.open("broken/other-letter-case")
        page.press("#tab-form")
        row = page.one('[data-pointer="/extract_presets/0/skip_first_page"]')
        says = page.run("return document.getElementById(arguments[0].getAttribute('aria-describedby')).textContent", row)
        self.assertEqual(says, "the first page is a cover sheet and belongs to no letter")
        row.click()
        page.wait(lambda: '"skip_first_page": true' in page.settings(), "the key")
        page.press("#undo")
        page.wait(lambda: "skip_first_page" not in page.settings(), "no key")

    def test_what_becomes_better_and_worse_can_be_walked_through(self):
        page = self.open("broken/other-letter-case")
        page.press(".repair")
        page.wait(lambda: page.texts("#tab-effect") == ["Effect: 1 better, 0 worse"], "what is better")
        page.press("#tab-effect")
        self.assertEqual(page.texts(".effect.better .link"), ["invoice 17.txt"])
        page.press('[data-key="compareFromHere"]')
        page.wait(lambda: page.texts("#tab-effect") == ["Effect: 0 better, 0 worse"], "the comparison from here")


    def test_buttons_lead_from_one_document_that_changes_to_the_next(self):
        page = self.open("office")
        page.until("document.querySelectorAll('#list .ready').length === 4", "the verdicts")
        page.type_settings(page.settings().replace("^Customer:", "^No such label:"))
        page.until("/: 0 better, [1-4] worse/.test(document.querySelector('#tab-effect').innerText)", "the effect")
        page.until("!document.querySelector('#list .waiting')", "all verdicts")
        page.press("#tab-effect")
        worse = page.texts(".effect.worse .link")
        self.assertGreater(len(worse), 1)
        opened = "document.querySelector('#list [aria-selected=true] .name').innerText === a[0]"
        for name in worse[1:] + worse[:1]:
            page.press('[data-key="walkOn"]')
            page.until(opened, "the next one", name)
            self.assertEqual(page.texts('.effect.worse [aria-current="true"]'), [name])
        page.press('[data-key="walkBack"]')
        page.until(opened, "the last one again", worse[-1])

    def test_settings_are_edited_in_a_plain_field_where_there_is_no_editor(self):
        block = lambda urls: self.driver.execute_cdp_cmd("Network.setBlockedURLs", {"urls": urls})
        self.driver.execute_cdp_cmd("Network.enable", {})
        self.addCleanup(block, [])
        block(["*codemirror*"])
        page = self.open("broken/other-letter-case")
        self.assertEqual(page.find(".CodeMirror"), [])
        area = page.one("#editor textarea")
        self.assertEqual(area.get_attribute("aria-label"), "Settings as JSON; Ctrl+Space completes")
        text = page.settings()
        page.run("arguments[0].setSelectionRange(arguments[1], arguments[1])", area, len(text))
        area.send_keys("x")
        page.until("document.querySelector('#alert').innerText.includes('Line ')", "the line of the fault")
        page.press("#lint li button")
        self.assertEqual(page.run("return document.activeElement.selectionStart"), len(text))
        page.keys(at.keys().DELETE)
        page.until("document.querySelector('#alert').innerText === ''", "the end of the complaint")
        self.assertEqual(page.settings(), text)
        page.wait_until_read().press(".repair")
        page.wait_for_field("total", "12.3")
        self.assertIn("(?i)", area.get_attribute("value"))
        page.press("#undo")
        page.until("%s === a[0]" % at.SETTINGS, "the settings before", text)


class Zones(BrowserTest):
    def test_a_zone_is_dragged_and_the_field_appears(self):
        page = self.open("broken/zone-ends-too-high").wait_for_picture()
        page.press('#stage .zone[aria-label="zone Text"]')
        page.drag('#stage .zone[aria-label="zone Text"] .handle.b', (0.5, 0.5), (0, 9))
        page.wait_for_field("total", "12.3")
        bottom = json.loads(page.settings())["extract_presets"][0]["zones"][1]["location"]["bottom"]
        self.assertGreater(bottom, 14000)
        self.assertEqual(page.texts("#undo")[0] and page.one("#undo").get_attribute("title"), "place of zone Text")

    def test_a_zone_snaps_to_the_text_under_it(self):
        page = self.open("broken/zone-ends-too-high").wait_for_picture()
        zone = page.one('#stage .zone[aria-label="zone Text"]')
        zone.send_keys("f")
        page.wait(lambda: json.loads(page.settings())["extract_presets"][0]["zones"][1]["location"] != {"left": 2000, "top": 8500, "right": 20000, "bottom": 13400}, "the zone around its text")
        location = json.loads(page.settings())["extract_presets"][0]["zones"][1]["location"]
        self.assertEqual(location, {"left": 2400, "top": 11060, "right": 7892, "bottom": 12460})

    def test_arrows_move_and_resize_a_zone(self):
        keys = at.keys()
        page = self.open("broken/zone-ends-too-high").wait_for_picture()
        zone = page.one('#stage .zone[aria-label="zone Text"]')
        zone.send_keys(keys.ARROW_LEFT)
        page.wait(lambda: '"left": 1900' in page.settings(), "one millimetre to the left")
        page.wait_until_read()
        page.wait(lambda: page.focused() == "zone Text", "the focus on the zone")
        for step in range(8):
            page.chord(keys.SHIFT, keys.ARROW_DOWN)
        page.wait_for_field("total", "12.3")

    def test_a_zone_has_numbers_and_a_name(self):
        keys = at.keys()
        page = self.open("broken/zone-ends-too-high")
        page.one('#stage .zone[aria-label="zone Text"]').send_keys(keys.ENTER)
        name, left, top, right, bottom = page.find("#zone-form input")
        name.clear()
        name.send_keys("Body", keys.TAB)
        page.wait(lambda: page.find('#stage .zone[aria-label="zone Body"]'), "the new name")
        bottom = page.find("#zone-form input")[4]
        bottom.clear()
        bottom.send_keys("141", keys.TAB)
        page.wait_for_field("total", "12.3")

    def test_a_new_zone_is_drawn_and_its_field_is_read(self):
        page = self.open("broken/zone-ends-too-high").wait_for_picture()
        page.press("#draw")
        page.drag('#stage .zone[aria-label="address window Address"]', (0.02, 0.02), (60, 18))
        page.one("dialog[open]")
        page.keys("first")
        page.select("dialog[open] select", "0")
        page.press('dialog[open] button[value="accept"]')
        page.wait_for_field("first", "Anna Arnold")

    def test_a_new_zone_is_made_by_keyboard_alone(self):
        keys = at.keys()
        page = self.open("broken/zone-ends-too-high").wait_for_picture()
        page.one('#stage .zone[aria-label="zone Text"]').send_keys("n")
        for step in range(12):
            page.keys(keys.ARROW_DOWN)
        page.keys(keys.ENTER)
        page.one("dialog[open]")
        page.keys("greeting", keys.ENTER)
        page.wait(lambda: page.field("greeting"), "the new field")
        self.assertEqual(json.loads(page.settings())["extract_presets"][0]["zones"][2]["name"], "Zone 3")


class Printed(BrowserTest):
    """Pages as they will be printed, as the report shows them."""

    def begin_with(self, keys):
        home = tempfile.TemporaryDirectory()
        self.addCleanup(home.cleanup)
        letters, self.parts = os.path.join(home.name, "letters"), os.path.join(home.name, "parts")
        address = {"name": "postal", "value_extract": "\\A(?<VAL>(.{1,72}\\n){1,8}.{1,72})\\Z", "priority": 1, "send_to_server": True}
        zones = [
            {"name": "Address", "location": {"left": 2000, "top": 3000, "right": 9000, "bottom": 6500}, "fields": [address]},
            {"name": "Text", "location": {"left": 2000, "top": 7500, "right": 20000, "bottom": 12000}, "fields": [{"name": "bill", "value_extract": "^Bill: (?<VAL>.*)$"}]},
        ]
        settings = {"extract_presets": [{"match": ".*", "pack_preset": "P", "zones": zones}], "pack_presets": [{"name": "P", **keys}]}
        for file, text in (
            ("letters/a.txt", "\n\n\n\n\nAda Brook\n14 Mill Lane\nHEBDEN BRIDGE\nHX7 8AB\n\n\n\n\nDear Ada,\n\nBill: 17\n"),
            ("letters/settings.json", json.dumps(settings, indent=1)),
            ("parts/head.txt", "\n\n" + " " * 40 + "THE MILL"),
            ("parts/terms.txt", "Terms\fmore of them"),
        ):
            os.makedirs(os.path.dirname(os.path.join(home.name, file)), exist_ok=True)
            with open(os.path.join(home.name, file), "w", encoding="utf-8") as out:
                out.write(text)
        self.bench = self.begin(letters, "settings.json", "--documents", self.parts)
        return self.page_of(self.bench).wait_for_picture()

    def reported(self):
        """What the report of the same document draws."""
        report = os.path.join(self.bench.home, "report.html")
        arguments = ["letter", os.path.join(self.bench.folder, "a.txt"), "--settings", self.bench.settings, "--documents", self.parts, "--report", report]
        subprocess.run([VLMAIL] + arguments, stdout=subprocess.DEVNULL, check=False)
        at.leave(self.driver)
        self.driver.get("file://" + report)
        sides = "return [...document.querySelectorAll('.sides li')].map((one) => one.textContent.trim().replace(/\"(.*)\"/, '\u201c$1\u201d'))"
        return at.marks_in(self.driver, ".sheet"), self.driver.execute_script(sides)

    def test_marks_and_sides_are_those_of_the_report(self):
        window = {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}
        for name, keys in (
            ("findings", {"production": {"window": window}}),
            ("turned", {"orientation": 2}),
            ("all that goes out", {"duplex": True, "letterheads": ["head"], "attachments": ["terms"], "production": {"window": window, "repair": ["cover-page"]}}),
        ):
            with self.subTest(name):
                page = self.begin_with(keys)
                page.wait(lambda: len(page.marks()) > 2 or "production" not in keys or "repair" in keys["production"], "the findings")
                if "attachments" in keys:
                    page.wait(lambda: len(page.find("#sides img")) == 4, "the sides")
                drawn = page.marks(), page.texts("#sides li")
                self.assertEqual(drawn, self.reported())

    def test_findings_are_drawn_on_the_page_and_told_beside_it(self):
        page = self.begin_with({"production": {"window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}}})
        fault = page.one("#stage .fault")
        self.assertEqual(fault.text, "address-outside-window")
        self.assertIn("the address stands at 25 to", page.texts(".findings li.bad")[0])
        page.wait(lambda: "cannot go out" in page.texts("#fields-body h3")[0], "the letter cannot go out")
        page.type_settings(page.settings().replace('"top": 4500', '"top": 2700').replace('"bottom": 9000', '"bottom": 6600'))
        page.wait(lambda: not page.find("#stage .fault") and not page.find(".findings"), "nothing is wrong")

    def test_a_zone_is_moved_on_a_page_that_is_printed_turned(self):
        page = self.begin_with({"orientation": 2})
        zone = '#stage .zone[aria-label="zone Text"]'
        left, top, width, height = page.rectangle(zone)
        self.assertLess(width, height)
        page.one(zone).send_keys(at.keys().ARROW_LEFT)
        page.wait(lambda: '"top": 7600' in page.settings(), "a millimetre to the left is one down on the page as it is read")
        page.wait(lambda: page.rectangle(zone)[0] < left, "the zone follows")
        page.select("#view", "read")
        page.wait(lambda: page.rectangle(zone)[2] > page.rectangle(zone)[3], "the page as it is read")
        page.wait(lambda: page.run("const i = document.querySelector('#stage img'); return i.naturalWidth < i.naturalHeight"), "its picture")
        page.one(zone).send_keys(at.keys().ARROW_LEFT)
        page.wait(lambda: '"left": 1900' in page.settings(), "a millimetre to the left")

    def test_what_goes_out_along_is_shown_without_zones(self):
        page = self.begin_with({"letterheads": ["head"], "attachments": ["terms"]})
        page.wait(lambda: page.texts("#sides li") == ["page 1", "page 1 of \u201cterms\u201d", "page 2 of \u201cterms\u201d"], "the sides")
        self.assertEqual(page.run("return [...document.querySelectorAll('#sides [aria-current]')].map((one) => one.ariaLabel)"), ["page 1"])
        page.find("#sides button")[2].click()
        page.wait(lambda: page.run("return document.querySelector('#stage img').alt") == "page 2 of \u201cterms\u201d", "the attachment")
        self.assertEqual(page.marks(), [])
        page.find("#sides button")[0].click()
        page.wait(lambda: len(page.marks()) == 4, "the letter's own page")
        page.find("#sides button")[1].click()
        page.wait(lambda: page.marks() == [], "the attachment again")
        page.type_settings(page.settings().replace('"attachments"', '"attachment"'))
        page.wait(lambda: len(page.marks()) == 4 and page.texts("#sides li") == ["page 1"], "the page, when nothing goes out along any more")

    def test_a_picture_is_made_anew_when_it_would_be_printed_otherwise_alone(self):
        page = self.begin_with({"letterheads": ["head"]})
        page.wait(lambda: page.texts("#sides li") == ["page 1"], "the sides")
        shown = "return document.querySelector('#stage img').src"
        first = page.run(shown)
        page.type_settings(page.settings().replace("^Bill: ", "^Bill:\\\\s"))
        page.wait_for_field("bill", "17")
        page.wait(lambda: page.find("#lint p"), "all that is found out about the change")
        self.assertEqual(page.run(shown), first)
        page.type_settings(page.settings().replace('"head"', '{"id": "head", "skip_letters": true}'))
        page.wait(lambda: page.run(shown) not in (first, ""), "the picture without the letterhead")


class Saving(BrowserTest):
    def test_what_differs_is_shown_before_it_is_saved(self):
        page = self.open("broken/other-letter-case")
        before = self.bench.text()
        page.press(".repair")
        page.wait_for_field("total", "12.3")
        self.assertEqual(self.bench.text(), before)
        page.press("#save")
        self.assertEqual(len(page.find(".diff tr.gone")), 1)
        self.assertIn("(?i)", page.texts(".diff tr.new .text")[0])
        self.accept(page)
        page.wait(lambda: page.texts("#message") == ["Saved in %s." % self.bench.settings], "the saving")
        self.assertEqual(self.bench.text(), page.settings())

    def test_two_tabs_that_save_see_both_sides_of_the_conflict(self):
        page = self.open("broken/other-letter-case")
        text = self.bench.text()
        other = at.Page(self.second_tab(), self.bench.url).wait_until_read()
        other.type_settings(text.replace("Invoices", "Bills"))
        other.press("#save")
        self.accept(other)
        other.wait(lambda: other.texts("#message") == ["Saved in %s." % self.bench.settings], "the saving")
        self.leave_second_tab()
        self.see_both_sides(page, "Bills")
        self.assertIn("Bills", self.bench.text())
        self.accept(page)
        page.wait(lambda: "(?i)" in self.bench.text(), "the saving over it")

    def test_their_settings_are_taken_in_a_conflict(self):
        page = self.open("broken/other-letter-case")
        theirs = self.bench.text().replace("Invoices", "Bills")
        self.bench.write(theirs)
        page.press(".repair")
        page.wait_for_field("total", "12.3")
        mine = page.settings()
        page.press("#save")
        self.accept(page)
        page.press('dialog[open] [data-text="takeTheirs"]')
        page.until("%s === a[0] && %s[0] === '\u2717 missing'" % (at.SETTINGS, at.FIELD.replace("a[0]", "a[1]")), "their settings", theirs, "total")
        self.assertEqual(page.find("dialog[open]"), [])
        self.assertNotIn("not saved", page.texts("#settings-name")[0])
        page.press("#undo")
        page.until("%s === a[0]" % at.SETTINGS, "one's own", mine)
        page.press("#save")
        self.assertIn("(?i)", "".join(page.texts(".diff tr.new .text")))
        self.accept(page)
        page.until("document.querySelector('#message').innerText.startsWith('Saved in ')", "the saving")
        self.assertEqual(self.bench.text(), mine)

    def test_what_is_shown_is_kept_as_right_by_one_button(self):
        page = self.open("office")
        page.wait_for_field("number", "2024-17")
        page.press("#golden")
        page.wait(lambda: page.texts("#message") == ["Kept in Invoice 17.pdf.expected.json."], "the case")
        self.assertTrue(os.path.exists(os.path.join(self.bench.folder, "Invoice 17.pdf.expected.json")))
        page.type_settings(page.settings().replace("^Invoice:", "^No such label:"))
        page.wait(lambda: "1 not as kept" in page.texts("#tab-effect")[0], "the difference")

    def test_a_preset_is_made_from_the_document_by_ticking(self):
        bench = self.begin("office")
        bench.write("{}\n")
        page = self.page_of(bench)
        page.press("#propose")
        page.one("dialog[open]")
        ticks = page.find("dialog[open] .tick")
        self.assertGreater(len(ticks), 2)
        ticks[-1].find_element("css selector", "input[type=checkbox]").click()
        left_out = ticks[-1].find_element("css selector", "strong").text
        self.accept(page)
        page.wait(lambda: page.find("#fields-body .field"), "the fields")
        values = page.wait(lambda: page.texts("#fields-body .value"), "values")
        self.assertIn("Ms Ada Brook\n14 Mill Lane\nHEBDEN BRIDGE\nHX7 8AB", values)
        self.assertNotIn(left_out, values)
        page.wait(lambda: not page.find("#lint li.error"), "no errors")


class FiveMinutes(BrowserTest):
    """What the documents tell of setting up a new invoice, as somebody does it who has never seen the JSON."""

    def test_a_new_invoice_is_set_up_without_looking_at_the_json(self):
        at.look(self.driver, size=(1400, 1000))
        bench = self.begin("office")
        bench.write("{}\n")
        page = self.page_of(bench).wait_for_picture()
        page.press("#propose")
        self.assertEqual(page.one("dialog[open] .wide").get_attribute("value"), "Invoice \\d+\\.pdf")
        self.assertIn("Invoice 17.pdf, Invoice 18.pdf, Invoice 19.pdf", page.texts("dialog[open]")[0])
        page.press('dialog[open] button[value="accept"]')
        page.wait_for_field("number", "2024-17")
        proposed = page.settings()
        page.drag('#stage .zone[aria-label="address window _Address"]', (1.5, 0.5), (20, 10))
        self.assertEqual(page.one("#zone-form input").get_attribute("value"), "Email")
        page.press("#draw")
        self.assertEqual(page.settings(), proposed)
        page.drag('#stage .zone[aria-label="address window _Address"]', (1.03, -0.15), (85, 24))
        page.select("dialog[open] select", "2")
        choice = page.run("return document.querySelector('dialog[open] select').selectedOptions[0].textContent")
        self.assertEqual(choice, "what follows \u201cCustomer:\u201d: C-1008")
        self.assertEqual(page.one("dialog[open] input[autocomplete=off]").get_attribute("value"), "customer")
        self.write_picture(page, "workbench-new-field.png")
        page.press('dialog[open] button[value="accept"]')
        page.wait_for_field("customer", "C-1008")
        page.chord(at.keys().CONTROL, "s")
        page.press('dialog[open] button[value="accept"]')
        page.until("document.querySelector('#message').innerText.startsWith('Saved in ')", "the saving")
        letter = [VLMAIL, "letter", os.path.join(bench.folder, "Invoice 17.pdf"), "--settings", bench.settings, "--json"]
        read = json.loads(subprocess.run(letter, stdout=subprocess.PIPE, check=True).stdout)["letters"][0]
        self.assertEqual(read["production_ready"], True)
        self.assertIn("C-1008", json.dumps([field for field in read["fields"] if field["name"] == "customer"]))


class AtANode(BrowserTest):
    """The settings of a node: it has the extraction preset, and the node above it the pack preset."""

    NODE = "u=bob/a=acme"

    def setUp(self):
        super().setUp()
        self.service = at.Service(VLMAIL)
        self.addCleanup(self.service.end)
        with open(os.path.join(BROKEN, "other-letter-case", "settings.json"), encoding="utf-8") as file:
            settings = json.load(file)
        self.service.set(self.NODE, "presets", {"extract_presets": settings["extract_presets"]})
        self.service.set("a=acme", "presets", {"pack_presets": settings["pack_presets"]})

    def begin_at_node(self):
        return self.begin("broken/other-letter-case", None, "--node", self.NODE, *self.service.options)

    def pattern(self):
        return self.service.own(self.NODE, "presets")["extract_presets"][0]["zones"][1]["fields"][0]["value_extract"]

    def test_a_node_is_edited_and_saved(self):
        page = self.page_of(self.begin_at_node())
        self.assertEqual(page.texts("#settings-name"), [self.NODE])
        self.assertNotIn("pack_presets", page.settings())
        self.assertIn("Invoices", page.texts("#fields-body .quietly")[0])
        self.assertEqual(page.find("#lint li.error"), [])
        page.press(".repair")
        page.wait_for_field("total", "12.3")
        page.press("#save")
        self.assertIn("(?i)", page.texts(".diff tr.new .text")[0])
        self.accept(page)
        page.wait(lambda: page.texts("#message") == ["Saved in %s." % self.NODE], "the saving")
        self.assertIn("(?i)", self.pattern())

    def test_two_people_that_save_one_node_see_both_sides(self):
        page = self.page_of(self.begin_at_node())
        other = at.Page(self.second_tab(), self.begin_at_node().url).wait_until_read()
        other.type_settings(other.settings().replace("invoice.*", "(invoice|bill).*"))
        other.press("#save")
        self.accept(other)
        other.wait(lambda: other.texts("#message") == ["Saved in %s." % self.NODE], "the saving")
        self.leave_second_tab()
        self.see_both_sides(page, "bill")
        self.assertNotIn("(?i)", self.pattern())
        self.accept(page)
        page.wait(lambda: "(?i)" in self.pattern(), "the saving over it")

    def test_nothing_is_lost_when_the_service_refuses_or_has_gone(self):
        secret = self.service.token("reader", "read", self.NODE)
        bench = self.begin("broken/other-letter-case", None, "--node", self.NODE, *self.service.options_with(secret))
        page = self.page_of(bench)
        page.press(".repair")
        page.wait_for_field("total", "12.3")
        changed = page.settings()
        for said in ("this needs the role settings at " + self.NODE, "Nobody answers there"):
            page.press("#save")
            self.accept(page)
            page.wait(lambda: said in page.texts("#alert")[0], "the line %r" % said)
            self.assertEqual(page.settings(), changed)
            self.service.stop()
        page.type_settings(changed.replace("(?i)", ""))
        page.wait(lambda: page.field("total")[0] == "\u2717 missing", "the reading without a service")


class Safety(BrowserTest):
    def test_a_wrong_token_host_or_origin_is_refused(self):
        bench = self.begin("office")
        for name, headers, code in (
            ("token", {"X-Workbench-Token": "x" * 64}, "token-refused"),
            ("no token", {"X-Workbench-Token": ""}, "token-refused"),
            ("host", {"Host": "example.org"}, "not-allowed"),
            ("origin", {"Origin": "http://example.org"}, "not-allowed"),
        ):
            with self.subTest(name):
                status, answer = bench.ask("state", {}, headers)
                self.assertEqual((status, answer["error"]["code"]), (403, code))
        self.assertEqual(bench.ask("state", {})[0], 200)

    def test_the_page_says_that_its_token_is_wrong(self):
        bench = self.begin("office")
        page = at.Page(self.driver, bench.origin + "/#" + "x" * 43)
        page.wait(lambda: page.texts("#alert")[0].startswith("\u2717 "), "a complaint")

    def test_the_token_leaves_the_address(self):
        page = self.open("office")
        self.assertEqual(page.run("return location.hash"), "")

    def test_names_and_values_and_patterns_are_never_taken_as_html(self):
        bench = self.begin("broken/other-letter-case")
        name = "invoice <img src=x onerror=document.title='taken'>.txt"
        document = os.path.join(bench.folder, "invoice 17.txt")
        with open(document, encoding="utf-8") as file:
            text = file.read()
        os.remove(document)
        with open(os.path.join(bench.folder, name), "w", encoding="utf-8") as file:
            file.write(text.replace("Anna Arnold", XSS[:70]))
        settings = json.loads(bench.text())
        preset = settings["extract_presets"][0]
        preset["name"] = preset["zones"][0]["name"] = preset["zones"][1]["fields"][0]["name"] = XSS
        preset["zones"][1]["fields"][0]["value_extract"] = "^" + XSS + "(?<VAL>x)$"
        bench.write(json.dumps(settings, indent=1))
        page = self.page_of(bench).wait_for_picture()
        self.assertIn("<img", page.texts("#list .name")[0])
        self.assertIn("<img", "".join(page.texts("#fields-body")))
        for tab in ("#tab-form", "#tab-effect", "#tab-json"):
            page.press(tab)
        self.assertEqual(page.run("return [...document.querySelectorAll('img')].length"), 1)
        self.assertNotIn("taken", page.run("return document.title"))
        self.assertEqual(page.logged(), [])


class Access(BrowserTest):
    def test_all_is_reached_by_keyboard_alone(self):
        keys = at.keys()
        page = self.open("broken/other-letter-case")
        page.run("""
            window.seen = [];
            document.addEventListener("focusin", ({ target }) => seen.push(target.id || target.dataset.key || target.tagName));
            document.querySelector("#title").tabIndex = -1;
            document.querySelector("#title").focus();
        """)
        page.keys(*[keys.TAB] * 60)
        seen = set(page.run("return window.seen"))
        for wanted in ("propose", "golden", "save", "help", "filter", "kind", "list", "page-number", "draw", "tab-json", "TEXTAREA"):
            self.assertIn(wanted, seen)
        self.assertTrue(any(one.startswith("repair") for one in seen), seen)
        self.assertTrue(any(one.startswith("/extract_presets/0/zones/1") for one in seen), seen)

    def test_a_letter_is_mended_and_saved_by_keyboard_alone(self):
        keys = at.keys()
        page = self.open("broken/other-letter-case")
        for step in range(3):
            page.keys(keys.F6)
        for step in range(30):
            page.keys(keys.TAB)
            if page.run("return document.activeElement.className") == "repair":
                break
        page.keys(keys.ENTER)
        page.wait_for_field("total", "12.3")
        page.chord(keys.CONTROL, "s")
        page.one("dialog[open]")
        page.keys(keys.ENTER)
        page.wait(lambda: "(?i)" in self.bench.text(), "the saving")

    def test_whatever_can_be_operated_has_a_role_and_a_name(self):
        page = self.open("broken/other-letter-case")
        for tab in ("#tab-json", "#tab-form", "#tab-effect"):
            page.press(tab)
            nodes = self.driver.execute_cdp_cmd("Accessibility.getFullAXTree", {})["nodes"]
            operated = {"button", "textbox", "checkbox", "combobox", "listbox", "option", "spinbutton", "searchbox", "tab", "link"}
            nameless = [
                node["role"]["value"]
                for node in nodes
                if not node.get("ignored") and node.get("role", {}).get("value") in operated and not node.get("name", {}).get("value")
            ]
            self.assertEqual(nameless, [], tab)

    def test_it_speaks_the_language_of_the_browser(self):
        at.look(self.driver, language="de-AT")
        page = self.open("broken/zone-ends-too-high")
        self.assertEqual(page.texts("#save"), ["Sichern\u2026"])
        self.assertEqual(page.run("return document.documentElement.lang"), "de")
        self.assertEqual(page.field("total")[0], "\u2717 fehlt")
        page.until("document.querySelector('#counts').innerText === '1 von 1 gezeigt, 0 mit Fehlern'", "the counts")
        self.assertEqual(page.texts("#fields-body h4 small")[1], "20\u2013200 \u00d7 85\u2013134 mm")
        text = page.settings()
        page.type_settings(text.replace('"bottom": 13400', '"bottom": 13450'))
        page.until("document.querySelectorAll('#fields-body h4 small')[1].innerText.endsWith('134,5 mm')", "a decimal comma")
        page.type_settings(text.replace('"pack_preset"', 'pack_preset"', 1))
        page.until("document.querySelector('#alert').innerText.startsWith('\u2717 Zeile 5: ')", "the line of the fault")
        page.type_settings(text)
        page.wait_until_read().press(".repair")
        page.until("document.querySelector('#tab-effect').innerText === 'Wirkung: 1 besser, 0 schlechter'", "the effect")
        page.press("#save")
        self.assertEqual(page.texts("dialog[open] h2, dialog[open] button"), ["Einstellungen sichern", "Sichern", "Abbrechen"])

    def test_no_control_is_lost_at_twice_the_size(self):
        at.look(self.driver, size=(640, 480))
        page = self.open("broken/other-letter-case").wait_for_picture()
        wide = page.run("return document.documentElement.scrollWidth > document.documentElement.clientWidth")
        self.assertFalse(wide)
        script = """
            return [...document.querySelectorAll('button, input, select, [role=tab], #list, #editor, #stage .sheet')]
                .filter((one) => one.checkVisibility() && one.closest('[hidden]') === null)
                .filter((one) => { const box = one.getBoundingClientRect(); return box.width === 0 || box.right > innerWidth + 1 || box.left < -1; })
                .filter((one) => one.closest('.CodeMirror') === null).map((one) => one.outerHTML);
        """
        self.assertEqual(page.run(script), [])
        page.press(".repair")
        page.wait_for_field("total", "12.3")

    def test_texts_can_be_read_in_light_and_dark(self):
        page = self.open("broken/other-letter-case").wait_for_picture()
        for scheme in ("light", "dark"):
            with self.subTest(scheme):
                at.look(self.driver, scheme)
                page.until("matchMedia('(prefers-color-scheme: ' + a[0] + ')').matches", "the colours", scheme)
                self.assertEqual(page.run(CONTRAST), [])


# Texts whose colours differ from their ground's by less than 4.5 to 1.
CONTRAST = """
    const parts = (colour) => colour.match(/[\\d.]+/g).map(Number);
    const light = (c) => { const [r, g, b] = c.map((v) => { v /= 255; return v <= .03928 ? v / 12.92 : ((v + .055) / 1.055) ** 2.4; });
        return .2126 * r + .7152 * g + .0722 * b; };
    const ground = (e) => { for (; e; e = e.parentElement) { const c = parts(getComputedStyle(e).backgroundColor);
        if (c.length < 4 || c[3] > .9) return c; } return [255, 255, 255]; };
    const poor = new Set();
    for (const e of document.querySelectorAll('body *:not(.marks *)')) {
        const own = [...e.childNodes].some((n) => n.nodeType === 3 && n.textContent.trim());
        if (!own || !e.checkVisibility() || e.disabled || e.ariaDisabled === 'true') continue;
        const [a, b] = [light(parts(getComputedStyle(e).color).slice(0, 3)), light(ground(e).slice(0, 3))];
        if ((Math.max(a, b) + .05) / (Math.min(a, b) + .05) < 4.5) poor.add(e.tagName + '.' + e.className + ': ' + e.textContent.slice(0, 40));
    }
    return [...poor];
"""


class Pictures(BrowserTest):
    def test_pictures_of_the_documents_are_there(self):
        for scheme in ("light", "dark"):
            at.look(self.driver, scheme, (1400, 1000))
            bench = self.begin("office")
            bench.write(bench.text().replace("^Customer:", "^customer:"))
            page = self.page_of(bench).wait_for_picture()
            page.wait(lambda: "not read" not in page.texts("#counts")[0], "the verdicts")
            page.press('#stage .zone[aria-label="zone Details"]')
            self.write_picture(page, "workbench-%s.png" % scheme)
        page.press(".repair")
        page.wait_for_field("customer", "C-1008")
        page.press("#save")
        page.one(".diff")
        self.write_picture(page, "workbench-save.png")


if __name__ == "__main__":
    sys.exit(main())
