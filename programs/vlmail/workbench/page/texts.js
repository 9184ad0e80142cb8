// All texts of the page, in every language that it speaks. A text is a string, in which {name} stands for what is given,
// or a function of what is given.

function letters(count, one, many) {
    return `${count} ${count === 1 ? one : many}`;
}

const EN = {
    title: "Workbench", tools: "Tools", undo: "Undo", redo: "Redo", propose: "New preset from this document\u2026",
    golden: "Keep as right", save: "Save\u2026", help: "Keys", close: "Close", cancel: "Cancel", add: "Add", remove: "Remove",
    documents: "Documents", filter: "Name contains", show: "Show", notRead: "not read yet",
    kind_all: "all", kind_trouble: "with trouble", kind_ready: "ready", kind_attachment: "attachments", kind_better: "better",
    kind_worse: "worse", kind_other: "changed", kind_golden: "not as kept",
    counts: ({ shown, all, troubled, waiting }) => `${shown} of ${all} shown, ${troubled} with trouble` +
        (waiting > 0 ? `, ${waiting} not read yet` : ""),
    verdict_ready: ({ letters: count }) => letters(count, "letter, ready", "letters, ready"),
    verdict_trouble: ({ letters: count, ready }) => letters(count, "letter", "letters") + `, ${count - ready} cannot go out`,
    verdict_attachment: "attachment", verdict_failed: "cannot be read",
    page: "Page", paging: "Pages and zones", pageBack: "Previous page", pageOn: "Next page", pageNumber: "Page", ofPages: "of {count}",
    view: "Shown", view_printed: "as printed", view_read: "as read", sides: "What goes out with the letter, side by side",
    side_page: "page {page}", side_blank: "blank side", side_attachment: "page {page} of \u201c{id}\u201d", side_cover: "cover page",
    draw: "Draw a zone", stage: "The page with its zones and what was found in them", pictureOf: "page {page} of {document}",
    zoneKeys: "Arrows move the zone, with Shift they move its right and lower edges, with Ctrl by tenths of a millimetre; F fits it to its text, Delete removes it, Enter shows it as numbers",
    draft: "New zone", draftKeys: "Draw the zone with the mouse, or move it with the arrows, resize it with Shift and the arrows, and press Enter; Esc gives it up",
    zoneForm: "Zone in millimetres", zoneName: "Zone", left: "Left", top: "Top", right: "Right", bottom: "Bottom", fit: "Fit to its text",
    removeZone: "Remove the zone", zoneNumber: "Zone {number}", newZone: "A new zone", newField: "A new field", fieldName: "Name of the field",
    foundBy: "Its value is", obligatory: "Every letter must have it", addField: "Add a field\u2026",
    find_behind: "what follows \u201c{label}\u201d", find_line: "the first line", find_whole: "all of the zone\u2019s text", find_number: "the first number",
    find_amount: "the first amount", find_date: "the first date", find_email: "the first e-mail address", finds: "{what}: {value}",
    fields: "Fields", reading: "The document is being read.", isAttachment: "An attachment: it holds no letters.",
    noPreset: "No preset fits the name of this document. \u201cNew preset from this document\u201d makes one.",
    readBy: "Read by the preset for", sentBy: "sent by the pack preset", cannotGoOut: "cannot go out", ready: "ready",
    letterOf: ({ number, count, pages, first }) => `Letter ${number} of ${count}, ` +
        (pages === 0 ? "texts of its zones" : pages === 1 ? `page ${first}` : `${pages} pages from page ${first}`),
    letterBack: "Previous letter", letterOn: "Next letter", findings: "What is wrong", addressWindow: "address window", zone: "zone",
    state_found: "found", state_default: "default", state_unused: "not used", state_not_found: "not found", state_invalid: "invalid",
    state_missing: "missing", pattern: "Pattern", nearMisses: "What would have to be different for {field}", seeIt: "Show it",
    repair: "Change it",
    settings: "Settings", settingsViews: "Views of the settings", tabJson: "JSON", tabForm: "Form", tabEffect: "Effect",
    tabEffectCounts: ({ worse, better, golden }) => "Effect: " + [`${better} better`, `${worse} worse`,
        golden > 0 && `${golden} not as kept`].filter(Boolean).join(", "),
    settingsAsJson: "Settings as JSON; Ctrl+Space completes", lint: "Findings in the settings",
    faults: ({ count }) => count === 0 ? "\u2713 Nothing to complain about" : letters(count, "finding", "findings"), line: "Line {number}",
    extractPreset: "How the document is read", packPreset: "How its letters are sent", addTo: "Add to {key}",
    noOwnPreset: "The settings have no preset of their own for this document. \u201cNew preset from this document\u201d makes one.",
    waiting: ({ waiting }) => letters(waiting, "document is still to be read.", "documents are still to be read."),
    nothingChanged: "Nothing has changed.",
    comparedAll: ({ count }) => letters(count, "document compared.", "documents compared."), walkBack: "Previous document",
    walkOn: "Next document", compareFromHere: "Compare with the settings as they are now",
    effect_better: "Better: {count}", effect_worse: "Worse: {count}", effect_other: "Changed: {count}",
    effect_golden: "Not as it was kept: {count}", andMore: "and {count} more",
    saveTitle: "Save the settings", saveInto: "What will change in {name}:", saveNow: "Save", changes: "Changes",
    noDifference: "No difference.", nothingToSave: "There is nothing to save.", saved: "Saved in {name}.",
    nowhereToSave: "The workbench was started without settings; start it with --settings or --node to save.",
    conflictTitle: "The settings have changed meanwhile", conflict: "Somebody else has changed {name} since it was read.",
    theirChanges: "Their changes", yourChanges: "Your changes", betweenBoth: "From theirs to yours", overwrite: "Save mine over it",
    takeTheirs: "Take theirs",
    proposalTitle: "A new preset from this document", proposalIntro: "Tick what is right. All of it can be changed later.",
    madeFrom: "Made from", matchSays: "This expression has to fit the whole name of each such document: .* stands for anything, \\d+ for a number.",
    documentsNamed: "For documents named", readFromIt: "To be read from it", addressZone: "Address of the recipient",
    nothingProposed: "Nothing was recognised.", fieldNameFor: "Name of the field for {value}", adopt: "Add the preset",
    adopted: "The preset was added.",
    goldenTitle: "Kept as right", goldenExists: "Something else was kept for {document} before.", replace: "Replace it",
    goldenKept: "Kept in {file}.",
    changedMeanwhile: "The settings have changed meanwhile: look at the new result and try again.",
    changedOutside: "Somebody else has changed {name} meanwhile; saving shows both.",
    noProgram: "The program has ended; start vlmail workbench again.", noSettings: "no settings", unsaved: "not saved",
    broken: "Line {number}: {says}. The page shows the settings before that.",
    didType: "typing", didPlace: "place of zone {zone}", didRename: "name of zone {name}", didRemove: "removal of {name}",
    didAdd: "new {name}", didPattern: "pattern of {field}", didRepair: "{what}", didSet: "{key}", didAdopt: "new preset",
    didTakeTheirs: "settings of somebody else",
    helpTitle: "Keys", "key_F6": "F6", "does_F6": "to the next part of the page", "key_Ctrl+S": "Ctrl+S", "does_Ctrl+S": "saves",
    "key_Ctrl+Z": "Ctrl+Z", "does_Ctrl+Z": "takes the last change back", "key_Ctrl+Y": "Ctrl+Y", "does_Ctrl+Y": "does it again",
    "key_Ctrl+Space": "Ctrl+Space", "does_Ctrl+Space": "in the JSON: completes a key", key_arrows: "Arrows",
    does_arrows: "on a zone: move it by a millimetre", key_shiftArrows: "Shift+arrows", does_shiftArrows: "move its right and lower edges",
    key_ctrlArrows: "Ctrl+arrows", does_ctrlArrows: "move by a tenth of a millimetre", key_N: "N",
    does_N: "on the page: a new zone, which Enter takes", key_F: "F", does_F: "on a zone: fits it to its text", key_Delete: "Delete",
    does_Delete: "on a zone: removes it", key_Esc: "Esc", does_Esc: "gives up what has begun",
};

