// What the settings may hold at a place, by their JSON schema.
import { stepsOf } from "./json_text.js";

function typeOf(value) {
    return Array.isArray(value) ? "array" : typeof value;
}

/** Whether the value is what a condition of the schema asks for; the conditions ask for keys and for constants. */
function fits(condition, value) {
    if (condition.anyOf)
        return condition.anyOf.some((one) => fits(one, value));
    const isThere = (key) => value !== null && typeof value === "object" && key in value;
    return (condition.required ?? []).every(isThere) && Object.entries(condition.properties ?? {})
        .every(([key, { const: wanted }]) => !isThere(key) || value[key] === wanted);
}

export class Schema {
    /** @param {object} schema  as `vlmail schema settings` prints it */
    constructor(schema) {
        this.root = schema;
    }

    /** The one that holds for the value, where there is a choice. */
    #chosen(schema, value) {
        if (schema?.$ref)
            return this.#chosen({ ...this.root.$defs[schema.$ref.slice("#/$defs/".length)], ...schema, $ref: undefined }, value);
        if (schema?.if)
            return this.#chosen(fits(schema.if, value) ? schema.then : schema.else, value);
        if (schema?.anyOf)
            return this.#chosen(schema.anyOf.find(({ type }) => type === typeOf(value)) ?? schema.anyOf.at(-1), value);
        return schema;
    }

    #stepped(schema, step) {
        const rest = typeof schema?.additionalProperties === "object" ? schema.additionalProperties : undefined;
        return schema?.properties?.[step] ?? schema?.items ?? rest;
    }

    /**
     * @param {*} document  the settings as far as they can be read
     * @param {string} pointer
     * @returns {object|undefined} undefined where nothing is known
     */
    at(document, pointer) {
        let value = document;
        let schema = this.#chosen(this.root, value);
        for (const step of stepsOf(pointer)) {
            value = value?.[step];
            schema = this.#chosen(this.#stepped(schema, step), value);
        }
        return schema;
    }

    /**
     * @param {object|undefined} schema  of an object
     * @returns {[string, object][]} its keys that are in use, and what they hold
     */
    keysOf(schema) {
        return Object.entries(schema?.properties ?? {}).filter(([, value]) => !value.deprecated)
            .map(([key, value]) => [key, { ...this.#chosen(value), description: value.description }]);
    }

    /** @returns {object|undefined} of an array's elements, as that value has it */
    elementOf(schema, value = undefined) {
        return schema?.items && this.#chosen(schema.items, value);
    }
}
