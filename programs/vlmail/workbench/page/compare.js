// What the changes do to all documents: which become better and which worse, against the settings before and against
// what is kept as right.
import { byId, el, isolated, show } from "./dom.js";

/** More are counted, not shown. */
const MOST_SHOWN = 200;

export class Compare {
    /**
     * @param {import("./state.js").Session} session
     * @param {import("./texts.js").Texts} texts
     */
    constructor(session, texts) {
        Object.assign(this, { session, texts, panel: byId("panel-effect"), tab: byId("tab-effect") });
        session.on("verdicts documents text document", () => this.draw());
    }

    /** @returns {{kind: string, verdicts: object[]}[]} by what became of them, the worst first */
    groups() {
        const verdicts = this.session.documents.map(({ name }) => this.session.verdicts.get(name)).filter(Boolean);
        const differing = verdicts.filter(({ golden }) => golden && golden.verdict !== "ok");
        return [{ kind: "golden", verdicts: differing }].concat(["worse", "better", "other"].map((kind) => ({ kind,
            verdicts: verdicts.filter(({ change }) => change === kind) })));
    }

    /** @returns {string[]} names of documents that can be walked through, each once */
    get names() {
        return [...new Set(this.groups().flatMap(({ verdicts }) => verdicts.map((one) => one.document)))];
    }

    draw() {
        const groups = this.groups();
        const count = (kind) => groups.find((group) => group.kind === kind).verdicts.length;
        const [worse, better, golden] = ["worse", "better", "golden"].map(count);
        this.tab.textContent = this.texts.of("tabEffectCounts", { worse, better, golden });
        if (!this.panel.hidden)
            show(this.panel, this.#head(), ...groups.map((group) => this.#group(group)));
    }

    #head() {
        const { session } = this;
        const waiting = session.documents.filter(({ name }) => !session.verdicts.has(name)).length;
        const says = waiting > 0 ? this.texts.of("waiting", { waiting })
            : this.texts.of(session.text === session.baseline ? "nothingChanged" : "comparedAll", { count: session.documents.length });
        const button = (text, act, isOff) => el("button", { type: "button", "data-key": text, disabled: isOff, onclick: act },
            this.texts.of(text));
        return el("p", { class: "walk" }, el("span", { role: "status" }, says), " ",
            button("walkBack", () => this.#walk(-1), this.names.length === 0),
            button("walkOn", () => this.#walk(1), this.names.length === 0),
            button("compareFromHere", () => session.compareWith(session.text), session.text === session.baseline));
    }

    #walk(by) {
        const { names } = this;
        const place = names.indexOf(this.session.document);
        const next = place < 0 && by < 0 ? names.length - 1 : (place + by + names.length) % names.length;
        this.session.open(names[next]);
    }

    #group({ kind, verdicts }) {
        if (verdicts.length === 0)
            return null;
        const rest = verdicts.length - MOST_SHOWN;
        return el("section", { class: "effect " + kind }, el("h3", {}, this.texts.of("effect_" + kind, { count: verdicts.length })),
            el("ul", {}, ...verdicts.slice(0, MOST_SHOWN).map((verdict) => this.#verdict(kind, verdict)),
                rest > 0 && el("li", {}, this.texts.of("andMore", { count: rest }))));
    }

    #verdict(kind, verdict) {
        const says = kind === "golden" ? verdict.golden.differences : verdict.changes;
        return el("li", {}, el("button", { type: "button", class: "link", "data-key": kind + verdict.document,
            "aria-current": verdict.document === this.session.document ? "true" : null,
            onclick: () => this.session.open(verdict.document) }, isolated(verdict.document)),
        el("ul", {}, ...(says ?? []).map((one) => el("li", {}, isolated(one)))));
    }
}
