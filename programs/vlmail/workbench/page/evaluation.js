// Reads the open document anew whenever the settings change, and the others behind it. The newest counts.
import { isGivenUp } from "./api.js";

/** Typing is let pass for so long. */
const PAUSE_MS = 120;
const MOST_AT_ONCE = 50;

/** One task at a time: a newer one ends the older. */
class Newest {
    #abort = new AbortController();

    /** @param {(signal: AbortSignal) => Promise<void>} task */
    run(task, failed) {
        this.#abort.abort();
        this.#abort = new AbortController();
        const { signal } = this.#abort;
        task(signal).catch((failure) => isGivenUp(failure) || signal.aborted || failed(failure));
    }
}

export class Evaluation {
    #open = new Newest();
    #others = new Newest();
    #timer = 0;
    #asked = null;

    /**
     * @param {import("./state.js").Session} session
     * @param {import("./api.js").Api} api
     * @param {(failure: Error) => void} failed
     */
    constructor(session, api, failed) {
        Object.assign(this, { session, api, failed });
        session.on("text", () => this.#soon());
        session.on("document file", () => this.#readNow());
        session.on("baseline", () => this.#judge());
    }

    #soon() {
        clearTimeout(this.#timer);
        this.#timer = setTimeout(() => this.#asked === this.session.text || this.#readNow(), PAUSE_MS);
    }

    #readNow() {
        clearTimeout(this.#timer);
        this.#asked = this.session.text;
        this.#open.run((signal) => this.#read(signal), (failure) => this.#lost(failure));
    }

    #lost(failure) {
        this.session.tell("idle");
        this.failed(failure);
    }

    async #read(signal) {
        const { session } = this;
        session.tell("busy");
        const { document, text } = session;
        const request = document ? { document, settings: text, checks: false } : { settings: text };
        session.evaluated(await this.api.call(document ? "evaluate" : "lint", request, signal), text);
        session.tell("idle");
        this.#judge();
        if (document && !session.broken)
            session.evaluated(await this.api.call("evaluate", { ...request, checks: true }, signal), text);
    }

    #judge() {
        if (!this.session.broken)
            this.#others.run((signal) => this.#judgeAll(this.session.text, signal), this.failed);
    }

    /** From the open document on, then from the first. */
    #order() {
        const names = this.session.documents.map((one) => one.name);
        const open = Math.max(names.indexOf(this.session.document), 0);
        return [...names.slice(open), ...names.slice(0, open)];
    }

    async #judgeAll(settings, signal) {
        const waiting = new Set(this.#order());
        while (waiting.size > 0) {
            const documents = [...waiting].slice(0, MOST_AT_ONCE);
            const { verdicts } = await this.api.call("verdicts",
                { settings, before: this.session.baseline, documents }, signal);
            for (const { document } of verdicts)
                waiting.delete(document);
            this.session.judged(verdicts);
            if (verdicts.length === 0)
                return;
        }
    }
}
