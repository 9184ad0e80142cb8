// A new zone, or a further field of one: its name, and how its value is found.
import { el } from "./dom.js";
import { Dialog } from "./dialog.js";

function literal(text) {
    return text.replace(/[.[{}()\\*+?|^$]/g, "\\$&");
}

/** In front of the value of a line such as "Total: 12.30". */
const LABEL = /^(.{1,40}?:)\s*\S/u;

/**
 * @param {string[]} lines  that the zone holds
 * @returns {{kind: string, pattern: string}[]} how a value in them might be found, the likeliest first
 */
export function proposals(lines) {
    const label = lines.map((line) => LABEL.exec(line)?.[1]).find(Boolean);
    const found = label ? [{ kind: "behind", label, pattern: `^${literal(label)}\\h*(?<VAL>\\S.*)$` }] : [];
    return found.concat([{ kind: "line", pattern: "^\\h*(?<VAL>\\S.*)$" },
        { kind: "whole", pattern: "\\A(?<VAL>[\\s\\S]+)\\Z" },
        { kind: "number", pattern: "(?<VAL>\\d+)" },
        { kind: "amount", pattern: "(?<VAL>\\d[\\d.,]*[.,]\\d\\d)\\b" },
        { kind: "date", pattern: "(?<VAL>\\d{1,2}[./]\\d{1,2}[./]\\d{4})" },
        { kind: "email", pattern: "(?<VAL>[^\\s@]+@[^\\s@]+\\.[^\\s@]+)" }]);
}

export class NewField {
    /**
     * @param {import("./state.js").Session} session
     * @param {import("./edits.js").Edits} edits
     * @param {import("./texts.js").Texts} texts
     */
    constructor(session, edits, texts) {
        Object.assign(this, { session, edits, texts });
    }

    /** Asks for the name of a zone at that place and of its first field. */
    inNewZone(box, lines) {
        const zones = this.session.presetPointer + "/zones";
        const number = (this.session.letter?.zones.length ?? 0) + 1;
        this.#ask("newZone", this.texts.of("zoneNumber", { number }), lines.map((line) => line.text), (zone, field) => ({
            pointer: zones + "/-", value: { name: zone, location: box, fields: [field] } }), zones, number - 1);
    }

    /** Asks for a further field of a zone. */
    inZone(zone) {
        this.#ask("newField", null, zone.text.split("\n"), (_, field) => ({
            pointer: zone.pointer + "/fields/-", value: field }), zone.pointer + "/fields", zone.fields.length);
    }

    #ask(title, zoneName, lines, changeFor, list, place) {
        const found = proposals(lines.filter(Boolean));
        const zone = zoneName === null ? null : el("input", { type: "text", value: zoneName, required: true });
        const field = el("input", { type: "text", required: true, autocomplete: "off" });
        const kind = el("select", {}, ...found.map((one, at) =>
            el("option", { value: at }, this.texts.of("find_" + one.kind, { label: one.label }))));
        const obligatory = el("input", { type: "checkbox" });
        const labelled = (text, input) => el("label", {}, el("span", {}, this.texts.of(text)), " ", input);
        const dialog = new Dialog(this.texts, title);
        dialog.show([zone && labelled("zoneName", zone), labelled("fieldName", field), labelled("foundBy", kind),
            labelled("obligatory", obligatory)], "add", () => {
            const value = { name: field.value, value_extract: found[kind.value].pattern };
            if (obligatory.checked)
                value.obligatory = true;
            this.edits.set([changeFor(zone?.value, value)], this.texts.of("didAdd", { name: zone?.value ?? field.value }));
            this.session.choose(`${list}/${place}`);
        });
        field.focus();
    }
}