const DE = {
    title: "Werkbank", tools: "Werkzeuge", undo: "Rückgängig", redo: "Wiederholen", propose: "Neues Preset aus diesem Dokument\u2026",
    golden: "Als richtig merken", save: "Sichern\u2026", help: "Tasten", close: "Schließen", cancel: "Abbrechen", add: "Hinzufügen",
    remove: "Entfernen",
    documents: "Dokumente", filter: "Name enthält", show: "Zeigen", notRead: "noch nicht gelesen",
    kind_all: "alle", kind_trouble: "mit Fehlern", kind_ready: "bereit", kind_attachment: "Anlagen", kind_better: "besser",
    kind_worse: "schlechter", kind_other: "geändert", kind_golden: "anders als gemerkt",
    counts: ({ shown, all, troubled, waiting }) => `${shown} von ${all} gezeigt, ${troubled} mit Fehlern` +
        (waiting > 0 ? `, ${waiting} noch nicht gelesen` : ""),
    verdict_ready: ({ letters: count }) => letters(count, "Brief, bereit", "Briefe, bereit"),
    verdict_trouble: ({ letters: count, ready }) => letters(count, "Brief", "Briefe") + `, ${count - ready} nicht versandfähig`,
    verdict_attachment: "Anlage", verdict_failed: "nicht lesbar",
    page: "Seite", paging: "Seiten und Zonen", pageBack: "Vorige Seite", pageOn: "Nächste Seite", pageNumber: "Seite", ofPages: "von {count}",
    view: "Gezeigt", view_printed: "wie gedruckt", view_read: "wie gelesen", sides: "Was mit dem Brief hinausgeht, Seite für Seite",
    side_page: "Seite {page}", side_blank: "leere Seite", side_attachment: "Seite {page} von \u201e{id}\u201c", side_cover: "Deckblatt",
    draw: "Zone zeichnen", stage: "Die Seite mit ihren Zonen und dem, was darin gefunden wurde", pictureOf: "Seite {page} von {document}",
    zoneKeys: "Pfeile verschieben die Zone, mit Umschalt den rechten und unteren Rand, mit Strg um Zehntelmillimeter; F passt sie ihrem Text an, Entf entfernt sie, Eingabe zeigt sie in Zahlen",
    draft: "Neue Zone", draftKeys: "Zone mit der Maus zeichnen, oder mit den Pfeilen verschieben, mit Umschalt und Pfeilen vergrößern und Eingabe drücken; Esc bricht ab",
    zoneForm: "Zone in Millimetern", zoneName: "Zone", left: "Links", top: "Oben", right: "Rechts", bottom: "Unten", fit: "An den Text anpassen",
    removeZone: "Zone entfernen", zoneNumber: "Zone {number}", newZone: "Eine neue Zone", newField: "Ein neues Feld", fieldName: "Name des Feldes",
    foundBy: "Sein Wert ist", obligatory: "Jeder Brief muss es haben", addField: "Feld hinzufügen\u2026",
    find_behind: "was auf \u201e{label}\u201c folgt", find_line: "die erste Zeile", find_whole: "der ganze Text der Zone", find_number: "die erste Zahl",
    find_amount: "der erste Betrag", find_date: "das erste Datum", find_email: "die erste E-Mail-Adresse", finds: "{what}: {value}",
    fields: "Felder", reading: "Das Dokument wird gelesen.", isAttachment: "Eine Anlage: sie enthält keine Briefe.",
    noPreset: "Kein Preset passt auf den Namen dieses Dokuments. \u201eNeues Preset aus diesem Dokument\u201c legt eines an.",
    readBy: "Gelesen mit dem Preset für", sentBy: "versandt mit dem Versand-Preset", cannotGoOut: "nicht versandfähig", ready: "bereit",
    letterOf: ({ number, count, pages, first }) => `Brief ${number} von ${count}, ` +
        (pages === 0 ? "Texte seiner Zonen" : pages === 1 ? `Seite ${first}` : `${pages} Seiten ab Seite ${first}`),
    letterBack: "Voriger Brief", letterOn: "Nächster Brief", findings: "Was nicht stimmt", addressWindow: "Adressfenster", zone: "Zone",
    state_found: "gefunden", state_default: "Vorgabe", state_unused: "nicht verwendet", state_not_found: "nicht gefunden",
    state_invalid: "ungültig", state_missing: "fehlt", pattern: "Muster", nearMisses: "Was für {field} anders sein müsste",
    seeIt: "Zeigen", repair: "Ändern",
    settings: "Einstellungen", settingsViews: "Ansichten der Einstellungen", tabJson: "JSON", tabForm: "Formular", tabEffect: "Wirkung",
    tabEffectCounts: ({ worse, better, golden }) => "Wirkung: " + [`${better} besser`, `${worse} schlechter`,
        golden > 0 && `${golden} anders als gemerkt`].filter(Boolean).join(", "),
    settingsAsJson: "Einstellungen als JSON; Strg+Leertaste ergänzt", lint: "Befunde in den Einstellungen",
    faults: ({ count }) => count === 0 ? "\u2713 Nichts zu beanstanden" : letters(count, "Befund", "Befunde"), line: "Zeile {number}",
    extractPreset: "Wie das Dokument gelesen wird", packPreset: "Wie seine Briefe versandt werden", addTo: "Zu {key} hinzufügen",
    noOwnPreset: "Die Einstellungen haben kein eigenes Preset für dieses Dokument. \u201eNeues Preset aus diesem Dokument\u201c legt eines an.",
    waiting: ({ waiting }) => letters(waiting, "Dokument ist noch zu lesen.", "Dokumente sind noch zu lesen."),
    nothingChanged: "Nichts ist geändert.",
    comparedAll: ({ count }) => letters(count, "Dokument verglichen.", "Dokumente verglichen."), walkBack: "Voriges Dokument",
    walkOn: "Nächstes Dokument", compareFromHere: "Mit den jetzigen Einstellungen vergleichen",
    effect_better: "Besser: {count}", effect_worse: "Schlechter: {count}", effect_other: "Geändert: {count}",
    effect_golden: "Anders als gemerkt: {count}", andMore: "und {count} weitere",
    saveTitle: "Einstellungen sichern", saveInto: "Was sich in {name} ändert:", saveNow: "Sichern", changes: "Änderungen",
    noDifference: "Kein Unterschied.", nothingToSave: "Es gibt nichts zu sichern.", saved: "Gesichert in {name}.",
    nowhereToSave: "Die Werkbank läuft ohne Einstellungen; zum Sichern wird sie mit --settings oder --node gestartet.",
    conflictTitle: "Die Einstellungen haben sich inzwischen geändert", conflict: "Jemand anderes hat {name} geändert, seit es gelesen wurde.",
    theirChanges: "Deren Änderungen", yourChanges: "Ihre Änderungen", betweenBoth: "Von deren Fassung zu Ihrer",
    overwrite: "Meine darüber sichern", takeTheirs: "Deren Fassung nehmen",
    proposalTitle: "Ein neues Preset aus diesem Dokument", proposalIntro: "Ankreuzen, was stimmt. Alles lässt sich später ändern.",
    madeFrom: "Gemacht aus", matchSays: "Dieser Ausdruck muss auf den ganzen Namen jedes solchen Dokuments passen: .* steht für Beliebiges, \\d+ für eine Zahl.",
    documentsNamed: "Für Dokumente mit dem Namen", readFromIt: "Daraus zu lesen", addressZone: "Anschrift des Empfängers",
    nothingProposed: "Es wurde nichts erkannt.", fieldNameFor: "Name des Feldes für {value}", adopt: "Preset hinzufügen",
    adopted: "Das Preset wurde hinzugefügt.",
    goldenTitle: "Als richtig gemerkt", goldenExists: "Für {document} war schon etwas anderes gemerkt.", replace: "Ersetzen",
    goldenKept: "Gemerkt in {file}.",
    changedMeanwhile: "Die Einstellungen haben sich inzwischen geändert: das neue Ergebnis ansehen und noch einmal versuchen.",
    changedOutside: "Jemand anderes hat {name} inzwischen geändert; beim Sichern ist beides zu sehen.",
    noProgram: "Das Programm ist beendet; vlmail workbench neu starten.", noSettings: "keine Einstellungen", unsaved: "nicht gesichert",
    broken: "Zeile {number}: {says}. Die Seite zeigt die Einstellungen davor.",
    didType: "Eingabe", didPlace: "Lage der Zone {zone}", didRename: "Name der Zone {name}", didRemove: "Entfernen von {name}",
    didAdd: "{name} neu", didPattern: "Muster von {field}", didRepair: "{what}", didSet: "{key}", didAdopt: "neues Preset",
    didTakeTheirs: "Einstellungen von jemand anderem",
    helpTitle: "Tasten", "key_F6": "F6", "does_F6": "zum nächsten Teil der Seite", "key_Ctrl+S": "Strg+S", "does_Ctrl+S": "sichert",
    "key_Ctrl+Z": "Strg+Z", "does_Ctrl+Z": "nimmt die letzte Änderung zurück", "key_Ctrl+Y": "Strg+Y", "does_Ctrl+Y": "macht sie wieder",
    "key_Ctrl+Space": "Strg+Leertaste", "does_Ctrl+Space": "im JSON: ergänzt einen Schlüssel", key_arrows: "Pfeile",
    does_arrows: "auf einer Zone: verschieben sie um einen Millimeter", key_shiftArrows: "Umschalt+Pfeile",
    does_shiftArrows: "verschieben ihren rechten und unteren Rand", key_ctrlArrows: "Strg+Pfeile",
    does_ctrlArrows: "verschieben um einen Zehntelmillimeter", key_N: "N", does_N: "auf der Seite: eine neue Zone, die Eingabe übernimmt",
    key_F: "F", does_F: "auf einer Zone: passt sie ihrem Text an", key_Delete: "Entf", does_Delete: "auf einer Zone: entfernt sie",
    key_Esc: "Esc", does_Esc: "bricht ab, was begonnen ist",
};

