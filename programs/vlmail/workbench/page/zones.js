// Zones on the page: drawn, moved and resized by mouse and by keyboard.
import { byId, el } from "./dom.js";
import { nodeAt, parse, valueOf } from "./json_text.js";
import { between, fitted, isMeant, moved, onPage, resized, snapped } from "./snapping.js";

const MILLIMETRE = 100;
/** Edges snap to what is nearer than so many pixels on the screen. */
const REACH_PX = 7;
/** A pointer that moves less has clicked. */
const STILL_PX = 3;
/** The share of a page that is as good as all of it. */
const WHOLE_PAGE = 0.9;
const EDGES = ["left", "top", "right", "bottom"];
const HANDLES = ["lt", "t", "rt", "r", "rb", "b", "lb", "l"];
const FIRST = { left: 2000, top: 10000, right: 9000, bottom: 12000 };
const ARROWS = { ArrowLeft: { x: -1, y: 0 }, ArrowRight: { x: 1, y: 0 }, ArrowUp: { x: 0, y: -1 },
    ArrowDown: { x: 0, y: 1 } };
/** Where the settings say nothing of it. */
const DEFAULT_POINT = { x: 4500, y: 6200 };

/**
 * @param {string} text  of the settings
 * @param {object} zone  as evaluated
 * @param {import("./snapping.js").Box} box  where it is to lie
 * @returns {import("./json_text.js").Change[]}
 */
export function changesFor(text, zone, box) {
    const isMoved = box.right - box.left === zone.box.right - zone.box.left &&
        box.bottom - box.top === zone.box.bottom - zone.box.top;
    if (zone.by_point)
        return isMoved ? pointChanges(text, zone, box) : [{ pointer: zone.pointer + "/location", value: box }];
    const pointer = zone.location_pointer ?? zone.pointer + "/location";
    const location = valueOf(nodeAt(parse(text), pointer));
    return EDGES.filter((edge) => box[edge] !== zone.box[edge])
        .map((edge) => ({ pointer: `${pointer}/${edge}`, value: location[edge] + box[edge] - zone.box[edge] }));
}

function pointChanges(text, zone, box) {
    const pointer = zone.pointer + "/most_probable_point";
    const point = valueOf(nodeAt(parse(text), pointer)) ?? DEFAULT_POINT;
    return [{ pointer, value: { x: point.x + box.left - zone.box.left, y: point.y + box.top - zone.box.top } }];
}

export class ZoneTools {
    #blocks = { key: "", blocks: [], lines: [] };
    #gesture = null;
    #draft = null;

