// Where a zone comes to lie: on millimetres, or around text that is near.

/**
 * @typedef {{left: number, top: number, right: number, bottom: number}} Box  in 1/100 mm
 */

/** What a zone keeps around the text that it snaps to. */
const MARGIN = 100;
const SMALLEST = 300;

/**
 * @param {Box} box
 * @param {{x: number, y: number}} by
 * @returns {Box}
 */
export function moved(box, by) {
    return { left: box.left + by.x, top: box.top + by.y, right: box.right + by.x, bottom: box.bottom + by.y };
}

/**
 * @param {Box} box
 * @param {string} edges  some of the letters l, t, r, b
 * @param {{x: number, y: number}} by
 * @returns {Box} with these edges moved, never turned over
 */
export function resized(box, edges, by) {
    const has = (edge) => edges.includes(edge);
    return {
        left: has("l") ? Math.min(box.left + by.x, box.right - SMALLEST) : box.left,
        top: has("t") ? Math.min(box.top + by.y, box.bottom - SMALLEST) : box.top,
        right: has("r") ? Math.max(box.right + by.x, box.left + SMALLEST) : box.right,
        bottom: has("b") ? Math.max(box.bottom + by.y, box.top + SMALLEST) : box.bottom,
    };
}

/**
 * @param {{x: number, y: number}} one
 * @param {{x: number, y: number}} other
 * @returns {Box} between two corners
 */
export function between(one, other) {
    return { left: Math.min(one.x, other.x), top: Math.min(one.y, other.y), right: Math.max(one.x, other.x),
        bottom: Math.max(one.y, other.y) };
}

function nearest(value, targets, reach) {
    let best = value;
    let distance = reach;
    for (const target of targets) {
        if (Math.abs(target - value) < distance) {
            best = target;
            distance = Math.abs(target - value);
        }
    }
    return best;
}

/** The lines that an edge of each kind may snap to. */
function linesOf(blocks) {
    return {
        left: blocks.map((block) => block.left - MARGIN), right: blocks.map((block) => block.right + MARGIN),
        top: blocks.map((block) => block.top - MARGIN), bottom: blocks.map((block) => block.bottom + MARGIN),
    };
}

/**
 * @param {Box} box
 * @param {string} edges  those that may move: l, t, r, b; "m" moves the whole and keeps its size
 * @param {Box[]} blocks  of text
 * @param {number} reach  in 1/100 mm
 * @returns {Box}
 */
export function snapped(box, edges, blocks, reach) {
    const lines = linesOf(blocks);
    if (edges === "m") {
        const dx = nearest(box.left, lines.left, reach) - box.left;
        const dy = nearest(box.top, lines.top, reach) - box.top;
        return moved(box, { x: dx, y: dy });
    }
    const edge = (name) => edges.includes(name[0]) ? nearest(box[name], lines[name], reach) : box[name];
    return { left: edge("left"), top: edge("top"), right: edge("right"), bottom: edge("bottom") };
}

function areTouching(one, other) {
    return one.left < other.right && other.left < one.right && one.top < other.bottom && other.top < one.bottom;
}

/**
 * @param {Box} box
 * @param {Box[]} blocks
 * @returns {Box} just around the text that the box touches; the box itself where there is none
 */
export function fitted(box, blocks) {
    const within = blocks.filter((block) => areTouching(block, box));
    if (within.length === 0)
        return box;
    return { left: Math.min(...within.map((block) => block.left)) - MARGIN,
        top: Math.min(...within.map((block) => block.top)) - MARGIN,
        right: Math.max(...within.map((block) => block.right)) + MARGIN,
        bottom: Math.max(...within.map((block) => block.bottom)) + MARGIN };
}

/**
 * @param {Box} box
 * @returns {Box} on the page's side of its corner, in whole numbers
 */
export function onPage(box) {
    const into = { x: Math.max(0, -box.left), y: Math.max(0, -box.top) };
    const { left, top, right, bottom } = moved(box, into);
    return { left: Math.round(left), top: Math.round(top), right: Math.round(right), bottom: Math.round(bottom) };
}

/**
 * @param {Box} box
 * @returns {boolean} whether it is large enough to be meant
 */
export function isMeant(box) {
    return box.right - box.left >= SMALLEST && box.bottom - box.top >= SMALLEST;
}
