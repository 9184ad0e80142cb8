// All that goes out with a letter, small and in its order, as reports have it below the letter.
import { byId, el, isolated } from "./dom.js";
import { isGivenUp } from "./api.js";

const DOTS = 36;

export class Sides {
    #abort = new AbortController();
    /** What is drawn. */
    #key = "";

    /**
     * @param {import("./state.js").Session} session
     * @param {import("./pictures.js").Pictures} pictures
     * @param {import("./texts.js").Texts} texts
     */
    constructor(session, pictures, texts) {
        Object.assign(this, { session, pictures, texts, list: byId("sides") });
        session.on("evaluation page document", () => this.#draw());
    }

    get #sides() {
        return this.session.isPrinted ? this.session.letter?.sides ?? [] : [];
    }

    #draw() {
        const { session } = this;
        const sides = this.#sides;
        const key = JSON.stringify([session.document, session.version, session.letter?.pages[0], session.evaluation?.printed, sides]);
        this.list.hidden = sides.length === 0;
        // Behind a change it is not known yet what it makes of them.
        if (key !== this.#key && (sides.length === 0 || session.evaluation.printed)) {
            this.#key = key;
            this.#fill(sides);
        }
        this.#choose();
    }

    #fill(sides) {
        this.#abort.abort();
        this.#abort = new AbortController();
        this.list.replaceChildren(...sides.map((side) => this.#item(side)));
        sides.forEach((side, place) => side.kind !== "blank" && this.#show(side, place, this.#abort.signal));
    }

    #item(side) {
        const button = el("button", { type: "button", class: "side", onclick: () => this.session.turnToSide(side) });
        button.ariaLabel = this.texts.side(side);
        button.style.setProperty("--w", Math.max(side.width, 1));
        button.style.setProperty("--h", Math.max(side.height, 1));
        return el("li", {}, button, el("span", { "aria-hidden": "true" }, isolated(this.texts.side(side))));
    }

    async #show(side, place, signal) {
        const page = this.session.letter.pages[0];
        try {
            const { url } = await this.pictures.get({ page, side, isPrinted: true, dots: DOTS }, signal);
            if (!signal.aborted)
                this.list.children[place].querySelector("button").replaceChildren(el("img", { alt: "", src: url, draggable: "false" }));
        } catch (failure) {
            if (!isGivenUp(failure))
                this.list.children[place]?.querySelector("button").replaceChildren("\u2717");
        }
    }

    #choose() {
        const { side, page } = this.session;
        const isShown = (one) => side ? JSON.stringify(one) === JSON.stringify(side) : one.kind === "page" && one.page === page;
        this.#sides.forEach((one, place) => {
            const button = this.list.children[place]?.querySelector("button");
            if (button)
                button.ariaCurrent = isShown(one) ? "true" : null;
        });
    }
}
