// The page's picture with what was searched and found where. The marks are those of a report, in its style.
import { byId, el, isolated } from "./dom.js";
import { isGivenUp } from "./api.js";
import { turned, turnedBack, turnedSize } from "./turning.js";

const DOTS = 110;
/** In 1/100 mm. */
const INCH = 2540;
const A4 = { width: 21000, height: 29700 };

function percent(part, whole) {
    return part / whole * 100 + "%";
}

export class Canvas extends EventTarget {
    #abort = new AbortController();
    /** As it is shown. */
    #size = A4;
    #shown = null;

    /**
     * Tells "drawn" when marks have been put onto the page.
     * @param {import("./state.js").Session} session
     * @param {import("./pictures.js").Pictures} pictures
     * @param {import("./texts.js").Texts} texts
     */
    constructor(session, pictures, texts) {
        super();
        Object.assign(this, { session, texts, pictures, stage: byId("stage"), note: byId("picture-note"), view: byId("view") });
        this.image = el("img", { alt: "", draggable: "false" });
        this.marks = el("div", { class: "marks" });
        this.sheet = el("div", { class: "sheet" }, this.image, this.marks);
        this.stage.append(this.sheet);
        this.image.addEventListener("load", () => this.#fit());
        session.on("page", () => this.#turn());
        session.on("page evaluation", () => this.draw());
        session.on("evaluation", () => this.#keepUp());
        session.on("look", (miss) => this.#look(miss));
        session.on("choice", () => this.#reveal());
        this.#listenToPaging();
    }

    #listenToPaging() {
        const turnBy = (step) => this.session.turnTo(this.#within(this.session.page + step));
        byId("page-back").addEventListener("click", () => turnBy(-1));
        byId("page-on").addEventListener("click", () => turnBy(1));
        byId("page-number").addEventListener("change", (event) => {
            this.session.turnTo(this.#within(Math.round(Number(event.target.value)) || 1));
            event.target.value = this.session.page;
        });
        this.view.append(...["printed", "read"].map((view) => el("option", { value: view }, this.texts.of("view_" + view))));
        this.view.addEventListener("change", () => this.session.show(this.view.value === "printed"));
    }

    get #count() {
        return this.session.evaluation?.page_count ?? 1;
    }

    #within(page) {
        return Math.min(Math.max(page, 1), Math.max(this.#count, 1));
    }

    async #turn() {
        this.#abort.abort();
        this.#abort = new AbortController();
        const { signal } = this.#abort;
        const { document, page, side, isPrinted } = this.session;
        this.#shown = null;
        if (side?.kind === "blank")
            return this.#showBlank();
        try {
            this.stage.setAttribute("aria-busy", "true");
            const picture = await this.pictures.get({ page, side: side ?? undefined, isPrinted, dots: DOTS }, signal);
            if (!signal.aborted)
                this.#showPicture(picture, side ? this.texts.side(side) : this.texts.of("pictureOf", { page, document }));
        } catch (failure) {
            if (!isGivenUp(failure))
                this.#showFailure(failure);
        }
        return undefined;
    }

    /** The letters may be printed otherwise by settings that have changed, and files change, too. */
    #keepUp() {
        const { evaluation } = this.session;
        if (evaluation?.printed)
            this.pictures.confirm();
        if (this.#shown && evaluation && (evaluation.printed || !this.session.isPrinted) && !this.pictures.isCurrent(this.#shown))
            this.#turn();
    }

    #showPicture(picture, says) {
        this.#shown = picture;
        this.note.textContent = "";
        this.image.hidden = false;
        this.image.src = picture.url;
        this.image.alt = says;
    }

    #showBlank() {
        this.stage.removeAttribute("aria-busy");
        this.image.hidden = true;
        this.note.textContent = this.texts.side(this.session.side);
    }

    #showFailure(failure) {
        this.stage.removeAttribute("aria-busy");
        this.image.hidden = true;
        this.image.removeAttribute("src");
        this.note.textContent = failure.message || this.texts.of("noProgram");
    }

    /** A page without marks is as large as its picture says. */
    #fit() {
        this.stage.removeAttribute("aria-busy");
        if (this.#marked)
            return;
        const { naturalWidth: width, naturalHeight: height } = this.image;
        this.#resize(width / DOTS * INCH, height / DOTS * INCH);
        this.dispatchEvent(new CustomEvent("drawn"));
    }

    /** @returns {object|null} what is drawn on the page, as it is shown */
    get #marked() {
        const { sheet } = this.session;
        return sheet && { ...turnedSize(sheet, this.#quartersBack), shapes: sheet.shapes.map((shape) => ({ ...shape,
            box: turned(shape.box, sheet, this.#quartersBack) })) };
    }

    /** From the page as it is printed to the page as it is shown. */
    get #quartersBack() {
        return this.session.isPrinted ? 0 : (4 - this.session.quarters) % 4;
    }

    /** From the page as it was read to the page as it is shown. */
    get #quarters() {
        return this.session.isPrinted ? this.session.quarters : 0;
    }

    /**
     * @param {import("./snapping.js").Box} box  on the page as it was read
     * @returns {import("./snapping.js").Box} on the page as it is shown
     */
    shown(box) {
        return turned(box, turnedSize(this.#size, this.#quarters), this.#quarters);
    }

    /** The way back from shown(). */
    read(box) {
        return turnedBack(box, this.#size, this.#quarters);
    }

    #resize(width, height) {
        this.#size = { width, height };
        this.sheet.style.setProperty("--w", width);
        this.sheet.style.setProperty("--h", height);
    }

    #showPaging() {
        byId("page-number").max = this.#count;
        byId("page-number").value = this.session.page;
        byId("page-count").textContent = this.texts.of("ofPages", { count: this.#count });
        byId("page-back").disabled = this.session.page <= 1;
        byId("page-on").disabled = this.session.page >= this.#count;
        this.view.value = this.session.isPrinted ? "printed" : "read";
    }

    draw() {
        const marked = this.#marked;
        const { side } = this.session;
        if (marked ?? side)
            this.#resize((marked ?? side).width, (marked ?? side).height);
        this.#showPaging();
        this.#place((marked?.shapes ?? []).map((shape) => this.#mark(shape)));
        this.dispatchEvent(new CustomEvent("drawn"));
    }

    /** Marks that were there stay the same elements, with the pointer or the keyboard on them. */
    #place(marks) {
        const old = new Map([...this.marks.children].map((mark) => [mark.dataset.key, mark]));
        marks.forEach((mark, place) => {
            const kept = old.get(mark.dataset.key);
            const placed = kept ? this.#renewed(kept, mark) : mark;
            old.delete(mark.dataset.key);
            if (this.marks.children[place] !== placed)
                this.marks.insertBefore(placed, this.marks.children[place] ?? null);
        });
        old.forEach((mark) => mark.remove());
        while (this.marks.children.length > marks.length)
            this.marks.lastChild.remove();
    }

    #renewed(mark, { className, ariaLabel, style, childNodes }) {
        mark.className = className;
        mark.ariaLabel = ariaLabel;
        for (const side of ["left", "top", "width", "height"])
            mark.style[side] = style[side];
        mark.replaceChildren(...childNodes);
        return mark;
    }

    /** Brings the text that somebody asks for into view, until something else is drawn. */
    #look({ page, box }) {
        this.session.turnTo(page ?? this.session.page);
        const frame = el("div", { class: "look" });
        this.marks.append(frame);
        this.put(frame, this.shown(box));
        frame.scrollIntoView({ block: "nearest" });
    }

    #reveal() {
        const chosen = this.session.choice && this.marks.querySelector(`[data-place="${CSS.escape(this.session.choice)}"]`);
        if (chosen && chosen !== document.activeElement)
            chosen.scrollIntoView({ block: "nearest" });
    }

    #mark(shape) {
        const mark = el("a", { class: shape.look, role: "button", tabindex: 0, "aria-label": shape.label,
            onclick: () => this.session.choose(mark.dataset.place ?? "") },
        shape.tag ? el("span", { class: "tag" }, isolated(shape.tag)) : null);
        this.#key(mark, shape);
        this.put(mark, shape.box);
        return mark;
    }

