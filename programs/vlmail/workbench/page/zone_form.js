// The zone that is chosen, as numbers: for those who do not drag, and to the tenth of a millimetre.
import { byId, el } from "./dom.js";
import { nodeAt, parse, pointerOf, valueOf } from "./json_text.js";

const EDGES = ["left", "top", "right", "bottom"];

/**
 * @param {string} text  of the settings
 * @param {object} evaluation
 * @param {object} zone
 * @param {string} name
 * @returns {import("./json_text.js").Change[]} that give the zone a name, also where "reading" names it
 */
export function renaming(text, evaluation, zone, name) {
    const changes = [{ pointer: zone.pointer + "/name", value: name }];
    const pack = evaluation.pack_preset?.pointer;
    const zones = pack && pack + "/reading/zones";
    const rules = zones && valueOf(nodeAt(parse(text), zones + pointerOf([zone.name])));
    if (!zones || rules === undefined)
        return changes;
    return changes.concat([{ pointer: zones + pointerOf([zone.name]), remove: true },
        { pointer: zones + pointerOf([name]), value: rules }]);
}

export class ZoneForm {
    /**
     * @param {import("./state.js").Session} session
     * @param {import("./zones.js").ZoneTools} tools
     * @param {import("./edits.js").Edits} edits
     * @param {import("./texts.js").Texts} texts
     * @param {(zone: object) => void} addField
     */
    constructor(session, tools, edits, texts, addField) {
        Object.assign(this, { session, tools, edits, texts, addField, form: byId("zone-form") });
        this.#build();
        session.on("choice evaluation page", () => this.#show());
        this.form.addEventListener("submit", (event) => event.preventDefault());
        this.form.addEventListener("change", () => this.#take());
    }

    #build() {
        this.name = el("input", { type: "text", autocomplete: "off", spellcheck: "false" });
        this.edges = Object.fromEntries(EDGES.map((edge) => [edge, el("input", { type: "number", step: "0.1" })]));
        const labelled = (text, input) => el("label", {}, el("span", {}, this.texts.of(text)), " ", input);
        const button = (text, act) => el("button", { type: "button", onclick: () => this.zone && act(this.zone) },
            this.texts.of(text));
        this.form.append(labelled("zoneName", this.name), ...EDGES.map((edge) => labelled(edge, this.edges[edge])),
            button("fit", (zone) => this.tools.fit(zone)), button("addField", (zone) => this.addField(zone)),
            button("removeZone", (zone) => this.tools.remove(zone)));
    }

    get zone() {
        return this.session.choice ? this.session.zoneAt(this.session.choice) : null;
    }

    #show() {
        const { zone } = this;
        this.form.hidden = !zone;
        if (!zone)
            return;
        this.#fill(this.name, zone.name);
        for (const edge of EDGES)
            this.#fill(this.edges[edge], String(zone.box[edge] / 100));
    }

    #fill(input, value) {
        if (input !== document.activeElement || input.dataset.was !== value)
            input.value = value;
        input.dataset.was = value;
    }

    #take() {
        const { zone, session } = this;
        if (!zone || session.broken)
            return;
        if (this.name.value !== zone.name && this.name.value !== "")
            this.edits.set(renaming(session.text, session.evaluation, zone, this.name.value),
                this.texts.of("didRename", { name: this.name.value }));
        this.tools.place(zone, this.#box(zone));
    }

    /** Numbers that are none leave an edge where it is. */
    #box(zone) {
        const edge = (name) => {
            const number = this.edges[name].valueAsNumber;
            return Number.isFinite(number) ? Math.round(number * 100) : zone.box[name];
        };
        return Object.fromEntries(EDGES.map((name) => [name, edge(name)]));
    }
}
