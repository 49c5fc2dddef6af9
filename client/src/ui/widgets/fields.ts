// SPDX-License-Identifier: Apache-2.0
//
// The fields of forms: each has its label, a hint where one helps, and a value that can be read and shown. Their
// changes reach the form as the browser's own "input" events.

import type { Named } from "../../wire/camera_setup";
import { element } from "./dom";

export interface Field<Value> {
  readonly root: HTMLElement;
  value: Value;
}

export interface TextField extends Field<string> {
  readonly input: HTMLInputElement;
}

let count = 0;

/** A control with its label above, and a hint below. */
function labelled(label: string, control: HTMLElement, hint: string): HTMLElement {
  const id = `field-${(count += 1)}`;
  control.id = id;
  const root = element("div", { class: "form-field" }, element("label", { for: id }, label), control);
  if (hint) {
    control.setAttribute("aria-describedby", `${id}-hint`);
    root.append(element("p", { class: "form-hint", id: `${id}-hint` }, hint));
  }
  return root;
}

export function textField(label: string, attributes: Record<string, string | boolean> = {}, hint = ""): TextField {
  const more = { type: "text", autocomplete: "off", spellcheck: "false", ...attributes };
  const input = element("input", { class: "input", ...more });
  return {
    root: labelled(label, input, hint),
    input,
    get value() {
      return input.value;
    },
    set value(text: string) {
      input.value = text;
    },
  };
}

/** For a password. Browsers fill in none: the person at the page need not be the one who has logged in. */
export function secretField(label: string, hint = ""): TextField {
  return textField(label, { type: "password", autocomplete: "new-password", maxlength: "1024" }, hint);
}

/** Null where nothing is typed. */
export function numberField(label: string, min: number, max: number, hint = ""): Field<number | null> {
  const limits = { min: String(min), max: String(max), step: "any", inputmode: "decimal" };
  const { root, input } = textField(label, { type: "number", ...limits }, hint);
  return {
    root,
    get value() {
      return input.value === "" ? null : Number(input.value);
    },
    set value(number: number | null) {
      input.value = number === null ? "" : String(number);
    },
  };
}

export function selectField(
  label: string,
  options: readonly (readonly [value: string, text: string])[],
  hint = "",
): Field<string> {
  const made = options.map(([value, text]) => element("option", { value }, text));
  const select = element("select", { class: "input" }, ...made);
  return {
    root: labelled(label, select, hint),
    get value() {
      return select.value;
    },
    set value(value: string) {
      select.value = value;
    },
  };
}

export function checkField(label: string, hint = ""): Field<boolean> {
  const box = element("input", { type: "checkbox" });
  const root = element("div", { class: "form-check" }, element("label", {}, box, element("span", {}, label)));
  if (hint) {
    const text = element("p", { class: "form-hint", id: `field-${(count += 1)}` }, hint);
    box.setAttribute("aria-describedby", text.id);
    root.append(text);
  }
  return {
    root,
    get value() {
      return box.checked;
    },
    set value(isChecked: boolean) {
      box.checked = isChecked;
    },
  };
}

/** One of a few, all of them in sight. */
export function radioField<Value extends string>(
  label: string,
  options: readonly (readonly [value: Value, text: string])[],
): Field<Value> {
  const name = `field-${(count += 1)}`;
  const boxes = options.map(([value]) => element("input", { type: "radio", name, value }));
  const labels = boxes.map((box, at) => element("label", { class: "chip" }, box, element("span", {}, options[at]![1])));
  const chips = element("div", { class: "chips" }, ...labels);
  return {
    root: element("fieldset", { class: "form-choice" }, element("legend", {}, label), chips),
    get value() {
      return (boxes.find((box) => box.checked)?.value ?? options[0]![0]) as Value;
    },
    set value(value: Value) {
      for (const box of boxes) box.checked = box.value === value;
    },
  };
}

export interface ChipsField extends Field<number[]> {
  /** Offers one more, ticked. */
  add(choice: Named): void;
}

/** Any of a few; the value has the ids of those that are ticked, in rising order. */
export function chipsField(label: string, choices: readonly Named[]): ChipsField {
  const boxes: HTMLInputElement[] = [];
  const chips = element("div", { class: "chips" });
  const offer = ({ id, name }: Named): HTMLInputElement => {
    const box = element("input", { type: "checkbox", value: String(id) });
    boxes.push(box);
    chips.append(element("label", { class: "chip" }, box, element("span", {}, name)));
    return box;
  };
  choices.forEach(offer);
  return {
    root: element("fieldset", { class: "form-choice" }, element("legend", {}, label), chips),
    add(choice: Named) {
      offer(choice).checked = true;
    },
    get value() {
      const ticked = boxes.filter((box) => box.checked).map((box) => Number(box.value));
      return ticked.sort((one, other) => one - other);
    },
    set value(ids: number[]) {
      for (const box of boxes) box.checked = ids.includes(Number(box.value));
    },
  };
}

export interface FileField {
  readonly root: HTMLElement;
  readonly input: HTMLInputElement;
  /** Null until one is chosen. */
  readonly file: File | null;
}

/** `accept` as browsers take it: ".png,.jpg". */
export function fileField(label: string, accept: string, hint = ""): FileField {
  const input = element("input", { class: "input", type: "file", accept });
  return {
    root: labelled(label, input, hint),
    input,
    get file() {
      return input.files?.[0] ?? null;
    },
  };
}

/** Part of a form, under a heading. */
export function formPart(heading: string, ...content: Node[]): HTMLElement {
  return element("section", { class: "card form-part" }, element("h3", {}, heading), ...content);
}

export function formRow(...fields: Field<never>[] | { root: HTMLElement }[]): HTMLElement {
  return element("div", { class: "form-row" }, ...fields.map(({ root }) => root));
}
