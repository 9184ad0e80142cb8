// Pages that are printed otherwise than they were read: what lies where on both.

/**
 * @typedef {import("./snapping.js").Box} Box
 * @typedef {{width: number, height: number}} Size  in 1/100 mm
 */

/**
 * @param {Box} box  on a page of that size
 * @param {Size} size
 * @param {number} quarters  by which the page is turned clockwise, from 0 to 3
 * @returns {Box} where it lies then
 */
export function turned(box, { width, height }, quarters) {
    const { left, top, right, bottom } = box;
    switch (quarters) {
    case 1:
        return { left: height - bottom, top: left, right: height - top, bottom: right };
    case 2:
        return { left: width - right, top: height - bottom, right: width - left, bottom: height - top };
    case 3:
        return { left: top, top: width - right, right: bottom, bottom: width - left };
    default:
        return { left, top, right, bottom };
    }
}

/**
 * @param {Size} size
 * @param {number} quarters
 * @returns {Size} of the page when it is turned
 */
export function turnedSize({ width, height }, quarters) {
    return quarters % 2 === 0 ? { width, height } : { width: height, height: width };
}

/**
 * @param {Box} box  on a page that was turned
 * @param {Size} size  of the page as it is turned
 * @param {number} quarters  by which it was turned
 * @returns {Box} where it lies on the page as it was
 */
export function turnedBack(box, size, quarters) {
    return turned(box, size, (4 - quarters) % 4);
}
