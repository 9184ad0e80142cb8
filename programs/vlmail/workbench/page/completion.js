// What may be typed at a place of the settings.

const OPENING = { "{": "}", "[": "]" };

/**
 * Where a place of a text lies that may be no JSON yet.
 * @param {string} text  up to the place
 * @returns {{steps: string[], isKey: boolean, token: string, present: string[]}} the keys and places that lead there;
 *     whether a key stands there; what of it is typed already; the keys in front of it in the same object
 */
export function contextOf(text) {
    const open = [];
    const tokens = text.matchAll(/"(?:[^"\\\n]|\\.)*"?|[{}[\],:]|[^\s{}[\],:"]+/g);
    let last = { token: "", index: 0 };
    for (const match of tokens) {
        last = { token: match[0], index: match.index };
        step(open, match[0]);
    }
    const isTyping = last.index + last.token.length === text.length && !/^[{}[\],:]?$/.test(last.token) &&
        !/^".*"$/s.test(last.token);
    const top = open.at(-1);
    return { steps: stepsTo(open), isKey: top?.type === "{" && !top.hasKey, token: isTyping ? last.token : "",
        present: top?.keys ?? [] };
}

function step(open, token) {
    const top = open.at(-1);
    if (OPENING[token])
        open.push({ type: token, key: "", place: 0, hasKey: false, keys: [] });
    else if (token === "}" || token === "]")
        open.pop();
    else if (token === "," && top)
        Object.assign(top, { place: top.place + 1, hasKey: false });
    else if (token === ":" && top)
        top.hasKey = true;
    else if (top?.type === "{" && !top.hasKey && /^".*"$/s.test(token))
        takeKey(top, token);
}

function takeKey(top, token) {
    top.key = token.slice(1, -1);
    top.keys.push(top.key);
}

function stepsTo(open) {
    return open.slice(0, -1).map((one) => one.type === "[" ? String(one.place) : one.key)
        .concat(open.length > 0 && open.at(-1).type === "{" && open.at(-1).hasKey ? [open.at(-1).key] : [])
        .concat(open.length > 0 && open.at(-1).type === "[" ? [String(open.at(-1).place)] : []);
}

function emptyValueOf(schema) {
    const byType = { string: '""', object: "{}", array: "[]", boolean: "true", integer: "0", number: "0" };
    return byType[schema.type] ?? "";
}

function wantsQuoted(key) {
    return JSON.stringify(key);
}

/**
 * @param {import("./schema.js").Schema} schema
 * @param {object|undefined} document  the settings as they could be read last
 * @param {string} before  the text up to the place
 * @returns {{token: string, choices: {text: string, shown: string, says: string}[]}}
 */
export function completions(schema, document, before) {
    const { steps, isKey, token, present } = contextOf(before);
    const pointer = steps.map((one) => "/" + one.replaceAll("~", "~0").replaceAll("/", "~1")).join("");
    const here = schema.at(document, pointer);
    const wanted = token.replace(/^"/, "").toLowerCase();
    const choices = isKey ? keys(schema, here, present) : values(here);
    return { token, choices: choices.filter(({ shown }) => shown.toLowerCase().startsWith(wanted)) };
}

function keys(schema, here, present) {
    return schema.keysOf(here).filter(([key]) => !present.includes(key)).map(([key, value]) => ({
        text: wantsQuoted(key) + ": " + emptyValueOf(value), shown: key, says: value.description ?? "" }));
}

function values(here) {
    const known = here?.enum ?? (here?.type === "boolean" ? [true, false] : []);
    return known.map((value) => ({ text: JSON.stringify(value), shown: String(value), says: here.description ?? "" }));
}
