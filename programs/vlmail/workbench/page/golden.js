// Keeps what is shown of the open document as right: from then on every change is held against it.
import { el } from "./dom.js";
import { Dialog } from "./dialog.js";

export class Golden {
    /**
     * @param {import("./state.js").Session} session
     * @param {import("./api.js").Api} api
     * @param {import("./texts.js").Texts} texts
     * @param {(failure: Error) => void} failed
     */
    constructor(session, api, texts, failed) {
        Object.assign(this, { session, api, texts, failed });
    }

    async keep(replace = false) {
        const { session } = this;
        if (!session.document)
            return;
        if (!session.isCurrent) {
            session.say(this.texts.of("changedMeanwhile"), "bad");
            return;
        }
        try {
            const { file } = await this.api.call("golden", { document: session.document, settings: session.text, replace });
            this.#kept(session.document, file);
        } catch (failure) {
            this.#failed(failure);
        }
    }

    #failed(failure) {
        if (failure.code !== "file-exists")
            return this.failed(failure);
        const dialog = new Dialog(this.texts, "goldenTitle");
        return dialog.show([el("p", {}, this.texts.of("goldenExists", { document: this.session.document }))], "replace",
            () => this.keep(true));
    }

    #kept(name, file) {
        const { session } = this;
        session.documents = session.documents.map((one) => one.name === name ? { ...one, golden: true } : one);
        session.verdicts.delete(name);
        session.tell("documents");
        session.tell("baseline");
        session.say(this.texts.of("goldenKept", { file }));
    }
}
