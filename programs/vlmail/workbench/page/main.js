// Puts the page together.
import { Api, isGivenUp } from "./api.js";
import { Canvas } from "./canvas.js";
import { Compare } from "./compare.js";
import { Dialog } from "./dialog.js";
import { byId, el } from "./dom.js";
import { DocumentList } from "./list.js";
import { Editor } from "./editor.js";
import { Edits } from "./edits.js";
import { Evaluation } from "./evaluation.js";
import { Fields } from "./fields.js";
import { Form } from "./form.js";
import { Golden } from "./golden.js";
import { NewField } from "./new_field.js";
import { Pictures } from "./pictures.js";
import { Proposals } from "./proposals.js";
import { Saving } from "./saving.js";
import { Schema } from "./schema.js";
import { Sides } from "./sides.js";
import { Session } from "./state.js";
import { Tabs } from "./tabs.js";
import { Texts } from "./texts.js";
import { ZoneForm } from "./zone_form.js";
import { ZoneTools } from "./zones.js";

const TOKEN_KEY = "workbench-token";
const PANES = ["documents-heading", "picture-heading", "fields-heading", "settings-heading"];

/** The token stands in the address until it is read, and stays with this tab. */
function takeToken() {
    const token = location.hash.slice(1);
    if (token) {
        sessionStorage.setItem(TOKEN_KEY, token);
        history.replaceState(null, "", location.pathname);
    }
    return sessionStorage.getItem(TOKEN_KEY) ?? "";
}

function nextPane() {
    const headings = PANES.map(byId);
    const at = headings.findIndex((heading) => heading.parentElement.contains(document.activeElement));
    headings[(at + 1) % headings.length].focus();
}

class Page {
    constructor(texts) {
        this.texts = texts;
        this.session = new Session();
        this.api = new Api(takeToken());
        this.schema = null;
        this.failed = (failure) => isGivenUp(failure) || this.session.say(failure.message || texts.of("noProgram"), "bad");
        this.#build();
        this.#listen();
    }

    #build() {
        const { session, api, texts, failed } = this;
        const schema = () => this.schema;
        const edits = new Edits(session, api, texts, failed);
        const newField = new NewField(session, edits, texts);
        this.evaluation = new Evaluation(session, api, failed);
        this.list = new DocumentList(session, texts);
        const pictures = new Pictures(session, api);
        const canvas = new Canvas(session, pictures, texts);
        this.sides = new Sides(session, pictures, texts);
        const tools = new ZoneTools({ session, canvas, api, edits, texts,
            drawn: (box, lines) => newField.inNewZone(box, lines) });
        const addField = (zone) => newField.inZone(zone);
        this.zoneForm = new ZoneForm(session, tools, edits, texts, addField);
        this.editor = new Editor({ session, texts, schema });
        this.fields = new Fields({ session, edits, texts, addField });
        this.form = new Form({ session, edits, texts, schema });
        this.compare = new Compare(session, texts);
        this.tabs = new Tabs(byId("tabs"), () => {
            this.form.draw();
            this.compare.draw();
        });
        this.saving = new Saving(session, api, texts, failed);
        this.proposals = new Proposals(session, api, texts, failed);
        this.golden = new Golden(session, api, texts, failed);
        this.acts = { undo: () => session.undo(), redo: () => session.redo(), save: () => this.saving.ask(),
            propose: () => this.proposals.ask(), golden: () => this.golden.keep(), help: () => this.#help() };
    }

    #listen() {
        for (const [id, act] of Object.entries(this.acts))
            byId(id).addEventListener("click", act);
        document.addEventListener("keydown", (event) => this.#key(event));
        this.session.on("message", (message) => this.#say(message));
        this.session.on("text saved", () => this.#showState());
        this.session.on("evaluation", () => this.#sayBroken());
        document.addEventListener("visibilitychange", () => document.hidden || this.#refresh());
        window.addEventListener("beforeunload", (event) => this.session.isChanged && event.preventDefault());
    }

    #key(event) {
        const control = event.ctrlKey || event.metaKey;
        const isTyping = /^(INPUT|TEXTAREA)$/.test(event.target.tagName);
        const keys = { s: control && "save", F1: "help", y: control && !isTyping && "redo",
            z: control && !isTyping && "undo", Z: control && !isTyping && "redo" };
        if (document.querySelector("dialog[open]"))
            return;
        if (event.key === "F6") {
            event.preventDefault();
            nextPane();
        } else if (keys[event.key]) {
            event.preventDefault();
            this.acts[keys[event.key]]();
        }
    }

    #help() {
        const keys = ["F6", "Ctrl+S", "Ctrl+Z", "Ctrl+Y", "Ctrl+Space", "arrows", "shiftArrows", "ctrlArrows", "N", "F", "Delete", "Esc"];
        const rows = keys.flatMap((key) => [el("dt", {}, this.texts.of("key_" + key)), el("dd", {}, this.texts.of("does_" + key))]);
        new Dialog(this.texts, "helpTitle").show([el("dl", { class: "keys" }, ...rows)], "");
    }

    /** What is bad interrupts a screen reader; what was said before it is over. */
    #say({ text, kind }) {
        byId("message").textContent = kind === "fine" ? text : "";
        byId("alert").textContent = kind === "bad" ? "\u2717 " + text : "";
    }

    #sayBroken() {
        const { broken } = this.session;
        const was = byId("alert").dataset.broken;
        if (broken) {
            byId("alert").dataset.broken = "yes";
            this.#say({ text: this.texts.of("broken", { number: broken.from.line + 1, says: broken.line }), kind: "bad" });
        } else if (was) {
            delete byId("alert").dataset.broken;
            this.#say({ text: "", kind: "fine" });
        }
    }

    #showState() {
        const { settings, isChanged, history } = this.session;
        const short = settings.kind === "file" ? settings.name.split("/").at(-1) : settings.name;
        byId("settings-name").title = settings.name;
        byId("settings-name").replaceChildren(el("bdi", {}, short || this.texts.of("noSettings")),
            isChanged ? " \u2022 " + this.texts.of("unsaved") : "");
        for (const [id, can, says] of [["undo", history.canUndo, history.undoes], ["redo", history.canRedo, history.redoes]]) {
            byId(id).setAttribute("aria-disabled", String(!can));
            byId(id).title = says;
        }
        document.title = (isChanged ? "\u2022 " : "") + this.texts.of("title");
    }

    /** Files come and go while somebody looks elsewhere. */
    async #refresh() {
        const { session } = this;
        const state = await this.api.call("state").catch((failure) => void this.failed(failure));
        if (!state)
            return;
        session.relist(state.documents);
        if (state.settings.version !== session.settings.version)
            session.say(this.texts.of("changedOutside", { name: state.settings.name }), "bad");
    }

    async start() {
        try {
            const [state, schema] = await Promise.all([this.api.call("state"), this.api.call("schema")]);
            this.schema = new Schema(schema);
            this.session.begin(state);
            if (state.problems.length > 0)
                this.session.say(state.problems.join(" \u00b7 "), "bad");
            if (state.documents.length > 0)
                this.session.open(state.documents[0].name);
        } catch (failure) {
            this.failed(failure);
        }
    }
}

const texts = new Texts(navigator.language);
texts.fill(document);
new Page(texts).start();
