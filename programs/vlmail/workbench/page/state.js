// What is open: the documents, the settings with their history, and what reading by them has given. Whoever shows a
// part of it listens; nobody else keeps a copy.
import { History } from "./history.js";

/**
 * What happens, and what has changed then: "text" the settings' text, "saved" what it is compared with, "documents"
 * their list, "file" the file of the one that is open, "document" which one is open, "page" which page or side of it and how it is shown, "evaluation" what reading it gave, "verdicts" those
 * of the others, "choice" what is chosen on the page, "message" what there is to say.
 */
export class Session extends EventTarget {
    constructor() {
        super();
        /** @type {{name: string, size: number, golden: boolean}[]} */
        this.documents = [];
        /** Of the settings: kind, name, and the version that was read. */
        this.settings = { kind: "none", name: "", version: "" };
        /** As read or written last. */
        this.savedText = "";
        /** What verdicts are compared with. */
        this.baseline = "";
        this.history = new History("");
        this.document = "";
        this.page = 1;
        /** What is shown in its stead of what goes out with its letter; null for the page itself. */
        this.side = null;
        /** Pages are shown as they will be printed, not as they were read. */
        this.isPrinted = true;
        /** The last one of settings that could be read; null before. */
        this.evaluation = null;
        /** The settings' text that it is of. */
        this.evaluatedText = "";
        /** What is no JSON in the text as it is; null when all is. */
        this.broken = null;
        this.lint = [];
        /** @type {Map<string, object>} by document */
        this.verdicts = new Map();
        /** A zone and perhaps a field of it, by their places in the settings. */
        this.choice = "";
    }

    /** @param {string} what */
    tell(what, detail = undefined) {
        this.dispatchEvent(new CustomEvent(what, { detail }));
    }

    /**
     * @param {string} whats  separated by blanks
     * @param {(detail: *) => void} listener
     */
    on(whats, listener) {
        for (const what of whats.split(" "))
            this.addEventListener(what, (event) => listener(event.detail));
    }

    get text() {
        return this.history.text;
    }

    get isChanged() {
        return this.text !== this.savedText;
    }

    /** @returns {boolean} whether the evaluation is of the settings as they are */
    get isCurrent() {
        return this.evaluation !== null && this.evaluatedText === this.text;
    }

    /** Takes over what the program has told at the start. */
    begin(state) {
        this.settings = state.settings;
        this.savedText = this.baseline = state.settings.text;
        this.history.restart(state.settings.text);
        this.documents = state.documents;
        this.tell("documents");
        this.tell("text", "begin");
    }

    /** Takes over which files there are. Those that have changed are read anew. */
    relist(documents) {
        const versions = new Map(this.documents.map(({ name, version }) => [name, version]));
        const changed = documents.filter(({ name, version }) => versions.get(name) !== version).map(({ name }) => name);
        this.documents = documents;
        changed.forEach((name) => this.verdicts.delete(name));
        this.tell("documents");
        if (changed.includes(this.document))
            this.tell("file");
        else if (changed.length > 0)
            this.tell("baseline");
    }

    /**
     * @param {string} text
     * @param {string} says  what was done, for the names of undo and redo
     * @param {string} kind  as of History.add()
     */
    change(text, says, kind = "") {
        if (text === this.text)
            return;
        this.history.add(text, says, kind);
        this.tell("text", kind);
    }

    undo() {
        if (this.history.undo())
            this.tell("text");
    }

    redo() {
        if (this.history.redo())
            this.tell("text");
    }

    saved({ text, version }) {
        this.settings = { ...this.settings, version };
        this.savedText = text;
        this.tell("saved");
    }

    compareWith(text) {
        this.baseline = text;
        this.verdicts.clear();
        this.tell("baseline");
        this.tell("verdicts");
    }

    open(document, page = 1) {
        if (document === this.document)
            return this.turnTo(page);
        this.document = document;
        this.page = page;
        this.side = null;
        this.evaluation = null;
        this.tell("document");
        this.tell("page");
        return undefined;
    }

    turnTo(page) {
        if (page === this.page && !this.side)
            return;
        this.page = page;
        this.side = null;
        this.tell("page");
    }

    /** @param {object} side  of those that go out with the letter */
    turnToSide(side) {
        if (side.kind === "page")
            return this.turnTo(side.page);
        this.side = side;
        return this.tell("page");
    }

    /** @param {boolean} isPrinted */
    show(isPrinted) {
        this.isPrinted = isPrinted;
        this.side = isPrinted ? this.side : null;
        this.tell("page");
    }

    choose(choice) {
        this.choice = choice;
        this.tell("choice");
    }

    /** Takes an answer over; one that no document was read for has findings alone. */
    evaluated(evaluation, text) {
        this.broken = evaluation.broken ?? null;
        this.lint = evaluation.lint ?? this.lint;
        if (!this.broken && evaluation.document) {
            this.#keepSides(evaluation);
            this.#noteVersion(evaluation);
            this.evaluation = evaluation;
            this.evaluatedText = text;
            this.#leaveLostSide();
        }
        this.tell("evaluation");
    }

    /** Settings that have changed may send something else along. */
    #leaveLostSide() {
        const shown = JSON.stringify(this.side);
        if (this.side && !this.letter?.sides?.some((side) => JSON.stringify(side) === shown))
            this.turnTo(this.page);
    }

    #noteVersion({ document, version }) {
        const listed = this.documents.find(({ name }) => name === document);
        if (listed && version)
            listed.version = version;
    }

    /** What goes out with letters is told behind the rest: until then it is what it was. */
    #keepSides({ document, letters = [] }) {
        const before = this.evaluation?.document === document ? this.evaluation.letters ?? [] : [];
        for (const letter of letters)
            letter.sides ??= before.find(({ pages }) => pages[0] === letter.pages[0])?.sides ?? null;
    }

    judged(verdicts) {
        for (const verdict of verdicts)
            this.verdicts.set(verdict.document, verdict);
        this.tell("verdicts");
    }

    /** @param {string} text  @param {"fine"|"bad"} kind */
    say(text, kind = "fine") {
        this.tell("message", { text, kind });
    }

    /** @returns {object|null} the letter that the page belongs to, else the document's first */
    get letter() {
        const letters = this.evaluation?.letters ?? [];
        return letters.find((letter) => letter.pages.includes(this.page)) ?? letters[0] ?? null;
    }

    /** @returns {object|null} what is drawn on the page */
    get sheet() {
        return this.side ? null : this.letter?.sheets.find((sheet) => sheet.page === this.page) ?? null;
    }

    /** @returns {number} the quarters by which the page is printed clockwise */
    get quarters() {
        return this.evaluation?.turned?.[this.page] ?? 0;
    }

    /** @returns {string} another one when the open document's file is another */
    get version() {
        return this.documents.find(({ name }) => name === this.document)?.version ?? "";
    }

    /** @returns {string} the settings as they are, or as they were before they became unreadable; empty without any */
    get readableText() {
        return this.broken ? this.evaluatedText : this.text;
    }

    /** @returns {object|null} the zone of the letter that stands there in the settings */
    zoneAt(pointer) {
        return this.letter?.zones.find((zone) => zone.pointer && pointer.startsWith(zone.pointer) &&
            /^(\/|$)/.test(pointer.slice(zone.pointer.length))) ?? null;
    }

    /** @returns {string} the part "presets" among the settings */
    get presetPointer() {
        return this.evaluation?.extract_preset?.pointer ?? "";
    }
}
