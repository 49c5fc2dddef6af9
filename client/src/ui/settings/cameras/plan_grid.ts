// SPDX-License-Identifier: Apache-2.0
//
// The week as a grid of hours that is painted with pointer or keys.
//
// Why so        One control with a single stop for Tab: 168 of them would keep everyone who works with the keyboard
//               from what follows. Arrows go from hour to hour, and with Shift paint on the way.

import { element } from "../../widgets/dom";
import { radioField, type Field } from "../../widgets/fields";
import { hourText, kDays, kHourModes, kHoursOfDay, painted, weekText, wholeWeek } from "./plan";

const kSteps: Record<string, [day: number, hour: number]> = {
  ArrowUp: [-1, 0],
  ArrowDown: [1, 0],
  ArrowLeft: [0, -1],
  ArrowRight: [0, 1],
};

const kHint =
  "Drag over hours, or use the arrow keys: Space paints an hour, Shift with an arrow paints on the way; 0, 1 and 2 set never, " +
  "always and on alert.";

export class PlanGrid implements Field<string> {
  readonly root: HTMLElement;
  readonly #brush = radioField("Paint with", [["1", "Always"], ["2", "On alert"], ["0", "Never"]]);
  readonly #grid = element("div", { class: "plan-grid", role: "grid", "aria-label": "Hours of the week" });
  readonly #status = element("p", { class: "plan-status", "aria-live": "off" });
  readonly #cells: HTMLElement[] = [];
  #hours = wholeWeek("");
  #focused = 0;
  /** Where the pointer was pressed, and what the week was then. */
  #stroke: { from: number; before: string } | null = null;

  constructor() {
    this.#brush.value = "1";
    this.#grid.append(this.#head(), ...kDays.map((_, day) => this.#day(day)));
    this.#grid.addEventListener("pointerdown", (event) => this.#press(event));
    this.#grid.addEventListener("pointermove", (event) => this.#move(event));
    for (const end of ["pointerup", "pointercancel"]) this.#grid.addEventListener(end, () => (this.#stroke = null));
    this.#grid.addEventListener("keydown", (event) => this.#onKey(event));
    this.#grid.addEventListener("focusin", () => this.#tell(this.#focused));
    const hint = element("p", { class: "form-hint" }, kHint);
    this.root = element("div", { class: "plan" }, this.#brush.root, this.#grid, this.#status, hint);
    this.#show();
  }

  get value(): string {
    return this.#hours;
  }

  set value(hours: string) {
    this.#hours = wholeWeek(hours);
    this.#show();
  }

  #head(): HTMLElement {
    const head = (look: string, shown: string, label: string) =>
      element("span", { role: "columnheader", class: look }, shown, element("span", { class: "unseen" }, label));
    const hours = Array.from({ length: kHoursOfDay }, (_, hour) => {
      const cell = head("plan-hour", hour % 6 === 0 ? String(hour) : "", ` ${hour}:00 of all days`);
      cell.dataset.hour = String(hour);
      return cell;
    });
    return element("div", { role: "row", class: "plan-row" }, head("plan-day", "", "Day"), ...hours);
  }

  #day(day: number): HTMLElement {
    const cells = Array.from({ length: kHoursOfDay }, (_, hour) => {
      const at = String(day * kHoursOfDay + hour);
      const cell = element("span", { role: "gridcell", class: "plan-cell", tabindex: "-1", "data-at": at });
      this.#cells.push(cell);
      return cell;
    });
    const attributes = { role: "rowheader", class: "plan-day", "data-day": String(day), "aria-label": kDays[day]! };
    const name = element("span", attributes, kDays[day]!.slice(0, 2));
    return element("div", { role: "row", class: "plan-row" }, name, ...cells);
  }

  #show(): void {
    this.#cells.forEach((cell, at) => {
      const mode = Number(this.#hours[at]);
      cell.dataset.mode = String(mode);
      cell.ariaLabel = `${hourText(at)}: ${kHourModes[mode]}`;
      cell.tabIndex = at === this.#focused ? 0 : -1;
    });
    this.#status.textContent = `Recording: ${weekText(this.#hours)}.`;
  }

  #tell(at: number): void {
    const mode = kHourModes[Number(this.#hours[at])];
    this.#status.textContent = `${hourText(at)}: ${mode}. Recording: ${weekText(this.#hours)}.`;
  }

  #paint(from: number, to: number, mode = Number(this.#brush.value), before = this.#hours): void {
    const hours = painted(before, from, to, mode);
    if (hours !== this.#hours) {
      this.#hours = hours;
      this.#show();
      this.root.dispatchEvent(new Event("input", { bubbles: true }));
    }
    this.#tell(to);
  }

  /** The first and the last hour that an element stands for: one, a day, or the same hour of all days. */
  #rangeOf(target: Element | null): [from: number, to: number] | null {
    if (!(target instanceof HTMLElement) || !this.#grid.contains(target)) return null;
    const { at, day, hour } = target.dataset;
    if (at !== undefined) return [Number(at), Number(at)];
    if (day !== undefined) return [Number(day) * kHoursOfDay, (Number(day) + 1) * kHoursOfDay - 1];
    return hour === undefined ? null : [Number(hour), (kDays.length - 1) * kHoursOfDay + Number(hour)];
  }

  #press(event: PointerEvent): void {
    const range = this.#rangeOf(event.target as Element);
    if (!range || event.button !== 0) return;
    this.#stroke = { from: range[0], before: this.#hours };
    // Moves are reported for what is below the pointer, on touch screens as well.
    (event.target as Element).releasePointerCapture?.(event.pointerId);
    this.#paint(...range);
    if (range[0] === range[1]) this.#focus(range[0]);
  }

  #move(event: PointerEvent): void {
    const range = this.#rangeOf(document.elementFromPoint(event.clientX, event.clientY));
    if (event.buttons === 0) this.#stroke = null;
    if (!range) return;
    if (this.#stroke) this.#paint(this.#stroke.from, range[1], undefined, this.#stroke.before);
    else if (range[0] === range[1]) this.#tell(range[0]);
  }

  #onKey(event: KeyboardEvent): void {
    const step = kSteps[event.key];
    const at = this.#focused;
    if (step) {
      const [day, hour] = [Math.floor(at / kHoursOfDay) + step[0], (at % kHoursOfDay) + step[1]];
      const isInside = day >= 0 && day < kDays.length && hour >= 0 && hour < kHoursOfDay;
      const next = isInside ? day * kHoursOfDay + hour : at;
      if (event.shiftKey) this.#paint(at, next);
      this.#focus(next);
    } else if (event.key === " " || event.key === "Enter") this.#paint(at, at);
    else if (/^[012]$/.test(event.key)) this.#paint(at, at, Number(event.key));
    else return;
    event.preventDefault();
    event.stopPropagation();
  }

  #focus(at: number): void {
    this.#cells[this.#focused]!.tabIndex = -1;
    this.#focused = at;
    this.#cells[at]!.tabIndex = 0;
    this.#cells[at]!.focus();
    this.#tell(at);
  }
}
