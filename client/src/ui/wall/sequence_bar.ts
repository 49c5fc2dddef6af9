// SPDX-License-Identifier: Apache-2.0
//
// The line above the wall while a sequence is shown: which layout it has come to, what comes next, and its controls.

import { savedAddress } from "../route";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import type { SequenceRun } from "./sequence_run";

export class SequenceBar {
  readonly root = element("div", { class: "sequence-bar", role: "group", hidden: true });
  readonly #toggle: HTMLButtonElement;
  readonly #current = element("strong", { class: "sequence-current" });
  readonly #next = element("span", { class: "sequence-next" });
  readonly #leave = element("a", { class: "icon-button" }, icon("close"));
  #run: SequenceRun | null = null;

  constructor() {
    const step = (by: 1 | -1) => () => this.#run?.step(by);
    this.#toggle = iconButton("pause", "Pause", () => this.toggle(), "Space");
    this.#toggle.classList.add("sequence-toggle");
    this.#toggle.append(icon("play"));
    this.root.append(
      iconButton("previous", "Previous layout", step(-1), "P"),
      this.#toggle,
      iconButton("next", "The next layout", step(1), "N"),
      element("p", { class: "sequence-text" }, this.#current, " ", this.#next),
      this.#leave,
    );
  }

  toggle(): void {
    if (this.#run) this.#run.isPaused = !this.#run.isPaused;
  }

  /** Null where no sequence is shown, or none of its layouts. */
  show(run: SequenceRun | null): void {
    const hadFocus = this.root.contains(document.activeElement);
    const current = run?.current ?? null;
    this.#run = current ? run : null;
    this.root.hidden = !current;
    if (!run || !current) return void (hadFocus && document.querySelector<HTMLElement>("h1")?.focus());
    const { sequence, layouts, next, isPaused } = run;
    this.root.setAttribute("aria-label", `Sequence ${sequence!.name}`);
    this.root.title = `${sequence!.name}: ${sequence!.dwellS} s each`;
    this.root.classList.toggle("is-paused", isPaused);
    label(this.#toggle, isPaused ? "Resume" : "Pause", " (Space)");
    setText(this.#current, current.name);
    const place = `${layouts.findIndex(({ id }) => id === current.id) + 1} of ${layouts.length}`;
    const parts = [isPaused ? "paused" : "", place, next ? `next: ${next.name}` : ""];
    setText(this.#next, parts.filter(Boolean).join(" · "));
    this.#leave.href = savedAddress("layout", current.id);
    label(this.#leave, `Leave the sequence, stay at ${current.name}`);
  }
}

function label(control: HTMLElement, text: string, shortcut = ""): void {
  if (control.getAttribute("aria-label") === text) return;
  control.setAttribute("aria-label", text);
  control.title = text + shortcut;
}
