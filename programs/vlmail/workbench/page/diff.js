// What differs between two texts, line by line.

/**
 * @typedef {object} DiffLine
 * @property {"same"|"gone"|"new"} kind
 * @property {string} text
 * @property {number} [before]  its number from 1 in the first text
 * @property {number} [after]   likewise in the second
 */

/** Tables of more cells than this are not made: what lies between the ends counts as changed as a whole. */
const MOST_CELLS = 4_000_000;

function commonStart(before, after) {
    let count = 0;
    while (count < before.length && count < after.length && before[count] === after[count])
        ++count;
    return count;
}

/** Lengths of the longest common sequences of what follows each pair of places. */
function lengthsOf(before, after) {
    const width = after.length + 1;
    const table = new Uint32Array((before.length + 1) * width);
    for (let i = before.length - 1; i >= 0; --i)
        for (let k = after.length - 1; k >= 0; --k)
            table[i * width + k] = before[i] === after[k] ? table[(i + 1) * width + k + 1] + 1
                : Math.max(table[(i + 1) * width + k], table[i * width + k + 1]);
    return (i, k) => table[i * width + k];
}

function* kindsOf(before, after) {
    const isLarge = (before.length + 1) * (after.length + 1) > MOST_CELLS;
    const lengths = isLarge ? () => 0 : lengthsOf(before, after);
    let i = 0, k = 0;
    while (i < before.length || k < after.length) {
        if (!isLarge && i < before.length && k < after.length && before[i] === after[k]) {
            ++i, ++k;
            yield "same";
        } else if (i < before.length && (k === after.length || lengths(i + 1, k) >= lengths(i, k + 1))) {
            ++i;
            yield "gone";
        } else {
            ++k;
            yield "new";
        }
    }
}

function* allKinds(before, after) {
    const start = commonStart(before, after);
    const [restBefore, restAfter] = [before.slice(start), after.slice(start)];
    const end = commonStart([...restBefore].reverse(), [...restAfter].reverse());
    yield* Array(start).fill("same");
    yield* kindsOf(restBefore.slice(0, restBefore.length - end), restAfter.slice(0, restAfter.length - end));
    yield* Array(end).fill("same");
}

/**
 * @param {string} before
 * @param {string} after
 * @returns {DiffLine[]} all lines
 */
export function diff(before, after) {
    const [linesBefore, linesAfter] = [before.split("\n"), after.split("\n")];
    const lines = [];
    let i = 0, k = 0;
    for (const kind of allKinds(linesBefore, linesAfter)) {
        const text = kind === "new" ? linesAfter[k] : linesBefore[i];
        lines.push({ kind, text, before: kind === "new" ? undefined : ++i, after: kind === "gone" ? undefined : ++k });
    }
    return lines;
}

/**
 * @param {DiffLine[]} lines
 * @param {number} context  how many same lines stay around each change
 * @returns {DiffLine[][]} the parts that remain
 */
export function hunks(lines, context = 3) {
    const parts = [];
    let until = -1;
    lines.forEach((line, place) => {
        if (line.kind === "same")
            return;
        const from = Math.max(place - context, until);
        if (parts.length === 0 || from > until)
            parts.push([]);
        parts.at(-1).push(...lines.slice(from, Math.max(place + 1, until)).filter((one) => !parts.at(-1).includes(one)));
        until = place + 1;
    });
    return withEnds(parts, lines, context);
}

function withEnds(parts, lines, context) {
    return parts.map((part) => {
        const last = lines.indexOf(part.at(-1));
        return part.concat(lines.slice(last + 1, last + 1 + context).filter((line) => line.kind === "same"));
    });
}
