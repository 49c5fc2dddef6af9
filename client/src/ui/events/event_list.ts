// SPDX-License-Identifier: Apache-2.0
//
// The events and marks of a span as cards with a picture each, newest first; only those on the screen exist.

import { kindOf, type EventKind } from "../../playback/coverage";
import { StillLoader } from "../../playback/still_loader";
import { describe, type Footage, type FootageRef } from "../../wire/footage";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { clockTime, duration, minuteText, shortDate } from "../widgets/text";
import { isInRow, type EventRow } from "./folded_events";

/** Rows kept beyond the visible ones, so that scrolling shows no gap. */
const kOverscanRows = 4;
/** The width of a still, on a screen with two pixels to each of the page's. */
const kStillPx = 176;

export const kKindNames: Record<EventKind, string> = {
  continuous: "Continuous",
  alarm: "Alarm",
  alert: "Alerts",
  pos: "POS",
};

/** "24 Nov 01:45 · Parking". */
export function eventText({ moment, camera }: Footage, nameOf: (camera: number) => string): string {
  return `${minuteText(moment * 1000)} · ${nameOf(camera)}`;
}

/** The lines in which something was found, and it marked. */
function foundLines(found: readonly (readonly string[])[]): (Node | string)[] {
  const hits = found.filter((pieces) => pieces.length > 1);
  return (hits.length > 0 ? hits : found).flatMap((pieces, line) => [
    ...(line > 0 ? [" · "] : []),
    ...pieces.map((piece, at) => (at % 2 === 1 ? element("mark", {}, piece) : piece)),
  ]);
}

function textOf({ footage, ids }: EventRow): string {
  if (footage.text) return footage.text.replaceAll("\n", " · ");
  const kind = kindOf(footage);
  if (kind !== "continuous") return kKindNames[kind];
  return ids.length > 1 ? `${ids.length} recordings` : "";
}

export interface EventListActions {
  open(footage: Footage): void;
  /** Shows what other cameras have at the moment of the event. */
  sameMoment(footage: Footage): void;
}

export class EventList {
  readonly root: HTMLElement;
  readonly #actions: EventListActions;
  readonly #nameOf: (camera: number) => string;
  readonly #stillAddress: (footage: Footage, widthPx: number) => string;
  readonly #stills = new StillLoader();
  readonly #head = element("h2", { class: "list-head" });
  readonly #box = element("div", { class: "list-box" });
  readonly #space = element("div", { class: "list-space", role: "list" });
  readonly #note = element("p", { class: "list-note" });
  readonly #resized = new ResizeObserver(() => this.#render());
  #rows: readonly EventRow[] = [];
  #selected: FootageRef | null = null;
  #mustReveal = false;
  /** The row that the keys move. */
  #at = 0;

