// What was read from the letter: each field with its value, its state, its pattern, and what would have to be
// different where it is missing.
import { byId, el, isolated, show } from "./dom.js";

/** As a report has them. */
const STATES = {
    found: { sign: "\u2713", look: "" }, default: { sign: "=", look: "quiet" }, unused: { sign: "\u2013", look: "quiet" },
    not_found: { sign: "\u2013", look: "quiet" }, invalid: { sign: "\u2717", look: "bad" },
    missing: { sign: "\u2717", look: "bad" },
};

export class Fields {
    /**
     * @param {object} parts
     * @param {import("./state.js").Session} parts.session
     * @param {import("./edits.js").Edits} parts.edits
     * @param {import("./texts.js").Texts} parts.texts
     * @param {(zone: object) => void} parts.addField
     */
    constructor(parts) {
        Object.assign(this, parts, { body: byId("fields-body") });
        this.session.on("evaluation page document", () => this.#draw());
        this.session.on("choice", () => this.#choose());
        this.session.on("busy", () => this.body.setAttribute("aria-busy", "true"));
        this.session.on("idle", () => this.body.removeAttribute("aria-busy"));
    }

    #draw() {
        const { evaluation } = this.session;
        show(this.body, ...(evaluation ? this.#contents(evaluation) : [el("p", {}, this.texts.of("reading"))]));
        this.#choose();
    }

    #contents(evaluation) {
        const parts = [this.#presets(evaluation)];
        if (evaluation.error)
            parts.push(el("p", { class: "why", role: "note" }, "\u2717 ", isolated(evaluation.error.line)));
        else if (evaluation.verdict === "attachment")
            parts.push(el("p", {}, this.texts.of("isAttachment")));
        const { letter } = this.session;
        return letter ? parts.concat(this.#letter(letter, evaluation.letters)) : parts;
    }

    #presets({ extract_preset: preset, pack_preset: pack }) {
        if (!preset)
            return el("p", { class: "quietly" }, this.texts.of("noPreset"));
        return el("p", { class: "quietly" }, this.texts.of("readBy"), " ", el("code", {}, isolated(preset.match)),
            ", ", this.texts.of("sentBy"), " ", el("code", {}, isolated(pack?.name ?? "")));
    }

    #letter(letter, letters) {
        const state = letter.why_not ? el("span", { class: "state bad" }, "\u2717 " + this.texts.of("cannotGoOut"))
            : el("span", { class: "state" }, "\u2713 " + this.texts.of("ready"));
        return [this.#letterChoice(letter, letters, state),
            letter.why_not ? el("p", { class: "why" }, isolated(letter.why_not)) : null,
            this.#findings(letter.findings ?? []), ...letter.zones.map((zone) => this.#zone(zone))];
    }

    #letterChoice(letter, letters, state) {
        const place = letters.indexOf(letter);
        const turnTo = (at) => this.session.turnTo(this.session.evaluation.letters[at].pages[0]);
        const step = (by, text, sign) => el("button", { type: "button", "data-key": "letter" + by, "aria-label": this.texts.of(text),
            disabled: !letters[place + by], onclick: () => turnTo(place + by) }, sign);
        const title = this.texts.of("letterOf", { number: place + 1, count: letters.length, pages: letter.pages.length,
            first: letter.pages[0] });
        return el("h3", {}, letters.length > 1 && step(-1, "letterBack", "\u2190"), ` ${title}: `, state, " ",
            letters.length > 1 && step(1, "letterOn", "\u2192"));
    }

    #findings(findings) {
        if (findings.length === 0)
            return null;
        return el("ul", { class: "findings", "aria-label": this.texts.of("findings") }, ...findings.map((finding) =>
            el("li", { class: finding.error ? "bad" : "" }, el("strong", {}, finding.error ? "\u2717 " : "! ", finding.code), " ",
                el("small", {}, finding.pages), el("br"), isolated(finding.says), el("br"), el("small", {}, isolated(finding.fix)))));
    }

    #zone(zone) {
        const kind = this.texts.of(zone.address_window ? "addressWindow" : "zone");
        const head = el("h4", {}, el("button", { type: "button", class: "link", "data-place": zone.pointer,
            "data-key": "zone" + zone.pointer, onclick: () => this.#go(zone.pointer) }, kind, " ", isolated(zone.name)),
        " ", el("small", {}, zone.nowhere ? isolated(zone.nowhere) : this.texts.place(zone.box)));
        return el("section", { class: "zone-fields", "aria-label": `${kind} ${zone.name}` }, head,
            ...zone.fields.map((field) => this.#field(field)),
            zone.pointer && el("button", { type: "button", class: "slight", "data-key": "add" + zone.pointer,
                onclick: () => this.addField(this.session.zoneAt(zone.pointer)) }, this.texts.of("addField")));
    }

    #field(field) {
        const { sign, look } = STATES[field.state];
        return el("article", { class: "field " + look, "data-place": field.pointer, "aria-label": field.name },
            el("p", { class: "head" }, el("button", { type: "button", class: "link name", "data-key": "field" + field.pointer,
                onclick: () => this.#go(field.pointer) }, isolated(field.name)), " ",
            el("span", { class: "state " + look }, `${sign} ${this.texts.of("state_" + field.state)}`)),
            field.value && el("p", { class: "value" }, isolated(field.value)),
            ...[field.note, field.says].filter(Boolean).map((text) => el("p", { class: "note" }, isolated(text))),
            this.#pattern(field), this.#nearMisses(field));
    }

    #pattern(field) {
        if (!field.pointer)
            return null;
        return el("label", { class: "pattern" }, el("span", {}, this.texts.of("pattern")), " ",
            el("input", { type: "text", value: field.pattern, spellcheck: "false", autocomplete: "off",
                "data-key": "pattern" + field.pointer, oninput: (event) => this.#typed(field, event.target.value) }));
    }

    #typed(field, pattern) {
        const { pointer } = field;
        this.edits.set([{ pointer: pointer + "/value_extract", value: pattern }],
            this.texts.of("didPattern", { field: field.name }), "pattern " + pointer);
    }

    #nearMisses(field) {
        if (field.near_misses.length === 0)
            return null;
        return el("ol", { class: "near", "aria-label": this.texts.of("nearMisses", { field: field.name }) },
            ...field.near_misses.map((miss, place) => this.#nearMiss(miss, field, place)));
    }

    #nearMiss(miss, { pointer }, place) {
        const key = `${pointer} ${place}`;
        return el("li", {}, isolated(miss.says), miss.box && el("button", { type: "button", class: "link",
            "data-key": "see" + key, onclick: () => this.session.tell("look", this.#missAt(pointer, place)) },
        this.texts.of("seeIt")),
        miss.edits && el("button", { type: "button", class: "repair", "data-key": "repair" + key,
            onclick: () => this.#repair(this.#missAt(pointer, place)) }, this.texts.of("repair"), miss.change && ": ",
        miss.change && isolated(miss.change)));
    }

    /** As it was evaluated last: what it would change may stand elsewhere by then. */
    #missAt(pointer, place) {
        return this.session.zoneAt(pointer)?.fields.find((field) => field.pointer === pointer)?.near_misses[place];
    }

    #repair(miss) {
        if (miss?.edits)
            this.edits.put(miss.edits, this.texts.of("didRepair", { what: miss.change ?? miss.says }));
    }

    #go(pointer) {
        const zone = pointer ? this.session.zoneAt(pointer) : null;
        const page = zone && this.session.letter.sheets[zone.sheet]?.page;
        if (page)
            this.session.turnTo(page);
        this.session.choose(pointer ?? "");
    }

    #choose() {
        for (const one of this.body.querySelectorAll("[data-place]"))
            one.classList.toggle("chosen", one.dataset.place === this.session.choice);
    }
}
