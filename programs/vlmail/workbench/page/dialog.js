// A question in front of the page.
import { el } from "./dom.js";

let count = 0;

export class Dialog {
    /**
     * @param {import("./texts.js").Texts} texts
     * @param {string} title  the key of its text
     */
    constructor(texts, title) {
        const id = "dialog" + ++count;
        this.texts = texts;
        this.heading = el("h2", { id }, texts.of(title));
        this.body = el("div", { class: "dialog-body" });
        this.buttons = el("div", { class: "buttons" });
        this.form = el("form", { method: "dialog" }, this.heading, this.body, this.buttons);
        this.element = el("dialog", { "aria-labelledby": id }, this.form);
        this.element.addEventListener("close", () => this.element.remove());
    }

    /**
     * @param {(Node|null|false)[]} children
     * @param {string} accept  the key of the button's text; empty: there is only one to close
     * @param {() => void} accepted
     */
    show(children, accept, accepted = () => {}) {
        this.body.append(...children.filter(Boolean));
        this.form.addEventListener("submit", (event) => {
            if (event.submitter === null || event.submitter.value === "accept")
                accepted();
        });
        if (accept)
            this.button(accept, { type: "submit", value: "accept", class: "main",
                autofocus: this.body.querySelector("input") === null });
        this.button(accept ? "cancel" : "close", { type: "button", onclick: () => this.element.close() });
        document.body.append(this.element);
        this.element.showModal();
    }

    /** One more button; it closes the dialog when its type is "submit". */
    button(text, attributes) {
        const button = el("button", { "data-text": text, ...attributes }, this.texts.of(text));
        this.buttons.append(button);
        return button;
    }

    close() {
        this.element.close();
    }
}