  constructor(
    nameOf: (camera: number) => string,
    stillAddress: (footage: Footage, widthPx: number) => string,
    actions: EventListActions,
  ) {
    this.#nameOf = nameOf;
    this.#stillAddress = stillAddress;
    this.#actions = actions;
    this.#box.append(this.#space, this.#note);
    this.root = element("section", { class: "list", "aria-label": "Events" }, this.#head, this.#box);
    this.#box.addEventListener("scroll", () => this.#render());
    this.#box.addEventListener("keydown", (event) => this.#key(event));
    for (const type of ["wheel", "pointerdown", "keydown"]) {
      this.#box.addEventListener(type, () => (this.#mustReveal = false), { passive: true });
    }
    this.#resized.observe(this.#box);
  }

  /** Newest first. `note` says why there is nothing, or not all. */
  show(rows: readonly EventRow[], head: string, note: string): void {
    this.#rows = rows;
    setText(this.#head, head);
    setText(this.#note, note);
    this.#revealSelected();
    this.#render();
  }

  select(selected: FootageRef | null): void {
    if (selected?.id === this.#selected?.id && selected?.kind === this.#selected?.kind) return;
    this.#selected = selected;
    this.#mustReveal = true;
    this.#revealSelected();
    this.#render();
  }

  close(): void {
    this.#resized.disconnect();
    this.#stills.close();
  }

  get #rowPx(): number {
    return parseFloat(getComputedStyle(this.root).getPropertyValue("--row")) || 44;
  }

  /** Keeps a new selection in sight while more rows come above it, until the user scrolls. */
  #revealSelected(): void {
    const at = this.#mustReveal ? this.#rows.findIndex((one) => isInRow(one, this.#selected)) : -1;
    if (at < 0) return;
    // The new rows must have made room before it can be scrolled to.
    this.#space.style.height = `${this.#rows.length * this.#rowPx}px`;
    this.#reveal(at);
  }

  #reveal(at: number): void {
    const [top, row, box] = [this.#box.scrollTop, this.#rowPx, this.#box.clientHeight];
    if (at * row < top) this.#box.scrollTop = at * row;
    else if ((at + 1) * row > top + box) this.#box.scrollTop = (at + 1) * row - box;
  }

  #render(): void {
    const row = this.#rowPx;
    this.#space.style.height = `${this.#rows.length * row}px`;
    const first = Math.max(0, Math.floor(this.#box.scrollTop / row) - kOverscanRows);
    const last = Math.min(this.#rows.length, Math.ceil((this.#box.scrollTop + this.#box.clientHeight) / row) + kOverscanRows);
    const kept = new Map([...this.#space.children].map((child) => [(child as HTMLElement).dataset["ref"], child]));
    const wanted = this.#rows.slice(first, last).map((one, index) => {
      const old = kept.get(`${one.footage.kind}${one.footage.id}`) as HTMLElement | undefined;
      const made = old ?? this.#newRow(one.footage);
      this.#fill(made, one, first + index, row);
      return made;
    });
    for (const child of [...this.#space.children]) if (!wanted.includes(child as HTMLElement)) this.#remove(child);
    for (const made of wanted) if (!made.isConnected) this.#space.append(made);
  }

  #remove(row: Element): void {
    this.#stills.drop(row.querySelector("img")!);
    row.remove();
  }

  #newRow(one: Footage): HTMLElement {
    const parts = ["row-swatch", "row-time", "row-name", "row-text", "row-side"].map((name) => element("span", { class: name }));
    const still = element("img", { class: "row-still", alt: "" });
    const kept = element("span", { class: "row-kept" }, icon("kept"), element("span", { class: "unseen" }, "kept"));
    const button = element("button", { type: "button", class: "row-open" }, ...parts, still, kept);
    const shown = (act: (footage: Footage) => void) => () => {
      const one = this.#rows[Number(row.dataset["at"])];
      if (one) act(one.footage);
    };
    const all = iconButton("sameMoment", "Same moment on all cameras", shown((footage) => this.#actions.sameMoment(footage)));
    all.classList.add("row-all");
    const row = element("div", { class: "row", role: "listitem", "data-ref": `${one.kind}${one.id}` }, button, all);
    button.addEventListener("click", shown((footage) => this.#actions.open(footage)));
    return row;
  }

  #fill(row: HTMLElement, shown: EventRow, at: number, rowPx: number): void {
    const { footage: one, seconds, isGrowing } = shown;
    const [button, all] = [...row.children] as [HTMLButtonElement, HTMLButtonElement];
    const [swatch, time, name, text, side] = [...button.children] as [HTMLElement, HTMLElement, HTMLElement, HTMLElement, HTMLElement];
    const kind = kindOf(one);
    row.dataset["at"] = String(at);
    row.style.transform = `translateY(${at * rowPx}px)`;
    swatch.dataset["kind"] = kind;
    // What was found by its text may be of any day.
    setText(time, one.found ? minuteText(one.moment * 1000) : clockTime(one.moment * 1000));
    setText(name, this.#nameOf(one.camera));
    if (one.found) text.replaceChildren(...foundLines(one.found));
    else setText(text, textOf(shown));
    setText(side, isGrowing ? "recording" : one.isSaved ? duration(seconds) : "no footage");
    side.classList.toggle("recording", isGrowing);
    button.querySelector<HTMLElement>(".row-kept")!.hidden = !one.isKept;
    button.disabled = !one.isSaved;
    all.disabled = !one.isSaved;
    all.tabIndex = button.tabIndex = at === Math.min(this.#at, this.#rows.length - 1) ? 0 : -1;
    button.title = [`${shortDate(one.moment * 1000)} ${clockTime(one.moment * 1000)}`, describe(one)].filter(Boolean).join("\n");
    button.setAttribute("aria-current", String(isInRow(shown, this.#selected)));
    // A mark's footage may come later than its row.
    if (one.isSaved && !row.dataset["still"]) {
      row.dataset["still"] = "asked";
      this.#stills.load(button.querySelector("img")!, this.#stillAddress(one, kStillPx));
    }
  }

  #key(event: KeyboardEvent): void {
    const page = Math.max(1, Math.floor(this.#box.clientHeight / this.#rowPx) - 1);
    const steps: Record<string, number> = { ArrowDown: 1, ArrowUp: -1, PageDown: page, PageUp: -page };
    const row = (event.target as Element).closest<HTMLElement>(".row");
    const step = steps[event.key] ?? (event.key === "Home" ? -Infinity : event.key === "End" ? Infinity : 0);
    if (!row || step === 0) return;
    event.preventDefault();
    event.stopPropagation();
    this.#at = Math.max(0, Math.min(Number(row.dataset["at"]) + step, this.#rows.length - 1));
    this.#reveal(this.#at);
    this.#render();
    this.#space.querySelector<HTMLElement>(`[data-at="${this.#at}"] button`)?.focus({ preventScroll: true });
  }
}
