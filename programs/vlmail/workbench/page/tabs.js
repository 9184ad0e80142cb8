// Tabs, as keyboards and screen readers know them: arrows change them, one of them is in the order of Tab.

export class Tabs {
    /**
     * @param {HTMLElement} list  with the role "tablist"
     * @param {() => void} changed
     */
    constructor(list, changed) {
        this.tabs = [...list.querySelectorAll('[role="tab"]')];
        this.changed = changed;
        list.addEventListener("click", (event) => this.tabs.includes(event.target) && this.choose(event.target));
        list.addEventListener("keydown", (event) => this.#key(event));
        this.choose(this.tabs[0]);
    }

    choose(chosen) {
        for (const tab of this.tabs) {
            tab.setAttribute("aria-selected", String(tab === chosen));
            tab.tabIndex = tab === chosen ? 0 : -1;
            document.getElementById(tab.getAttribute("aria-controls")).hidden = tab !== chosen;
        }
        this.changed();
    }

    #key(event) {
        const last = this.tabs.length - 1;
        const place = this.tabs.indexOf(event.target);
        const next = { ArrowRight: place === last ? 0 : place + 1, ArrowLeft: place === 0 ? last : place - 1, Home: 0, End: last }[event.key];
        if (place < 0 || next === undefined)
            return;
        event.preventDefault();
        this.choose(this.tabs[next]);
        this.tabs[next].focus();
    }
}
