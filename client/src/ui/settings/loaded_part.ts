// SPDX-License-Identifier: Apache-2.0
//
// A part of a page that is asked for by itself, so that what fails, fails for it alone.

import { asServerError } from "../../wire/server";
import { button } from "../widgets/button";
import { element } from "../widgets/dom";
import { formPart } from "../widgets/fields";

export class LoadedPart {
  readonly root = element("div", { class: "form-group" });
  readonly #title: string;
  readonly #closed: AbortSignal;
  readonly #waiting: string;

  /** Nothing is shown any more once `closed` is aborted. `waiting` stands there until something was loaded. */
  constructor(title: string, closed: AbortSignal, waiting = "Loading…") {
    this.#title = title;
    this.#closed = closed;
    this.#waiting = waiting;
  }

  /** Shows the parts of a form that `load` gives, or a failure with a button that tries again. */
  async fill(load: () => Promise<HTMLElement[]>): Promise<void> {
    if (this.root.childElementCount === 0) this.#say(element("p", { class: "quiet", role: "status" }, this.#waiting));
    try {
      const parts = await load();
      if (!this.#closed.aborted) this.root.replaceChildren(...parts);
    } catch (error) {
      if (this.#closed.aborted) return;
      const again = button("Try again", () => void this.fill(load));
      this.#say(element("p", { role: "alert" }, asServerError(error).message), again);
    }
  }

  #say(...content: HTMLElement[]): void {
    this.root.replaceChildren(formPart(this.#title, ...content));
  }
}
