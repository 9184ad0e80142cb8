// Requests to the program that has served this page.

/** A request that was refused, in one line for people. */
export class Refusal extends Error {
    /**
     * @param {number} status  0: the program cannot be reached
     * @param {string} code
     * @param {string} line
     * @param {object} answer  all of it
     */
    constructor(status, code, line, answer = {}) {
        super(line);
        this.status = status;
        this.code = code;
        this.answer = answer;
    }

    /** A newer request has taken the place of this one. */
    get isSuperseded() {
        return this.code === "superseded";
    }
}

/**
 * @param {unknown} failure
 * @returns {boolean} whether nobody waits for the answer any longer
 */
export function isGivenUp(failure) {
    return failure.name === "AbortError" || failure.isSuperseded === true;
}

async function refusalOf(response) {
    const answer = await response.json().catch(() => ({}));
    const { code = "", line = `${response.status} ${response.statusText}` } = answer.error ?? {};
    return new Refusal(response.status, code, line, answer);
}

export class Api {
    #token;

    /** @param {string} token  lets these requests in */
    constructor(token) {
        this.#token = token;
    }

    async #post(name, body, signal) {
        const headers = { "Content-Type": "application/json", "X-Workbench-Token": this.#token };
        const response = await fetch("/api/" + name, { method: "POST", headers, body: JSON.stringify(body), signal })
            .catch((failure) => {
                throw failure.name === "AbortError" ? failure : new Refusal(0, "", "");
            });
        if (!response.ok)
            throw await refusalOf(response);
        return response;
    }

    /**
     * Throws Refusal, or AbortError when the signal ends it.
     * @param {string} name
     * @param {object} [body]
     * @param {AbortSignal} [signal]
     * @returns {Promise<object>} the answer
     */
    async call(name, body = {}, signal = undefined) {
        return (await this.#post(name, body, signal)).json();
    }

    /**
     * Throws as call() does.
     * @param {{document: string, page: number, dots: number}} wanted
     * @param {AbortSignal} [signal]
     * @returns {Promise<Blob>} the page's picture
     */
    async picture(wanted, signal) {
        return (await this.#post("picture", wanted, signal)).blob();
    }
}