const LANGUAGES = { en: EN, de: DE };

/** @returns {string[]} keys that a language lacks, or has alone */
export function missing() {
    const all = new Set(Object.values(LANGUAGES).flatMap(Object.keys));
    return [...all].filter((key) => Object.values(LANGUAGES).some((texts) => !(key in texts)));
}

export class Texts {
    /** @param {string} language  such as "de-AT"; English where it is none of these */
    constructor(language) {
        const short = language.slice(0, 2).toLowerCase();
        this.language = LANGUAGES[short] ? short : "en";
        this.numbers = new Intl.NumberFormat(this.language, { maximumFractionDigits: 2 });
    }

    /**
     * @param {string} key
     * @param {Object<string, *>} given
     * @returns {string}
     */
    of(key, given = {}) {
        const text = LANGUAGES[this.language][key];
        if (text === undefined)
            throw new Error("there is no text \"" + key + "\"");
        return typeof text === "function" ? text(given) : text.replace(/\{(\w+)\}/g, (_, name) => String(given[name]));
    }

    /** @returns {string} what was found of a document */
    verdict(verdict) {
        return this.of("verdict_" + verdict.verdict, verdict);
    }

    /** @returns {string} what a side of paper is */
    side(side) {
        return this.of("side_" + side.kind, side);
    }

    /** @returns {string} where a box lies, in millimetres */
    place({ left, top, right, bottom }) {
        const [l, t, r, b] = [left, top, right, bottom].map((edge) => this.numbers.format(edge / 100));
        return `${l}\u2013${r} \u00d7 ${t}\u2013${b} mm`;
    }

    /** Puts texts where the page as it was loaded has keys for them. */
    fill(document) {
        document.documentElement.lang = this.language;
        for (const element of document.querySelectorAll("[data-text]"))
            element.textContent = this.of(element.dataset.text);
        for (const element of document.querySelectorAll("[data-label]"))
            element.setAttribute("aria-label", this.of(element.dataset.label));
    }
}
