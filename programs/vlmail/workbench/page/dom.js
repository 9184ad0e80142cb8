// Elements of the page. Texts go in as text and nothing else, whatever they hold.

const SVG = "http://www.w3.org/2000/svg";

function setAttribute(element, name, value) {
    if (value === false || value === null || value === undefined)
        return;
    if (name.startsWith("on"))
        element.addEventListener(name.slice(2), value);
    else
        element.setAttribute(name, value === true ? "" : value);
}

function filled(element, attributes, children) {
    element.append(...children.flat().filter((child) => child !== null && child !== undefined && child !== false));
    for (const [name, value] of Object.entries(attributes))
        setAttribute(element, name, value);
    return element;
}

/**
 * @param {string} tag
 * @param {Object<string, *>} [attributes]  "onclick" and its like are listeners; false and null leave one out
 * @param {...(Node|string|null|false)} children
 * @returns {HTMLElement}
 */
export function el(tag, attributes = {}, ...children) {
    return filled(document.createElement(tag), attributes, children);
}

/** The same in SVG. */
export function svg(tag, attributes = {}, ...children) {
    return filled(document.createElementNS(SVG, tag), attributes, children);
}

/**
 * A text from outside, kept together in its own direction.
 * @param {string} text
 */
export function isolated(text) {
    return el("bdi", {}, text);
}

/**
 * @param {string} id
 * @returns {HTMLElement} of the page as it was loaded
 */
export function byId(id) {
    return document.getElementById(id);
}

function retyped(old, fresh) {
    if (old.tagName !== "INPUT" && old.tagName !== "TEXTAREA")
        return;
    fresh.value = old.value;
    if (old.selectionStart !== null)
        fresh.setSelectionRange(old.selectionStart, old.selectionEnd);
}

/** The same children in the end; those that are as they are to be are left alone, with whatever is done to them just now,
    though others come and go in front of them. */
function replaceDifferent(parent, children) {
    const old = [...parent.childNodes];
    const shown = children.map((child) => {
        const same = old.findIndex((one) => one.isEqualNode(child));
        return same < 0 ? child : old.splice(same, 1)[0];
    });
    old.forEach((one) => one.remove());
    shown.forEach((child, place) => {
        if (parent.childNodes[place] !== child)
            parent.insertBefore(child, parent.childNodes[place] ?? null);
    });
}

/**
 * Shows other children without losing the keyboard's place: focus returns to the element with the same
 * "data-key", and what is being typed there stays. Children that look the same are kept, so that their listeners may
 * be older than what is shown: they are to look up what they need.
 * @param {Element} parent
 * @param {...Node} children
 */
export function show(parent, ...children) {
    const active = document.activeElement;
    const key = parent.contains(active) ? active.dataset.key : undefined;
    replaceDifferent(parent, children.filter(Boolean));
    const fresh = key && document.activeElement !== active && parent.querySelector(`[data-key="${CSS.escape(key)}"]`);
    if (!fresh)
        return;
    fresh.focus({ preventScroll: true });
    retyped(active, fresh);
}
