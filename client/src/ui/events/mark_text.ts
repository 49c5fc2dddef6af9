// SPDX-License-Identifier: Apache-2.0
//
// What an alert or a POS transaction says, beside the picture of its moment.

import type { Footage } from "../../wire/footage";
import { element, setText } from "../widgets/dom";
import { clockTime, shortDate } from "../widgets/text";

export class MarkText {
  readonly root = element("section", { class: "mark-text", "aria-label": "Alert or receipt", tabindex: "0", hidden: true });
  readonly #time = element("time", {});
  readonly #text = element("p", {});

  constructor() {
    this.root.append(this.#time, this.#text);
  }

  /** Null where nothing was reported. */
  show(mark: Footage | null): void {
    this.root.hidden = mark === null;
    if (!mark) return;
    setText(this.#time, `${shortDate(mark.moment * 1000)} ${clockTime(mark.moment * 1000)}`);
    setText(this.#text, mark.text);
  }
}

/** The mark to show at a time: of those whose footage has it and that say something, that of the nearest moment. */
export function markAt(footage: readonly Footage[], atS: number): Footage | null {
  const isTold = ({ kind, start, stop, text }: Footage) => kind !== "event" && start <= atS && atS <= stop && text !== "";
  const distance = ({ moment }: Footage) => Math.abs(moment - atS);
  return footage.filter(isTold).sort((one, other) => distance(one) - distance(other))[0] ?? null;
}