    /**
     * @param {object} parts
     * @param {import("./state.js").Session} parts.session
     * @param {import("./canvas.js").Canvas} parts.canvas
     * @param {import("./api.js").Api} parts.api
     * @param {import("./edits.js").Edits} parts.edits
     * @param {import("./texts.js").Texts} parts.texts
     * @param {(box: import("./snapping.js").Box, lines: object[]) => void} parts.drawn  a new zone was drawn
     */
    constructor(parts) {
        Object.assign(this, parts, { drawButton: byId("draw") });
        this.canvas.addEventListener("drawn", () => this.#dress());
        this.session.on("choice", () => this.#dress());
        this.session.on("page", () => this.#endDraft());
        this.drawButton.addEventListener("click", () => this.#draft ? this.#endDraft() : this.beginDraft());
        const { stage, sheet } = this.canvas;
        stage.addEventListener("keydown", (event) => this.#keyDown(event));
        stage.addEventListener("keyup", (event) => this.#keyUp(event));
        sheet.addEventListener("pointerdown", (event) => this.#press(event));
        sheet.addEventListener("pointermove", (event) => this.#drag(event));
        sheet.addEventListener("pointerup", (event) => this.#release(event));
        sheet.addEventListener("pointercancel", () => this.#giveUp());
        stage.addEventListener("focusout", () => this.#commitKeys());
        stage.addEventListener("focusin", (event) => this.#focus(event));
    }

    /** Text blocks of the page that is shown; empty as long as they are not known. */
    async #load() {
        const { document, page } = this.session;
        const key = JSON.stringify([document, page, this.session.version]);
        if (!document || this.#blocks.key === key)
            return;
        this.#blocks = { key, blocks: [], lines: [] };
        const answer = await this.api.call("blocks", { document, page, settings: this.session.text }).catch(() => null);
        if (answer && this.#blocks.key === key)
            this.#blocks = { key, ...answer };
    }

    // What a mark is of.

    #markOf(place) {
        return place && this.canvas.marks.querySelector(`.zone[data-place="${CSS.escape(place)}"]`);
    }

    #zoneOf(element) {
        const place = element?.closest?.("[data-place]")?.dataset.place;
        return place ? this.session.zoneAt(place) : null;
    }

    get #chosen() {
        return this.session.choice ? this.session.zoneAt(this.session.choice) : null;
    }

    #dress() {
        this.#load();
        if (this.#gesture && !this.#gesture.isDraft)
            this.canvas.put(this.#gesture.mark, this.#gesture.box);
        for (const mark of this.canvas.marks.querySelectorAll("[data-place]"))
            mark.classList.toggle("chosen", mark.dataset.place === this.session.choice);
        for (const handle of this.canvas.marks.querySelectorAll(".handle"))
            handle.remove();
        for (const zone of this.canvas.marks.querySelectorAll(".zone[data-place]"))
            zone.setAttribute("aria-description", this.texts.of("zoneKeys"));
        this.#markOf(this.#chosen?.pointer)?.append(...this.#handles());
    }

    #handles() {
        return HANDLES.map((edges) => el("span", { class: "handle " + edges, "data-edges": edges, "aria-hidden": "true" }));
    }

    #focus(event) {
        const place = event.target.dataset?.place;
        if (place && place !== this.session.choice)
            this.session.choose(place);
    }

    // Gestures: a zone's box as it would be, and what becomes of it at the end.

    #begin(zone, edges, at) {
        const start = this.canvas.shown(zone.box);
        this.#gesture = { zone, edges, at, start, box: start, mark: this.#markOf(zone.pointer), isMoving: false };
    }

    #show(box) {
        this.#gesture.box = onPage(box);
        this.canvas.put(this.#gesture.mark, this.#gesture.box);
        this.#tellPlace(this.#gesture.box);
    }

    #tellPlace(box) {
        this.canvas.note.textContent = this.texts.place(this.canvas.read(box));
    }

    #giveUp() {
        const gesture = this.#gesture;
        this.#gesture = null;
        if (gesture?.isDraft)
            this.#endDraft();
        else if (gesture)
            this.canvas.draw();
    }

    #commit() {
        const { zone, box, isDraft } = this.#gesture;
        this.#gesture = null;
        this.canvas.note.textContent = "";
        if (isDraft)
            return this.#finishDraft(box);
        return this.place(zone, this.canvas.read(box));
    }

    /**
     * Puts a zone elsewhere in the settings.
     * @param {object} zone
     * @param {import("./snapping.js").Box} box
     */
    place(zone, box) {
        const was = zone.box;
        if (!zone.pointer || EDGES.every((edge) => box[edge] === was[edge]))
            return;
        // What follows before the settings have been read anew goes on from there.
        zone.box = box;
        this.edits.set((text) => changesFor(text, { ...zone, box: was }, box),
            this.texts.of("didPlace", { zone: zone.name }), "place " + zone.pointer);
    }

    fit(zone) {
        this.place(zone, onPage(fitted(zone.box, this.#blocks.blocks)));
    }

    // By mouse.

    #press(event) {
        if (event.button !== 0)
            return;
        if (this.#draft)
            this.#pressDraft(event);
        else
            this.#pressZone(event);
        if (this.#gesture)
            this.canvas.sheet.setPointerCapture(event.pointerId);
    }

    #pressZone(event) {
        const zone = this.#zoneOf(event.target);
        if (!zone?.pointer || !this.#markOf(zone.pointer))
            return;
        const edges = event.target.dataset.edges ?? "m";
        if (edges !== "m" || !this.#isWholePage(zone))
            this.#begin(zone, edges, this.canvas.placeOf(event));
        const mark = event.target.closest("[data-place]");
        mark.focus({ preventScroll: true });
        event.preventDefault();
    }

    /** Whoever presses such a zone means the page: it is moved by its edges and by keys alone. */
    #isWholePage({ box }) {
        const { width, height } = this.canvas.size;
        return (box.right - box.left) * (box.bottom - box.top) > WHOLE_PAGE * width * height;
    }

    #drag(event) {
        const gesture = this.#gesture;
        if (!gesture?.at)
            return;
        const to = this.canvas.placeOf(event);
        const by = { x: to.x - gesture.at.x, y: to.y - gesture.at.y };
        gesture.isMoving ||= Math.hypot(by.x, by.y) > STILL_PX * this.canvas.unitsPerPixel;
        if (gesture.isMoving)
            this.#show(this.#dragged(gesture, to, by, event.altKey));
    }

    #dragged({ start, edges, at, isDraft }, to, by, isFree) {
        const box = isDraft ? between(at, to) : edges === "m" ? moved(start, by) : resized(start, edges, by);
        const reach = isFree ? 0 : REACH_PX * this.canvas.unitsPerPixel;
        return snapped(box, isDraft ? "ltrb" : edges, this.#blocks.blocks.map((block) => this.canvas.shown(block)), reach);
    }

    #release() {
        if (!this.#gesture?.at)
            return;
        if (this.#gesture.isMoving)
            this.#commit();
        else if (!this.#gesture.isDraft)
            this.#gesture = null;
    }

    // By keyboard: arrows move, with Shift they move the right and lower edges, with Ctrl by a tenth of a millimetre.

    #keyDown(event) {
        const arrow = ARROWS[event.key];
        if (arrow && !event.altKey && !event.metaKey)
            this.#arrow(event, arrow);
        else if (event.key === "Escape" && (this.#gesture || this.#draft))
            this.#giveUpByKey(event);
        else if (!event.ctrlKey && !event.altKey && !event.metaKey)
            this.#letter(event);
    }

    #giveUpByKey(event) {
        event.preventDefault();
        this.#gesture = null;
        this.#endDraft();
        this.canvas.draw();
        this.canvas.note.textContent = "";
    }

    #arrow(event, arrow) {
        const zone = this.#draft ?? this.#zoneOf(event.target);
        if (!zone || (!zone.isDraft && !zone.pointer))
            return;
        event.preventDefault();
        if (!this.#gesture)
            this.#beginByKey(zone);
        const step = event.ctrlKey ? MILLIMETRE / 10 : MILLIMETRE;
        const by = { x: arrow.x * step, y: arrow.y * step };
        this.#show(event.shiftKey ? resized(this.#gesture.box, "rb", by) : moved(this.#gesture.box, by));
    }

    #beginByKey(zone) {
        if (zone.isDraft)
            this.#gesture = { box: zone.box, mark: zone.mark, isDraft: true };
        else
            this.#begin(zone, "m", null);
    }

    #letter(event) {
        const zone = this.#zoneOf(event.target);
        const acts = {
            n: () => this.beginDraft(),
            f: () => zone?.pointer && this.fit(zone),
            Delete: () => zone?.pointer && this.remove(zone),
            Enter: () => this.#draft ? this.#acceptDraft() : zone && byId("zone-form").querySelector("input")?.focus(),
            " ": () => this.session.choose(event.target.dataset.place ?? ""),
        };
        const act = acts[event.key];
        if (!act || event.target.tagName === "INPUT")
            return;
        event.preventDefault();
        act();
    }

    #keyUp(event) {
        if (ARROWS[event.key])
            this.#commitKeys();
    }

    #commitKeys() {
        if (this.#gesture && !this.#gesture.at && !this.#gesture.isDraft)
            this.#commit();
    }

    remove(zone) {
        this.edits.set([{ pointer: zone.pointer, remove: true }], this.texts.of("didRemove", { name: zone.name }));
        this.session.choose("");
    }

    // New zones: a rectangle that is drawn by mouse, or moved and resized by keyboard and taken with Enter.

    beginDraft() {
        if (!this.session.presetPointer)
            return this.session.say(this.texts.of("noOwnPreset"), "bad");
        if (this.session.side)
            this.session.turnTo(this.session.page);
        const mark = el("div", { class: "draft", role: "button", tabindex: 0, "aria-label": this.texts.of("draft"),
            "aria-description": this.texts.of("draftKeys") });
        this.#draft = { isDraft: true, box: FIRST, mark };
        this.canvas.sheet.append(mark);
        this.canvas.put(mark, FIRST);
        this.drawButton.setAttribute("aria-pressed", "true");
        this.canvas.sheet.classList.add("drawing");
        this.canvas.note.textContent = this.texts.of("draftKeys");
        return mark.focus({ preventScroll: true });
    }

    #pressDraft(event) {
        event.preventDefault();
        this.#gesture = { at: this.canvas.placeOf(event), box: this.#draft.box, mark: this.#draft.mark, isDraft: true };
    }

    #acceptDraft() {
        const { box } = this.#gesture ?? this.#draft;
        this.#gesture = null;
        this.#finishDraft(box);
    }

    #finishDraft(box) {
        this.#endDraft();
        const read = this.canvas.read(box);
        if (isMeant(read))
            this.drawn(read, this.#linesIn(read));
    }

    #linesIn(box) {
        return this.#blocks.lines.filter(({ box: { left, top, right, bottom } }) =>
            (left + right) / 2 > box.left && (left + right) / 2 < box.right &&
            (top + bottom) / 2 > box.top && (top + bottom) / 2 < box.bottom);
    }

    #endDraft() {
        if (!this.#draft)
            return;
        this.#draft.mark.remove();
        this.canvas.note.textContent = "";
        this.#draft = null;
        this.drawButton.setAttribute("aria-pressed", "false");
        this.canvas.sheet.classList.remove("drawing");
    }
}
