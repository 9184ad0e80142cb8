// Pictures of pages and of what goes out with them, the latest ones.

/** So that going back and forth costs nothing. */
const MOST = 60;

/** One picture: what it is of, and the settings that it was made by; none of a page as it was read. */
class Picture {
    constructor(url, of) {
        Object.assign(this, { url, mark: "" }, of);
    }
}

export class Pictures {
    #kept = new Map();

    /**
     * @param {import("./state.js").Session} session
     * @param {import("./api.js").Api} api
     */
    constructor(session, api) {
        Object.assign(this, { session, api });
    }

    /**
     * @param {{page: number, side?: object, isPrinted: boolean, dots: number}} wanted  of the open document
     * @param {AbortSignal} [signal]
     * @returns {Promise<Picture>}
     */
    async get(wanted, signal) {
        const { document, version, readableText } = this.session;
        const of = { document, version, text: wanted.isPrinted ? readableText : "" };
        const key = JSON.stringify([document, wanted]);
        const kept = this.#kept.get(key);
        const picture = kept && this.isCurrent(kept) ? kept : new Picture(await this.#made(wanted, of, signal), of);
        if (kept && kept !== picture)
            URL.revokeObjectURL(kept.url);
        this.#kept.delete(key);
        this.#kept.set(key, picture);
        this.#forget();
        return picture;
    }

    async #made({ page, side, dots }, { document, text }, signal) {
        const asked = { document, page, dots };
        if (text)
            Object.assign(asked, { settings: text, side: side ?? null });
        return URL.createObjectURL(await this.api.picture(asked, signal));
    }

    /** @returns {boolean} whether it would look the same if it was made anew */
    isCurrent({ text, version, mark }) {
        const { session } = this;
        if (version !== session.version)
            return false;
        return text === "" || text === session.readableText || (mark !== "" && session.isCurrent && mark === session.evaluation.printed);
    }

    /** The letters were made ready: pictures by the same settings bear the same mark, and the others may still. */
    confirm() {
        const { document, evaluation, evaluatedText } = this.session;
        for (const picture of this.#kept.values()) {
            if (picture.document !== document)
                continue;
            if (picture.text === evaluatedText)
                picture.mark = evaluation.printed;
            else if (picture.mark === evaluation.printed)
                picture.text = evaluatedText;
        }
    }

    #forget() {
        while (this.#kept.size > MOST) {
            const [key, { url }] = this.#kept.entries().next().value;
            URL.revokeObjectURL(url);
            this.#kept.delete(key);
        }
    }
}
