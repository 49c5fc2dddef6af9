// SPDX-License-Identifier: Apache-2.0
//
// Name, position and direction of the item that is selected in the map editor.

import type { MapItem } from "../../wire/emaps";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { titleOf } from "./map_item";

/** By one press of the button or key. */
export const kTurnDegrees = 15;
const kTextPositions = ["Below", "Above", "Left", "Right"];

export function turned(item: MapItem, by: number): MapItem {
  return { ...item, direction: (item.direction + by + 360) % 360 };
}

export class MapItemForm {
  readonly root: HTMLElement;
  readonly #title = element("h2", { class: "map-form-title" });
  readonly #name = element("input", { class: "input", type: "text", maxlength: "80", autocomplete: "off" });
  readonly #numbers: Record<"x" | "y" | "direction", HTMLInputElement>;
  readonly #textPos = element("select", { class: "input" }, ...kTextPositions.map((name, at) => element("option", { value: String(at) }, name)));
  readonly #onChange: (item: MapItem) => void;
  #item: MapItem | null = null;
  /** What the fields held when the item was shown. */
  #shown = "";

  /** `onChange` is called with what a field holds when it is left, `onType` at each change before. */
  constructor(onChange: (item: MapItem) => void, onType: () => void, onRemove: () => void) {
    this.#onChange = onChange;
    const number = (max: string) => element("input", { class: "input", type: "number", min: "0", max, step: "1", required: true });
    this.#numbers = { x: number("100000"), y: number("100000"), direction: number("359") };
    const row = (label: string, field: HTMLElement) => element("label", { class: "map-field" }, label, field);
    const turn = (by: number) => () => this.#item && onChange(turned(this.#item, by));
    this.root = element(
      "div",
      { class: "map-form", hidden: true },
      this.#title,
      row("Name", this.#name),
      row("Name at", this.#textPos),
      row("x", this.#numbers.x),
      row("y", this.#numbers.y),
      row("Direction °", this.#numbers.direction),
      element(
        "div",
        { class: "map-form-buttons" },
        iconButton("turnLeft", "Turn left", turn(-kTurnDegrees), "["),
        iconButton("turnRight", "Turn right", turn(kTurnDegrees), "]"),
        iconButton("remove", "Remove from the map", onRemove, "Del"),
      ),
    );
    for (const field of this.#fields) {
      field.addEventListener("change", () => this.#read());
      field.addEventListener("input", onType);
    }
  }

  /** Whether a field holds what `onChange` was not called with yet, or cannot be since it is not valid. */
  get isTyped(): boolean {
    return this.#item !== null && this.#values() !== this.#shown;
  }

  /** Calls `onChange` with what is in the fields, as if they were left. */
  commit(): void {
    if (this.isTyped) this.#read();
  }

  show(item: MapItem | null): void {
    this.#item = item;
    this.root.hidden = item === null;
    if (!item) return;
    setText(this.#title, titleOf(item));
    this.#name.value = item.name;
    this.#textPos.value = String(item.textPos);
    for (const name of ["x", "y", "direction"] as const) this.#numbers[name].value = String(item[name]);
    this.#shown = this.#values();
  }

  get #fields(): (HTMLInputElement | HTMLSelectElement)[] {
    return [this.#name, this.#textPos, ...Object.values(this.#numbers)];
  }

  #values(): string {
    return JSON.stringify(this.#fields.map(({ value }) => value));
  }

  #read(): void {
    const fields = Object.values(this.#numbers);
    if (!this.#item || !fields.every((field) => field.reportValidity())) return;
    const { x, y, direction } = this.#numbers;
    this.#onChange({
      ...this.#item,
      name: this.#name.value.trim(),
      textPos: Number(this.#textPos.value),
      x: x.valueAsNumber,
      y: y.valueAsNumber,
      direction: direction.valueAsNumber,
    });
  }
}
