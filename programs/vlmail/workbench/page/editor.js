// The settings as JSON. With the editor of the system where it is installed, else in a plain field.
import { byId, el, isolated, show } from "./dom.js";
import { completions } from "./completion.js";
import { nodeAt, parse, placeOf, valueOf } from "./json_text.js";

/** What both ways of editing can do: text in, text out, marks, places. */
class PlainEditor {
    constructor(parent, label, typed) {
        this.area = el("textarea", { "aria-label": label, spellcheck: "false", rows: 20, class: "plain",
            oninput: () => typed(this.area.value) });
        parent.append(this.area);
    }

    set text(text) {
        if (this.area.value !== text)
            this.area.value = text;
    }

    mark() {}

    reveal(from, isFocused) {
        const lines = this.area.value.split("\n");
        const at = lines.slice(0, from.line).join("\n").length + (from.line > 0 ? 1 : 0) + from.ch;
        this.area.setSelectionRange(at, at);
        this.area.scrollTop = this.area.scrollHeight * from.line / lines.length;
        if (isFocused)
            this.area.focus();
    }
}

class RichEditor {
    #isSetting = false;
    #marks = [];

    constructor(parent, label, typed, hints, undo, redo) {
        const { CodeMirror } = globalThis;
        this.mirror = CodeMirror(parent, { mode: { name: "javascript", json: true }, lineNumbers: true, lineWrapping: true,
            matchBrackets: true, autoCloseBrackets: true, gutters: ["CodeMirror-linenumbers", "faults"], undoDepth: 0,
            screenReaderLabel: label, hintOptions: { completeSingle: false, hint: hints }, extraKeys: {
                "Ctrl-Z": undo, "Cmd-Z": undo, "Ctrl-Y": redo, "Shift-Ctrl-Z": redo, "Shift-Cmd-Z": redo, "Cmd-Y": redo,
                "Ctrl-Space": "autocomplete", Tab: false, "Shift-Tab": false } });
        this.mirror.on("change", () => this.#isSetting || typed(this.mirror.getValue()));
        this.mirror.on("inputRead", (_, change) => /["\w]$/.test(change.text.at(-1)) && this.mirror.execCommand("autocomplete"));
        new ResizeObserver(() => this.mirror.refresh()).observe(parent);
    }

    /** Only what differs is replaced, so that the cursor and what is seen stay where they are. */
    set text(text) {
        const old = this.mirror.getValue();
        if (old === text)
            return;
        let start = 0;
        while (start < old.length && old[start] === text[start])
            ++start;
        let end = 0;
        while (end < Math.min(old.length, text.length) - start && old[old.length - 1 - end] === text[text.length - 1 - end])
            ++end;
        this.#isSetting = true;
        this.mirror.replaceRange(text.slice(start, text.length - end), placeOf(old, start), placeOf(old, old.length - end));
        this.#isSetting = false;
    }

    mark(faults) {
        this.mirror.operation(() => {
            this.#marks.forEach((mark) => mark.clear());
            this.mirror.clearGutter("faults");
            this.#marks = faults.map((fault) => this.#markOne(fault)).filter(Boolean);
        });
    }

    #markOne({ severity, from, to, says }) {
        this.mirror.setGutterMarker(from.line, "faults", el("span", { class: "gutter " + severity, title: says, "aria-label": says },
            severity === "error" ? "\u2717" : "!"));
        const end = to ?? { line: from.line, ch: Infinity };
        return this.mirror.markText(from, end, { className: "lint " + severity, title: says });
    }

    reveal(from, isFocused) {
        this.mirror.setCursor(from);
        this.mirror.scrollIntoView(from, 80);
        if (isFocused)
            this.mirror.focus();
    }
}

export class Editor {
    /**
     * @param {object} parts
     * @param {import("./state.js").Session} parts.session
     * @param {import("./texts.js").Texts} parts.texts
     * @param {() => import("./schema.js").Schema|null} parts.schema
     */
    constructor(parts) {
        Object.assign(this, parts);
        const typed = (text) => this.session.change(text, this.texts.of("didType"), "typing");
        const label = this.texts.of("settingsAsJson");
        this.view = globalThis.CodeMirror
            ? new RichEditor(byId("editor"), label, typed, (mirror) => this.#hints(mirror), () => this.session.undo(),
                () => this.session.redo())
            : new PlainEditor(byId("editor"), label, typed);
        this.session.on("text", () => this.#take());
        this.session.on("evaluation", () => this.#mark());
        this.session.on("choice", () => this.session.choice && this.#reveal(this.session.choice));
    }

    #take() {
        this.view.text = this.session.text;
    }

    #faults() {
        const { broken, lint } = this.session;
        if (broken)
            return [{ severity: "error", from: broken.from, says: broken.line }];
        return lint.map((one) => ({ ...one, says: `${one.what}; ${one.advice}` }));
    }

    #mark() {
        const faults = this.#faults();
        this.view.mark(faults);
        show(byId("lint"), el("p", { class: faults.length > 0 ? "" : "state" }, this.texts.of("faults", { count: faults.length })),
            el("ul", {}, ...faults.map((fault, place) => this.#item(fault, place))));
    }

    #item({ severity, from, says }, place) {
        return el("li", { class: severity }, el("button", { type: "button", class: "link", "data-key": "fault" + place,
            onclick: () => this.view.reveal(from, true) }, this.texts.of("line", { number: from.line + 1 })), " ",
        severity === "error" ? "\u2717 " : "! ", isolated(says));
    }

    #document() {
        try {
            return valueOf(parse(this.session.text));
        } catch {
            return valueOf(parse(this.session.evaluatedText || "{}"));
        }
    }

    #hints(mirror) {
        const schema = this.schema();
        const cursor = mirror.getCursor();
        const before = mirror.getRange({ line: 0, ch: 0 }, cursor);
        const { token, choices } = schema ? completions(schema, this.#document(), before) : { token: "", choices: [] };
        const isClosed = token.startsWith('"') && mirror.getRange(cursor, { ...cursor, ch: cursor.ch + 1 }) === '"';
        const list = choices.map(({ text, shown, says }) => ({ text, displayText: says ? `${shown}: ${says}` : shown }));
        return { list, from: { line: cursor.line, ch: cursor.ch - token.length },
            to: { line: cursor.line, ch: cursor.ch + (isClosed ? 1 : 0) } };
    }

    /** Brings what stands there in the settings into view. */
    #reveal(pointer) {
        if (this.session.broken)
            return;
        const node = nodeAt(parse(this.session.text), pointer);
        if (node)
            this.view.reveal(placeOf(this.session.text, node.start), false);
    }
}
