// The preset at hand as a form: every key that the schema knows, with what it says of it.
import { byId, el, isolated, show } from "./dom.js";
import { nodeAt, parse, valueOf } from "./json_text.js";

function isStructured(schema) {
    return schema.type === "object" || schema.type === "array";
}

function summaryOf(value, place) {
    return value?.name || value?.match || value?.id || (typeof value === "string" ? value : String(place + 1));
}

export class Form {
    #open = new Set();

    /**
     * @param {object} parts
     * @param {import("./state.js").Session} parts.session
     * @param {import("./edits.js").Edits} parts.edits
     * @param {import("./texts.js").Texts} parts.texts
     * @param {() => import("./schema.js").Schema|null} parts.schema
     */
    constructor(parts) {
        Object.assign(this, parts, { panel: byId("panel-form") });
        this.session.on("evaluation text", () => this.draw());
    }

    draw() {
        if (this.panel.hidden || this.session.broken)
            return;
        const root = this.#root();
        show(this.panel, ...(root ? this.#presets(root) : []));
    }

    #root() {
        try {
            return valueOf(parse(this.session.text));
        } catch {
            return null;
        }
    }

    #presets(root) {
        const { extract_preset: extract, pack_preset: pack } = this.session.evaluation ?? {};
        const parts = [["extractPreset", extract?.pointer], ["packPreset", pack?.pointer]].filter(([, pointer]) => pointer)
            .map(([title, pointer]) => this.#preset(root, title, pointer));
        return parts.length > 0 ? parts : [el("p", {}, this.texts.of("noOwnPreset"))];
    }

    #preset(root, title, pointer) {
        const schema = this.schema()?.at(root, pointer);
        const value = valueOf(nodeAt(parse(this.session.text), pointer));
        return el("fieldset", { class: "preset" }, el("legend", {}, this.texts.of(title)), ...this.#keys(schema, value, pointer));
    }

    #keys(schema, value, pointer) {
        const keys = this.schema()?.keysOf(schema) ?? [];
        return keys.map(([key, its]) => isStructured(its) ? this.#group(key, its, value?.[key], `${pointer}/${key}`)
            : this.#row(key, its, value?.[key], `${pointer}/${key}`));
    }

    #row(key, schema, value, pointer) {
        const says = el("small", { id: "says" + pointer }, schema.description ?? "");
        const input = this.#input(schema, value, pointer);
        input.setAttribute("aria-describedby", "says" + pointer);
        return el("div", { class: "row" + (value === undefined ? "" : " own") }, el("label", {}, el("code", {}, key), " ", input), says);
    }

    #input(schema, value, pointer) {
        const attributes = { "data-key": "form" + pointer, "data-pointer": pointer };
        if (schema.type === "boolean")
            return el("input", { ...attributes, type: "checkbox", checked: value === true,
                onchange: (event) => this.#set(pointer, event.target.checked || undefined) });
        const shown = value === undefined ? "" : typeof value === "string" ? value : JSON.stringify(value);
        return el("input", { ...attributes, type: schema.type === "integer" || schema.type === "number" ? "number" : "text",
            step: schema.type === "number" ? "any" : "1", spellcheck: "false", autocomplete: "off",
            placeholder: schema.default === undefined ? null : String(schema.default), value: shown,
            onchange: (event) => this.#set(pointer, this.#typed(schema, event.target.value)) });
    }

    /** Keys that may hold anything take numbers as numbers and all else as text. */
    #typed(schema, text) {
        if (text === "")
            return undefined;
        if (schema.type === "string")
            return text;
        return /^-?\d+(\.\d+)?$/.test(text) ? Number(text) : text;
    }

    #set(pointer, value) {
        const change = value === undefined ? { pointer, remove: true } : { pointer, value };
        this.edits.set([change], this.texts.of("didSet", { key: pointer.split("/").at(-1) }));
    }

    /** What is folded up is not made: a preset may have hundreds of fields. */
    #group(key, schema, value, pointer) {
        const summary = el("summary", { "data-key": "group" + pointer }, el("code", {}, key), " ",
            el("small", {}, schema.description ?? ""));
        return this.#folded(summary, pointer, () => schema.type === "array" ? this.#elements(schema, value ?? [], pointer)
            : this.#keys(schema, value, pointer));
    }

    #folded(summary, pointer, contents) {
        const details = el("details", {}, summary);
        const fill = () => details.childElementCount === 1 && details.append(...contents());
        details.open = this.#open.has(pointer);
        if (details.open)
            fill();
        details.addEventListener("toggle", () => {
            this.#open[details.open ? "add" : "delete"](pointer);
            if (details.open)
                fill();
        });
        return details;
    }

    #elements(schema, values, pointer) {
        const list = Array.isArray(values) ? values : [];
        return list.map((value, place) => this.#element(this.schema().elementOf(schema, value), value, place, `${pointer}/${place}`))
            .concat(this.#adding(this.schema().elementOf(schema), pointer));
    }

    #element(schema, value, place, pointer) {
        const remove = el("button", { type: "button", class: "slight", "data-key": "remove" + pointer,
            onclick: () => this.#set(pointer, undefined) }, this.texts.of("remove"));
        if (!schema || !isStructured(schema) || typeof value !== "object")
            return el("div", { class: "row own" }, this.#input(schema ?? {}, value, pointer), remove);
        const summary = el("summary", { "data-key": "group" + pointer }, isolated(summaryOf(value, place)));
        return this.#folded(summary, pointer, () => [...this.#keys(schema, value, pointer), remove]);
    }

    #adding(schema, pointer) {
        const required = Object.fromEntries((schema?.required ?? []).map((key) => [key, key === "fields" ? [] : ""]));
        const empty = schema?.type === "object" ? required : schema?.type === "integer" ? 0 : "";
        return el("button", { type: "button", class: "slight", "data-key": "add" + pointer, onclick: () =>
            this.edits.set([{ pointer: pointer + "/-", value: empty }], this.texts.of("didSet", { key: pointer.split("/").at(-1) })) },
        this.texts.of("addTo", { key: pointer.split("/").at(-1) }));
    }
}
