// Saving: what differs is shown before, and both sides where somebody else has changed the settings meanwhile.
import { el } from "./dom.js";
import { Dialog } from "./dialog.js";
import { diff, hunks } from "./diff.js";

const SIGNS = { same: " ", gone: "-", new: "+" };

/**
 * @param {string} before
 * @param {string} after
 * @param {import("./texts.js").Texts} texts
 * @param {string} label
 * @returns {HTMLElement} what differs, line by line
 */
export function shownDiff(before, after, texts, label) {
    const parts = hunks(diff(before, after));
    const line = ({ kind, text, before: was, after: is }) => el("tr", { class: kind }, el("td", { class: "number" }, String(was ?? "")),
        el("td", { class: "number" }, String(is ?? "")), el("td", { class: "sign" }, SIGNS[kind]), el("td", { class: "text" }, text));
    const body = parts.map((part) => el("tbody", {}, ...part.map(line)));
    return el("div", { class: "diff", tabindex: 0, role: "region", "aria-label": label },
        el("table", {}, el("caption", {}, label), ...body), parts.length === 0 && el("p", {}, texts.of("noDifference")));
}

export class Saving {
    /**
     * @param {import("./state.js").Session} session
     * @param {import("./api.js").Api} api
     * @param {import("./texts.js").Texts} texts
     * @param {(failure: Error) => void} failed
     */
    constructor(session, api, texts, failed) {
        Object.assign(this, { session, api, texts, failed });
    }

    ask() {
        const { session, texts } = this;
        if (session.settings.kind === "none")
            return session.say(texts.of("nowhereToSave"), "bad");
        if (!session.isChanged)
            return session.say(texts.of("nothingToSave"));
        const dialog = new Dialog(texts, "saveTitle");
        return dialog.show([el("p", {}, texts.of("saveInto", { name: session.settings.name })),
            session.broken && el("p", { class: "why" }, session.broken.line),
            shownDiff(session.savedText, session.text, texts, texts.of("changes"))], "saveNow",
        () => this.#save(session.text, session.settings.version));
    }

    async #save(text, version) {
        try {
            this.session.saved(await this.api.call("save", { text, version, force: false }));
            this.session.say(this.texts.of("saved", { name: this.session.settings.name }));
        } catch (failure) {
            if (failure.code === "settings-changed")
                this.#conflict(text, failure.answer);
            else
                this.failed(failure);
        }
    }

    #conflict(text, { theirs, version }) {
        const { texts, session } = this;
        const dialog = new Dialog(texts, "conflictTitle");
        dialog.button("takeTheirs", { type: "button", onclick: () => {
            dialog.close();
            session.saved({ text: theirs, version });
            session.change(theirs, texts.of("didTakeTheirs"));
        } });
        dialog.show([el("p", { class: "why" }, texts.of("conflict", { name: session.settings.name })),
            shownDiff(session.savedText, theirs, texts, texts.of("theirChanges")),
            shownDiff(session.savedText, text, texts, texts.of("yourChanges")),
            shownDiff(theirs, text, texts, texts.of("betweenBoth"))], "overwrite", () => this.#save(text, version));
    }
}
