// Undo and redo of the settings' text over the whole session, wherever a change came from.

/** Changes of one kind within this time are one step, as typing is. */
const TOGETHER_MS = 1000;

/**
 * @typedef {object} Step
 * @property {string} text
 * @property {string} says  what was done to come here, for people
 */

export class History {
    /**
     * @param {string} text  to begin with
     * @param {() => number} now  milliseconds
     */
    constructor(text, now = () => performance.now()) {
        this.now = now;
        this.restart(text);
    }

    /** Forgets all steps. */
    restart(text) {
        /** @type {Step[]} */
        this.steps = [{ text, says: "" }];
        this.place = 0;
        this.lastKind = "";
        this.lastAt = 0;
    }

    /** @returns {string} as it is */
    get text() {
        return this.steps[this.place].text;
    }

    get canUndo() {
        return this.place > 0;
    }

    get canRedo() {
        return this.place + 1 < this.steps.length;
    }

    /** @returns {string} what undo would take back */
    get undoes() {
        return this.canUndo ? this.steps[this.place].says : "";
    }

    /** @returns {string} what redo would do again */
    get redoes() {
        return this.canRedo ? this.steps[this.place + 1].says : "";
    }

    /**
     * @param {string} text
     * @param {string} says
     * @param {string} kind  changes of the same kind that follow soon are one step; empty: one of its own
     */
    add(text, says, kind = "") {
        if (text === this.text)
            return;
        this.steps.length = this.place + 1;
        if (this.#joins(kind))
            this.steps[this.place].text = text;
        else
            this.place = this.steps.push({ text, says }) - 1;
        this.lastKind = kind;
        this.lastAt = this.now();
    }

    #joins(kind) {
        return kind !== "" && kind === this.lastKind && this.place > 0 && this.now() - this.lastAt < TOGETHER_MS;
    }

    undo() {
        return this.#move(-1, this.canUndo);
    }

    redo() {
        return this.#move(1, this.canRedo);
    }

    #move(by, isPossible) {
        if (isPossible)
            this.place += by;
        this.lastKind = "";
        return isPossible;
    }
}
