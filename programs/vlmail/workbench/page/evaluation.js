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
    #isReading = false;

    /**
     * @param {import("./state.js").Session} session
     * @param {import("./api.js").Api} api
     * @param {(failure: Error) => void} failed
     */
    constructor(session, api, failed) {
        Object.assign(this, { session, api, failed });
        session.on("text", (kind) => kind ? this.#soon() : this.#readNow());
        session.on("document file", () => this.#readNow());
        session.on("baseline", () => this.#judge());
    }

    /** What comes in rows is waited for: letters that are typed, steps of an arrow. */
    #soon() {
        this.session.tell("busy");
        clearTimeout(this.#timer);
        this.#timer = setTimeout(() => this.#paused(), PAUSE_MS);
    }

    #paused() {
        this.#timer = 0;
        if (this.#asked === this.session.text)
            this.#rest();
        else
            this.#readNow();
    }

    #readNow() {
        clearTimeout(this.#timer);
        this.#timer = 0;
        this.#asked = this.session.text;
        this.#isReading = true;
        this.session.tell("busy");
        this.#open.run((signal) => this.#read(signal), (failure) => this.#lost(failure));
    }

    #lost(failure) {
        this.#isReading = false;
        this.#rest();
        this.failed(failure);
    }

    /** What is shown is of the settings as they are. */
    #rest() {
        if (!this.#isReading && this.#timer === 0)
            this.session.tell("idle");
    }

    async #read(signal) {
        const { session } = this;
        const { document, text } = session;
        const request = document ? { document, settings: text, checks: false } : { settings: text };
        const evaluation = document ? await this.#evaluated(request, signal) : await this.api.call("lint", request, signal);
        session.evaluated(evaluation, text);
        this.#isReading = false;
        this.#rest();
        this.#judge();
        if (document && !session.broken && !evaluation.error)
            session.evaluated(await this.api.call("evaluate", { ...request, checks: true }, signal), text);
    }

    /** A document that cannot be read at all is one that failed: the others can be. */
    async #evaluated(request, signal) {
        try {
            return await this.api.call("evaluate", request, signal);
        } catch (failure) {
            if (isGivenUp(failure) || failure.status === 0)
                throw failure;
            this.failed(failure);
            return { document: request.document, broken: null, verdict: "failed", error: { code: failure.code, line: failure.message } };
        }
    }

    #judge() {
        if (!this.session.broken)
            this.#others.run((signal) => this.#judgeAll(this.session.text, signal), this.failed);
    }

    /** From the open document on, then from the first; those that nothing could read last, since they take the longest. */
    #order() {
        const names = this.session.documents.map((one) => one.name);
        const open = Math.max(names.indexOf(this.session.document), 0);
        const { document, evaluation, verdicts } = this.session;
        const isEndless = (name) => (name === document ? evaluation : verdicts.get(name))?.error?.code === "limit-exceeded";
        const order = [...names.slice(open), ...names.slice(0, open)];
        return [...order.filter((name) => !isEndless(name)), ...order.filter(isEndless)];
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
