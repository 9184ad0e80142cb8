// A new zone, or a further field of one: its name, and how its value is found.
import { el } from "./dom.js";
import { Dialog } from "./dialog.js";

function literal(text) {
    return text.replace(/[.[{}()\\*+?|^$]/g, "\\$&");
}

/** In front of the value of a line such as "Total: 12.30". */
const LABEL = /^\s*(.{1,40}?:)\s*(\S.*)$/u;
/** As much of a value as a person knows it by. */
const SHOWN = 40;

/** How else values are found: the pattern of the field, and what shows here what it would find. */
const KINDS = [
    { kind: "line", pattern: "^\\h*(?<VAL>\\S.*)$", shows: /^\s*(\S.*)$/m },
    { kind: "whole", pattern: "\\A(?<VAL>[\\s\\S]+)\\Z", shows: /^\s*([^]*\S)\s*$/ },
    { kind: "number", pattern: "(?<VAL>\\d+)", shows: /(\d+)/ },
    { kind: "amount", pattern: "(?<![\\d.,])(?<VAL>\\d[\\d.,]*[.,]\\d\\d)(?![.,]?\\d)", shows: /(?<![\d.,])(\d[\d.,]*[.,]\d\d)(?![.,]?\d)/ },
    { kind: "date", pattern: "(?<VAL>\\d{1,2}[./]\\d{1,2}[./]\\d{4})", shows: /(\d{1,2}[./]\d{1,2}[./]\d{4})/ },
    { kind: "email", pattern: "(?<VAL>[^\\s@]+@[^\\s@]+\\.[^\\s@]+)", shows: /([^\s@]+@[^\s@]+\.[^\s@]+)/ },
];

function nameFrom(label) {
    return label.toLocaleLowerCase().replace(/[^\p{L}\p{N}]+/gu, " ").trim().replaceAll(" ", "_");
}

/**
 * @param {string[]} lines  that the zone holds
 * @returns {{kind: string, pattern: string, value: string, name: string, label: string=}[]} how a value in them might be
 *     found, what it is then, and what it might be called; the likeliest first
 */
export function proposals(lines) {
    const text = lines.join("\n");
    const labelled = lines.map((line) => LABEL.exec(line)).filter(Boolean).map(([, label, value]) => ({ kind: "behind", label,
        pattern: `^\\h*${literal(label)}\\h*(?<VAL>\\S.*)$`, value, name: nameFrom(label) }));
    const others = KINDS.map(({ kind, pattern, shows }) => ({ kind, pattern, value: shows.exec(text)?.[1], name: "" }));
    const found = labelled.concat(others.filter(({ value }) => value !== undefined));
    return found.length > 0 ? found : others.slice(0, 1).map((one) => ({ ...one, value: "" }));
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
        const field = el("input", { type: "text", required: true, autocomplete: "off", value: found[0].name });
        const kind = el("select", { class: "wide", onchange: () => found.some(({ name }) => name === field.value) &&
            (field.value = found[kind.value].name) }, ...found.map((one, at) => el("option", { value: at }, this.#finding(one))));
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
        field.select();
    }

    #finding({ kind, label, value }) {
        const what = this.texts.of("find_" + kind, { label });
        const line = value.replaceAll("\n", " / ");
        return line ? this.texts.of("finds", { what, value: line.length > SHOWN ? line.slice(0, SHOWN) + "\u2026" : line }) : what;
    }
}
