// JSON as its writer laid it out: where in the text each value stands.

/**
 * @typedef {object} Node
 * @property {"object"|"array"|"string"|"number"|"literal"} type
 * @property {number} start  the first character
 * @property {number} end    behind the last one
 * @property {*} value       of strings, numbers and literals
 * @property {Member[]} members  of objects and arrays, in their order
 *
 * @typedef {object} Member
 * @property {string} key    an array's are the decimal places
 * @property {number} start  where the key begins, in an array the value
 * @property {Node} node
 *
 * @typedef {object} Change  sets a value in a document, or takes it out
 * @property {string} pointer  the last step may be "-", behind the last element of an array
 * @property {*} [value]
 * @property {boolean} [remove]  takes out what stands there
 */

/** What is no JSON, with the place of the first fault. */
export class JsonFault extends Error {
    /** @param {string} says  @param {number} at */
    constructor(says, at) {
        super(says);
        this.at = at;
    }
}

const BLANK = /[ \t\r\n]*/y;
const SCALAR = /"(?:[^"\\\u0000-\u001f]|\\(?:["\\/bfnrt]|u[0-9a-fA-F]{4}))*"|-?(?:0|[1-9]\d*)(?:\.\d+)?(?:[eE][+-]?\d+)?|true|false|null/y;
const MOST_DEPTH = 500;

class Parser {
    constructor(text) {
        this.text = text;
        this.at = 0;
    }

    document() {
        const node = this.value(0);
        this.skip();
        if (this.at < this.text.length)
            throw new JsonFault("the document has ended here", this.at);
        return node;
    }

    skip() {
        BLANK.lastIndex = this.at;
        BLANK.test(this.text);
        this.at = BLANK.lastIndex;
    }

    takes(character) {
        this.skip();
        if (this.text[this.at] !== character)
            return false;
        ++this.at;
        return true;
    }

    wants(character) {
        if (!this.takes(character))
            throw new JsonFault(`"${character}" is missing here`, this.at);
    }

    value(depth) {
        this.skip();
        if (depth > MOST_DEPTH)
            throw new JsonFault("nested too deeply", this.at);
        if (this.text[this.at] === "{")
            return this.collection("object", "}", depth, (member) => this.key(member));
        if (this.text[this.at] === "[")
            return this.collection("array", "]", depth, () => {});
        return this.scalar();
    }

    collection(type, end, depth, readKey) {
        const node = { type, start: this.at++, end: 0, members: [] };
        if (!this.takes(end)) {
            do
                node.members.push(this.member(String(node.members.length), depth, readKey));
            while (this.takes(","));
            this.wants(end);
        }
        node.end = this.at;
        return node;
    }

    member(place, depth, readKey) {
        this.skip();
        const member = { key: place, start: this.at, node: null };
        readKey(member);
        member.node = this.value(depth + 1);
        return member;
    }

    key(member) {
        const key = this.text[this.at] === '"' ? this.scalar() : null;
        if (!key)
            throw new JsonFault("a key in double quotes is missing here", this.at);
        member.key = key.value;
        this.wants(":");
    }

    scalar() {
        SCALAR.lastIndex = this.at;
        const found = SCALAR.exec(this.text);
        if (!found)
            throw new JsonFault("a value is missing here", this.at);
        const start = this.at;
        this.at = SCALAR.lastIndex;
        const value = JSON.parse(found[0]);
        const type = typeof value === "string" || typeof value === "number" ? typeof value : "literal";
        return { type, start, end: this.at, value };
    }
}

/**
 * Throws JsonFault.
 * @param {string} text
 * @returns {Node}
 */
export function parse(text) {
    return new Parser(text).document();
}

/**
 * @param {string} pointer
 * @returns {string[]} its steps
 */
export function stepsOf(pointer) {
    return pointer.split("/").slice(1).map((step) => step.replaceAll("~1", "/").replaceAll("~0", "~"));
}

/**
 * @param {(string|number)[]} steps
 * @returns {string} a JSON pointer
 */
export function pointerOf(steps) {
    return steps.map((step) => "/" + String(step).replaceAll("~", "~0").replaceAll("/", "~1")).join("");
}

/** A key that stands twice counts by its last place, as parsers do. */
function memberOf(node, key) {
    return node.members?.findLast((member) => member.key === key);
}

/**
 * @param {Node} root
 * @param {string} pointer
 * @returns {Node|undefined} what stands there
 */
export function nodeAt(root, pointer) {
    let node = root;
    for (const step of stepsOf(pointer))
        node = node && memberOf(node, step)?.node;
    return node;
}

/**
 * @param {Node|undefined} node
 * @returns {*} the value as JSON.parse() gives it; undefined for no node
 */
export function valueOf(node) {
    if (!node?.members)
        return node?.value;
    if (node.type === "array")
        return node.members.map((member) => valueOf(member.node));
    return Object.fromEntries(node.members.map((member) => [member.key, valueOf(member.node)]));
}

/**
 * @param {Node} root
 * @param {number} offset
 * @returns {string} the pointer of the innermost value that the place belongs to, its key and colon included
 */
export function pointerAt(root, offset) {
    const steps = [];
    let node = root;
    for (;;) {
        const member = node.members?.find((one) => one.start <= offset && offset <= one.node.end);
        if (!member)
            return pointerOf(steps);
        steps.push(member.key);
        node = member.node;
    }
}

/**
 * @param {string} text
 * @param {number} offset
 * @returns {{line: number, ch: number}} both from 0
 */
export function placeOf(text, offset) {
    const before = text.slice(0, offset);
    return { line: before.split("\n").length - 1, ch: offset - (before.lastIndexOf("\n") + 1) };
}
