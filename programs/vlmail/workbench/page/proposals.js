// A new preset from the document that is open and those of its kind: the program proposes, the person ticks what is right.
import { el, isolated } from "./dom.js";
import { Dialog } from "./dialog.js";

/** What they have in common is sought in so many. */
const MOST = 10;

/**
 * @param {string[]} names
 * @param {string} open
 * @returns {string[]} the open one, and others that are named like it but for their numbers
 */
export function alike(names, open) {
    const kind = (name) => name.replace(/\d+/g, "0");
    return [open, ...names.filter((name) => name !== open && kind(name) === kind(open))].slice(0, MOST);
}

export class Proposals {
    /**
     * @param {import("./state.js").Session} session
     * @param {import("./api.js").Api} api
     * @param {import("./texts.js").Texts} texts
     * @param {(failure: Error) => void} failed
     */
    constructor(session, api, texts, failed) {
        Object.assign(this, { session, api, texts, failed });
    }

    async ask() {
        const { session } = this;
        if (!session.document)
            return;
        const documents = alike(session.documents.map(({ name }) => name), session.document);
        try {
            this.#show(await this.api.call("propose", { documents, settings: session.text }), documents);
        } catch (failure) {
            this.failed(failure);
        }
    }

    #show(proposal, documents) {
        const { texts } = this;
        const match = el("input", { type: "text", class: "wide", value: proposal.match.proposal, spellcheck: "false" });
        const address = proposal.address && this.#tick(texts.of("addressZone"), proposal.address, true);
        const fields = proposal.fields.map((field) => this.#field(field));
        const dialog = new Dialog(texts, "proposalTitle");
        dialog.show([el("p", {}, texts.of("proposalIntro")), el("p", { class: "note" }, texts.of("madeFrom"), " ", isolated(documents.join(", "))), el("label", {}, el("span", {}, texts.of("documentsNamed")), " ", match),
            el("p", { class: "note" }, texts.of("matchSays")),
            el("fieldset", {}, el("legend", {}, texts.of("readFromIt")), address?.row, ...fields.map(({ row }) => row),
                fields.length === 0 && !address && el("p", {}, texts.of("nothingProposed")))], "adopt",
        () => this.#adopt({ ...proposal, match: { ...proposal.match, proposal: match.value },
            address: address?.box.checked ? proposal.address : null,
            fields: fields.filter(({ box }) => box.checked).map(({ taken }) => taken()) }));
    }

    #tick(title, { says }, isTicked) {
        const box = el("input", { type: "checkbox", checked: isTicked });
        return { box, row: el("div", { class: "tick" }, el("label", {}, box, " ", el("strong", {}, isolated(title))), el("small", {}, isolated(says))) };
    }

    #field(field) {
        const { box, row } = this.#tick(field.value, field, true);
        const name = el("input", { type: "text", value: field.name, "aria-label": this.texts.of("fieldNameFor", { value: field.value }) });
        row.append(name);
        return { box, row, taken: () => ({ ...field, name: name.value || field.name }) };
    }

    async #adopt(proposal) {
        const { session } = this;
        try {
            const { settings } = await this.api.call("adopt", { settings: session.text, proposal });
            session.change(settings, this.texts.of("didAdopt"));
            session.say(this.texts.of("adopted"));
        } catch (failure) {
            this.failed(failure);
        }
    }
}
