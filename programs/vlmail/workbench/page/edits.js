// Changes of the settings that do not come from typing: one after the other, each on what the one before has left.

/**
 * @typedef {import("./json_text.js").Change} Change
 *
 * @typedef {object} Edit  of a text; those of a list do not overlap and go from its end to its start
 * @property {{line: number, ch: number}} from
 * @property {{line: number, ch: number}} to
 * @property {string} text
 */

function offsetOf(text, { line, ch }) {
    let start = 0;
    for (let i = 0; i < line; ++i)
        start = text.indexOf("\n", start) + 1;
    return start + ch;
}

/**
 * @param {string} text
 * @param {Edit[]} edits
 * @returns {string}
 */
export function edited(text, edits) {
    return edits.reduce((result, { from, to, text: by }) =>
        result.slice(0, offsetOf(result, from)) + by + result.slice(offsetOf(result, to)), text);
}

export class Edits {
    #last = Promise.resolve();

    /**
     * @param {import("./state.js").Session} session
     * @param {import("./api.js").Api} api
     * @param {import("./texts.js").Texts} texts
     * @param {(failure: Error) => void} failed
     */
    constructor(session, api, texts, failed) {
        Object.assign(this, { session, api, texts, failed });
    }

    /**
     * @param {Change[]|((text: string) => Change[])} changes  a function gives those of the text as it is by then
     * @param {string} says  what is done, for people
     * @param {string} [kind]  as of History.add()
     * @returns {Promise<void>} ends when it is done, or failed and was told
     */
    set(changes, says, kind = "") {
        this.#last = this.#last.then(() => this.#set(changes, says, kind)).catch(this.failed);
        return this.#last;
    }

    async #set(changes, says, kind) {
        const { text } = this.session;
        const wanted = typeof changes === "function" ? changes(text) : changes;
        const { settings } = await this.api.call("edit", { settings: text, changes: wanted });
        if (this.session.text === text)
            return this.session.change(settings, says, kind);
        // Somebody has typed meanwhile.
        return this.#set(changes, says, kind);
    }

    /**
     * Puts a proposed change in. It was made for the text that was evaluated last, and for no other.
     * @param {Edit[]} edits
     * @param {string} says
     */
    put(edits, says) {
        if (!this.session.isCurrent)
            return this.session.say(this.texts.of("changedMeanwhile"), "bad");
        return this.session.change(edited(this.session.text, edits), says);
    }
}

