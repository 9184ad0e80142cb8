// The documents: as many rows as can be seen, however many there are.
import { byId, el, isolated } from "./dom.js";

/** Rows beyond the edges, so that scrolling shows no gaps. */
const SPARE_ROWS = 6;

const SIGNS = { ready: "\u2713", trouble: "\u2717", failed: "\u2717", attachment: "\u2713" };
const CHANGE_SIGNS = { better: "\u2191", worse: "\u2193", other: "\u2195" };

/** What each choice of the list lets through, by the verdict on a document. */
const KINDS = {
    all: () => true,
    trouble: (verdict) => verdict?.verdict === "trouble" || verdict?.verdict === "failed",
    ready: (verdict) => verdict?.verdict === "ready",
    attachment: (verdict) => verdict?.verdict === "attachment",
    better: (verdict) => verdict?.change === "better",
    worse: (verdict) => verdict?.change === "worse",
    golden: (verdict) => Boolean(verdict?.golden) && verdict.golden.verdict !== "ok",
};

function renew(row, { attributes, style, childNodes }) {
    for (const { name, value } of [...attributes].filter((one) => one.name !== "style"))
        row.setAttribute(name, value);
    row.style.top = style.top;
    row.replaceChildren(...childNodes);
}

export class DocumentList {
    #shown = [];

    /**
     * @param {import("./state.js").Session} session
     * @param {import("./texts.js").Texts} texts
     */
    constructor(session, texts) {
        Object.assign(this, { session, texts, box: byId("list"), filter: byId("filter"), kind: byId("kind") });
        this.kind.append(...Object.keys(KINDS).map((kind) => el("option", { value: kind }, texts.of("kind_" + kind))));
        this.space = el("div", { class: "space", role: "presentation" });
        this.box.append(this.space);
        this.#listen();
    }

    #listen() {
        this.session.on("documents document verdicts", () => this.#sift());
        this.session.on("document", () => this.#reveal());
        this.filter.addEventListener("input", () => this.#sift());
        this.kind.addEventListener("input", () => this.#sift());
        this.box.addEventListener("scroll", () => this.#draw());
        this.box.addEventListener("keydown", (event) => this.#key(event));
        this.box.addEventListener("click", (event) => this.#click(event));
        new ResizeObserver(() => this.#draw()).observe(this.box);
    }

    #sift() {
        const wanted = this.filter.value.toLocaleLowerCase();
        const fits = KINDS[this.kind.value];
        this.#shown = this.session.documents.filter(({ name }) =>
            name.toLocaleLowerCase().includes(wanted) && fits(this.session.verdicts.get(name)));
        this.#draw();
        this.#count();
    }

    #count() {
        const { documents, verdicts } = this.session;
        const troubled = documents.filter(({ name }) => KINDS.trouble(verdicts.get(name))).length;
        const says = this.texts.of("counts", { shown: this.#shown.length, all: documents.length, troubled,
            waiting: documents.filter(({ name }) => !verdicts.has(name)).length });
        if (byId("counts").textContent !== says)
            byId("counts").textContent = says;
    }

    /** Of a row, in pixels: the style sheet has it. */
    get #rowHeight() {
        return parseFloat(getComputedStyle(this.box).getPropertyValue("--row")) *
            parseFloat(getComputedStyle(document.documentElement).fontSize);
    }

    #draw() {
        const height = this.#rowHeight;
        const first = Math.max(0, Math.floor(this.box.scrollTop / height) - SPARE_ROWS);
        const count = Math.ceil(this.box.clientHeight / height) + 2 * SPARE_ROWS;
        this.space.style.height = this.#shown.length * height + "px";
        this.#place(this.#shown.slice(first, first + count).map((document, place) => this.#row(document, first + place, height)));
        this.#markActive();
    }

    /** Rows stay the same elements: a button of the mouse may be down on one. */
    #place(rows) {
        const old = [...this.space.children];
        old.slice(rows.length).forEach((row) => row.remove());
        rows.forEach((row, place) => {
            if (!old[place])
                this.space.append(row);
            else if (!old[place].isEqualNode(row))
                renew(old[place], row);
        });
    }

    #markActive() {
        const active = this.space.querySelector('[aria-selected="true"]');
        if (active)
            this.box.setAttribute("aria-activedescendant", active.id);
        else
            this.box.removeAttribute("aria-activedescendant");
    }

    #row(document, place, height) {
        const verdict = this.session.verdicts.get(document.name);
        const row = el("div", { role: "option", id: "row" + place, class: "row " + (verdict?.verdict ?? "waiting"),
            "aria-selected": String(document.name === this.session.document), "aria-posinset": place + 1,
            "aria-setsize": this.#shown.length }, el("span", { class: "name" }, isolated(document.name)),
        el("span", { class: "verdict" }, this.#says(document, verdict)));
        row.style.top = place * height + "px";
        return row;
    }

    #says(document, verdict) {
        if (!verdict)
            return this.texts.of("notRead");
        const parts = [`${SIGNS[verdict.verdict] ?? ""} ${this.texts.verdict(verdict)}`];
        if (CHANGE_SIGNS[verdict.change])
            parts.push(`${CHANGE_SIGNS[verdict.change]} ${this.texts.of("kind_" + verdict.change)}`);
        if (KINDS.golden(verdict))
            parts.push("\u2260 " + this.texts.of("kind_golden"));
        else if (document.golden)
            parts.push("\u2605");
        return parts.join(" \u00b7 ");
    }

    #openPlace() {
        return this.#shown.findIndex(({ name }) => name === this.session.document);
    }

    #reveal() {
        const place = this.#openPlace();
        const height = this.#rowHeight;
        if (place < 0)
            return;
        const top = this.box.scrollTop;
        this.box.scrollTop = Math.min(Math.max(top, (place + 1) * height - this.box.clientHeight), place * height);
        this.#draw();
    }

    #open(place) {
        const document = this.#shown[Math.min(Math.max(place, 0), this.#shown.length - 1)];
        if (document)
            this.session.open(document.name);
    }

    #key(event) {
        const page = Math.max(1, Math.floor(this.box.clientHeight / this.#rowHeight) - 1);
        const steps = { ArrowDown: 1, ArrowUp: -1, PageDown: page, PageUp: -page, Home: -Infinity, End: Infinity };
        const step = steps[event.key];
        if (step === undefined || event.ctrlKey || event.altKey)
            return;
        event.preventDefault();
        this.#open(Math.max(this.#openPlace(), step > 0 ? -1 : 0) + step);
    }

    #click(event) {
        const row = event.target.closest('[role="option"]');
        if (row)
            this.#open(Number(row.getAttribute("aria-posinset")) - 1);
    }
}