    /** Where it stands in the settings, and what focus finds it by when it is drawn anew. */
    #key(mark, { zone, field, finding, box }) {
        const found = zone === null ? null : this.session.letter?.zones[zone];
        const place = (field === null ? found : found?.fields[field])?.pointer;
        if (place)
            mark.dataset.place = place;
        mark.dataset.key = place ? `${place} ${field === null ? "" : box.left + "," + box.top}` : `finding ${finding}`;
    }

    /**
     * Lays an element over the page.
     * @param {HTMLElement} element
     * @param {import("./snapping.js").Box} box  on the page as it is shown
     */
    put(element, box) {
        const { width, height } = this.#size;
        element.style.left = percent(box.left, width);
        element.style.top = percent(box.top, height);
        element.style.width = percent(box.right - box.left, width);
        element.style.height = percent(box.bottom - box.top, height);
    }

    /**
     * @param {PointerEvent} event
     * @returns {{x: number, y: number}} on the page as it is shown, in 1/100 mm
     */
    placeOf(event) {
        const box = this.sheet.getBoundingClientRect();
        return { x: (event.clientX - box.left) / box.width * this.#size.width,
            y: (event.clientY - box.top) / box.height * this.#size.height };
    }

    /** @returns {number} 1/100 mm on the page for one pixel on the screen */
    get unitsPerPixel() {
        return this.#size.width / this.sheet.getBoundingClientRect().width;
    }

    /** @returns {{width: number, height: number}} of the page */
    get size() {
        return this.#size;
    }
}
