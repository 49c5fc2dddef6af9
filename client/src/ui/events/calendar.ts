// SPDX-License-Identifier: Apache-2.0
//
// A month of days, of which those with recordings stand out.

import { midnight, type RecordedDays } from "../../playback/recorded_days";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { calendarDate, monthName, shortDate } from "../widgets/text";

const kWeekdays = ["Mo", "Tu", "We", "Th", "Fr", "Sa", "Su"];
/** Six weeks hold every month. */
const kCells = 42;
const kSteps: Record<string, number> = { ArrowLeft: -1, ArrowRight: 1, ArrowUp: -7, ArrowDown: 7 };

export class Calendar {
  readonly root: HTMLElement;
  readonly #days: RecordedDays;
  readonly #cameras: () => readonly number[];
  readonly #title = element("h2", { "aria-live": "polite" });
  readonly #cells: HTMLButtonElement[] = [];
  readonly #next = iconButton("next", "Next month", () => this.#turn(1));
  readonly #body = element("div", { class: "calendar-days", role: "group" });
  #monthMs = monthOf(Date.now());
  #selectedMs = midnight(Date.now());
  /** What is playing; null while nothing is. */
  #playingMs: number | null = null;

  /** Days of any of `cameras`. `onPick` gets a day's midnight. */
  constructor(days: RecordedDays, cameras: () => readonly number[], onPick: (dayMs: number) => void) {
    this.#days = days;
    this.#cameras = cameras;
    for (let cell = 0; cell < kCells; cell += 1) {
      const button = element("button", { type: "button", class: "day" });
      button.addEventListener("click", () => onPick(Number(button.dataset["day"])));
      this.#cells.push(button);
    }
    this.#body.append(...kWeekdays.map((name) => element("span", { class: "weekday" }, name)), ...this.#cells);
    this.#body.addEventListener("keydown", (event) => this.#key(event));
    const head = element(
      "header",
      { class: "calendar-head" },
      iconButton("previous", "Previous month", () => this.#turn(-1)),
      this.#title,
      this.#next,
    );
    this.root = element("section", { class: "calendar", "aria-label": "Days with recordings" }, head, this.#body);
  }

  /** Marks the day that the timeline shows, and shows its month. */
  select(unixMs: number): void {
    const day = midnight(unixMs);
    if (day === this.#selectedMs) return;
    this.#selectedMs = day;
    this.#monthMs = monthOf(day);
    this.refresh();
  }

  /** On any day of the month that is shown. */
  get hasRecordings(): boolean {
    return this.#cells.some(({ classList }) => classList.contains("has"));
  }

  /** Not all days of the month that is shown are known yet. */
  get isLoading(): boolean {
    const cameras = this.#cameras();
    const days = this.#cells.filter(({ disabled }) => !disabled).map(({ dataset }) => Number(dataset["day"]));
    return days.some((day) => cameras.some((camera) => this.#days.has(camera, day) === undefined));
  }

  /** Marks the day of what is playing, and shows its month when that is another day than before. */
  mark(playingMs: number | null): void {
    const day = playingMs === null ? null : midnight(playingMs);
    if (day === this.#playingMs) return;
    this.#playingMs = day;
    if (day !== null) this.#monthMs = monthOf(day);
    this.refresh();
  }

  refresh(): void {
    const first = new Date(this.#monthMs);
    const start = midnight(this.#monthMs, -((first.getDay() + 6) % 7));
    const cameras = this.#cameras();
    this.#days.load(cameras, start, midnight(start, kCells));
    setText(this.#title, monthName(this.#monthMs));
    const today = midnight(Date.now());
    this.#next.disabled = this.#monthMs >= monthOf(today);
    this.#cells.forEach((cell, index) => {
      const day = midnight(start, index);
      const has = cameras.some((camera) => this.#days.has(camera, day) === true);
      cell.dataset["day"] = String(day);
      setText(cell, String(new Date(day).getDate()));
      cell.classList.toggle("has", has);
      cell.classList.toggle("other-month", monthOf(day) !== this.#monthMs);
      cell.classList.toggle("today", day === today);
      cell.disabled = day > today;
      const isPlaying = day === this.#playingMs;
      cell.classList.toggle("playing", isPlaying);
      cell.tabIndex = day === this.#selectedMs ? 0 : -1;
      cell.setAttribute("aria-pressed", String(day === this.#selectedMs));
      cell.setAttribute("aria-label", `${shortDate(day)}${has ? ", recordings" : ""}${isPlaying ? ", playing" : ""}`);
    });
    // One day can always be reached with Tab.
    if (!this.#cells.some((cell) => cell.tabIndex === 0 && !cell.disabled)) {
      const some = this.#cells.find((cell) => !cell.disabled);
      if (some) some.tabIndex = 0;
    }
  }

  #turn(by: number): void {
    const month = new Date(this.#monthMs);
    this.#monthMs = new Date(month.getFullYear(), month.getMonth() + by, 1).getTime();
    this.refresh();
  }

  #key(event: KeyboardEvent): void {
    const step = kSteps[event.key];
    const focused = this.#cells.find((cell) => cell === document.activeElement);
    if (!step || !focused) return;
    event.preventDefault();
    event.stopPropagation();
    const day = midnight(Number(focused.dataset["day"]), step);
    if (day > Date.now()) return;
    if (monthOf(day) !== this.#monthMs) {
      this.#monthMs = monthOf(day);
      this.refresh();
    }
    this.#cells.find((cell) => calendarDate(Number(cell.dataset["day"])) === calendarDate(day))?.focus();
  }
}

function monthOf(unixMs: number): number {
  const time = new Date(unixMs);
  return new Date(time.getFullYear(), time.getMonth(), 1).getTime();
}
