#!/usr/bin/python3
"""modules_test.py VLMAIL EXAMPLES PICTURES [TEST...]: asks the modules of the workbench's page, in a browser, what they give."""
import os
import sys

sys.dont_write_bytecode = True
import workbench_page as at
from browser_test import EXAMPLES, VLMAIL, BrowserTest, browser, main


class Modules(BrowserTest):
    """Rules of the page's modules that are told best by tables. They keep nothing, so that one page does for all."""

    @classmethod
    def setUpClass(cls):
        cls.bench = at.Workbench(VLMAIL, os.path.join(EXAMPLES, "office"), None)
        cls.page = at.Page(browser(), cls.bench.url)

    @classmethod
    def tearDownClass(cls):
        cls.bench.end()

    def test_json_knows_where_its_values_stand(self):
        text = '{"a": [1, {"b/c": "x"}],\n "d": null}'
        found = self.page.imported(
            "json_text.js",
            "['/a', '/a/1/b~1c', '/d', '/e'].map((p) => { const n = m.nodeAt(m.parse(a[0]), p); return n ? a[0].slice(n.start, n.end) : null })",
            text,
        )
        self.assertEqual(found, ['[1, {"b/c": "x"}]', '"x"', "null", None])
        self.assertEqual(self.page.imported("json_text.js", "m.placeOf(a[0], 26)", text), {"line": 1, "ch": 1})

    def test_json_names_the_place_of_its_first_fault(self):
        fault = "(() => { try { m.parse(a[0]); } catch (f) { return [f.at, f.message]; } })()"
        for text, at_place, says in (
            ('{"a" 1}', 5, '":" is missing here'),
            ('{"a": }', 6, "a value is missing here"),
            ("{a: 1}", 1, "a key in double quotes is missing here"),
            ("[1 2]", 3, '"]" is missing here'),
            ("{} {}", 3, "the document has ended here"),
            ("[" * 600, 501, "nested too deeply"),
        ):
            with self.subTest(text[:10]):
                self.assertEqual(self.page.imported("json_text.js", fault, text), [at_place, says])

    def test_a_difference_is_told_by_lines(self):
        lines = self.page.imported("diff.js", "m.diff(a[0], a[1]).map((l) => l.kind[0] + l.text)", "a\nb\nc\nd", "a\nc\nx\nd")
        self.assertEqual(lines, ["sa", "gb", "sc", "nx", "sd"])
        many = "\n".join(str(one) for one in range(100))
        parts = self.page.imported("diff.js", "m.hunks(m.diff(a[0], a[1]), 2).map((h) => h.map((l) => l.kind[0] + l.text))", many, many.replace("\n50\n", "\nfifty\n"))
        self.assertEqual(parts, [["s48", "s49", "g50", "nfifty", "s51", "s52"]])

    def test_changes_of_one_kind_are_one_step_back(self):
        steps = self.page.imported(
            "history.js",
            """(() => { let now = 0; const h = new m.History('', () => now); const seen = [];
                h.add('a', 'typing', 'typing'); h.add('ab', 'typing', 'typing'); now = 5000; h.add('abc', 'typing', 'typing');
                h.add('zone', 'zone'); while (h.undo()) seen.push(h.text); while (h.redo()) seen.push(h.text); return seen; })()""",
        )
        self.assertEqual(steps, ["abc", "ab", "", "ab", "abc", "zone"])

    def test_a_zone_is_never_turned_over_nor_pushed_off_the_corner(self):
        box = {"left": 1000, "top": 1000, "right": 3000, "bottom": 2000}
        narrow = self.page.imported("snapping.js", "m.resized(a[0], 'l', {x: 9000, y: 0})", box)
        self.assertEqual(narrow["left"], 2700)
        moved = self.page.imported("snapping.js", "m.onPage(m.moved(a[0], {x: -5000, y: 0}))", box)
        self.assertEqual(moved, {"left": 0, "top": 1000, "right": 2000, "bottom": 2000})

    def test_edges_snap_to_near_text_alone(self):
        box = {"left": 1000, "top": 1000, "right": 3000, "bottom": 2000}
        block = {"left": 1150, "top": 1600, "right": 2800, "bottom": 1950}
        snapped = self.page.imported("snapping.js", "m.snapped(a[0], 'lb', [a[1]], 200)", box, block)
        self.assertEqual(snapped, {"left": 1050, "top": 1000, "right": 3000, "bottom": 2050})

    def test_a_box_is_turned_with_its_page_and_back(self):
        box = {"left": 1000, "top": 2000, "right": 5000, "bottom": 2500}
        page = {"width": 21000, "height": 29700}
        turned = self.page.imported("turning.js", "[0, 1, 2, 3].map((q) => m.turned(a[0], a[1], q))", box, page)
        edges = ("left", "top", "right", "bottom")
        expected = ((1000, 2000, 5000, 2500), (27200, 1000, 27700, 5000), (16000, 27200, 20000, 27700), (2000, 16000, 2500, 20000))
        self.assertEqual(turned, [dict(zip(edges, one)) for one in expected])
        back = "[0, 1, 2, 3].map((q) => m.turnedBack(m.turned(a[0], a[1], q), m.turnedSize(a[1], q), q))"
        self.assertEqual(self.page.imported("turning.js", back, box, page), [box] * 4)

    def test_a_value_behind_a_label_is_proposed_first(self):
        found = self.page.imported("new_field.js", "m.proposals(a[0])[0]", ["Dear Sir", "Total (EUR): 12.30"])
        pattern = "^\\h*Total \\(EUR\\):\\h*(?<VAL>\\S.*)$"
        self.assertEqual(found, {"kind": "behind", "label": "Total (EUR):", "pattern": pattern, "value": "12.30", "name": "total_eur"})

    def test_what_is_proposed_tells_what_it_would_find(self):
        lines = ["Ref: RK 88/2024", "Datum: 02.05.2024", "Betrag 7.812,40 an a@example.org"]
        found = self.page.imported("new_field.js", "m.proposals(a[0]).map((p) => [p.kind, p.value])", lines)
        self.assertEqual(found, [
            ["behind", "RK 88/2024"], ["behind", "02.05.2024"], ["line", lines[0]], ["whole", "\n".join(lines)],
            ["number", "88"], ["amount", "7.812,40"], ["date", "02.05.2024"], ["email", "a@example.org"],
        ])
        kinds = "m.proposals(a[0]).map((p) => p.kind)"
        self.assertEqual(self.page.imported("new_field.js", kinds, ["Dear Sir"]), ["line", "whole"])
        self.assertEqual(self.page.imported("new_field.js", kinds, []), ["line"])

    def test_a_preset_is_made_from_documents_that_are_named_alike(self):
        names = ["Invoice 17.pdf", "Invoice 18.pdf", "Invoices March.pdf", "b/Invoice 19.pdf"]
        self.assertEqual(self.page.imported("proposals.js", "m.alike(a[0], a[1])", names, "Invoice 18.pdf"), ["Invoice 18.pdf", "Invoice 17.pdf"])
        self.assertEqual(self.page.imported("proposals.js", "m.alike(a[0], a[1])", names, "Invoices March.pdf"), ["Invoices March.pdf"])

    def test_keys_are_completed_where_keys_stand(self):
        context = "m.contextOf(a[0])"
        for before, steps, is_key, token in (
            ('{"zones": [{"na', ["zones", "0"], True, '"na'),
            ('{"zones": [{"name": "x"}, {"fields": [{', ["zones", "1", "fields", "0"], True, ""),
            ('{"duplex": tr', ["duplex"], False, "tr"),
            ('{"a": {"b": 1}, "c', [], True, '"c'),
        ):
            with self.subTest(before):
                found = self.page.imported("completion.js", context, before)
                self.assertEqual((found["steps"], found["isKey"], found["token"]), (steps, is_key, token))

    def test_a_moved_zone_keeps_what_its_settings_count_from(self):
        changes = "m.changesFor(JSON.stringify(a[0]), a[1], a[2])"
        box = {"left": 1000, "top": 1000, "right": 3000, "bottom": 2000}
        lower = {**box, "top": 1500, "bottom": 2500}
        longer = {**box, "bottom": 2500}
        anchored = {"z": {"location": {"left": 0, "top": -300, "right": 2000, "bottom": 700}}}
        for name, settings, zone, wanted, expected in (
            ("anchor", anchored, {}, lower, [{"pointer": "/z/location/top", "value": 200}, {"pointer": "/z/location/bottom", "value": 1200}]),
            ("point", {"z": {}}, {"by_point": True}, lower, [{"pointer": "/z/most_probable_point", "value": {"x": 4500, "y": 6700}}]),
            ("point and size", {"z": {}}, {"by_point": True}, longer, [{"pointer": "/z/location", "value": longer}]),
        ):
            with self.subTest(name):
                given = {"pointer": "/z", "location_pointer": None, "by_point": False, "box": box, **zone}
                self.assertEqual(self.page.imported("zones.js", changes, settings, given, wanted), expected)

    def test_a_zone_is_renamed_where_rules_for_reading_name_it(self):
        changes = "m.renaming(JSON.stringify(a[0]), { pack_preset: { pointer: '/p' } }, { pointer: '/z', name: 'Old' }, 'New')"
        name = {"pointer": "/z/name", "value": "New"}
        self.assertEqual(self.page.imported("zone_form.js", changes, {"p": {}}), [name])
        rules = {"p": {"reading": {"zones": {"Old": {"page": 2}}}}}
        moved = [{"pointer": "/p/reading/zones/Old", "remove": True}, {"pointer": "/p/reading/zones/New", "value": {"page": 2}}]
        self.assertEqual(self.page.imported("zone_form.js", changes, rules), [name] + moved)

    def test_the_schema_follows_presets_that_are_inherited(self):
        schema = {
            "if": {"anyOf": [{"required": ["presets"]}]},
            "then": {"properties": {"presets": {"items": {"if": {"properties": {"inh": {"const": True}}, "required": ["inh"]},
                "then": {"properties": {"v": {"$ref": "#/$defs/preset"}}}, "else": {"$ref": "#/$defs/preset"}}}}},
            "else": {"properties": {}},
            "$defs": {"preset": {"properties": {"title": {"type": "string", "description": "what it is called"}}}},
        }
        says = "new m.Schema(a[0]).at(a[1], a[2])?.description ?? null"
        document = {"presets": [{"title": ""}, {"inh": True, "v": {}}]}
        for pointer, expected in (("/presets/0/title", "what it is called"), ("/presets/1/v/title", "what it is called"), ("/presets/1/title", None)):
            with self.subTest(pointer):
                self.assertEqual(self.page.imported("schema.js", says, schema, document, pointer), expected)

    def test_edits_are_put_in_from_the_end(self):
        edits = [{"from": {"line": 1, "ch": 1}, "to": {"line": 1, "ch": 2}, "text": "XY"}, {"from": {"line": 0, "ch": 0}, "to": {"line": 0, "ch": 0}, "text": "- "}]
        self.assertEqual(self.page.imported("edits.js", "m.edited(a[0], a[1])", "one\ntwo", edits), "- one\ntXYo")

    def test_what_looks_the_same_stays_the_same_element_whatever_comes_in_front_of_it(self):
        kept = """(() => { const p = document.createElement("div"); const made = (...texts) => texts.map((t) => m.el("b", {}, t));
            m.show(p, ...made("a", "b", "c")); const [a, b, c] = p.children; const seen = [];
            for (const texts of [["x", "a", "b", "c"], ["b", "c"], ["c", "y", "b"]]) {
                m.show(p, ...made(...texts)); seen.push([p.textContent, [...p.children].indexOf(b), [...p.children].indexOf(c)]); }
            return seen; })()"""
        self.assertEqual(self.page.imported("dom.js", kept), [["xabc", 2, 3], ["bc", 0, 1], ["cyb", 2, 0]])

    def test_every_language_has_every_text(self):
        self.assertEqual(self.page.imported("texts.js", "m.missing()"), [])


if __name__ == "__main__":
    sys.exit(main())
