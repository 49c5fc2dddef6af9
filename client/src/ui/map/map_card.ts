// SPDX-License-Identifier: Apache-2.0
//
// A card beside the item that is pointed at: what it is, its state, and what its camera sees now; of a POS terminal the
// latest transactions.

import { SnapshotSource } from "../../live/snapshot_source";
import type { Camera } from "../../wire/camera";
import type { Footage } from "../../wire/footage";
import { Recordings } from "../../wire/recordings";
import { Semaphore } from "../../wire/semaphore";
import type { Server } from "../../wire/server";
import { recordingsButtons } from "../camera/recordings_buttons";
import { draw, element, setText } from "../widgets/dom";
import { clockTime, minuteText, shortDate } from "../widgets/text";
import { kindName, type MapItemView } from "./map_item";

/** How many the card of a POS terminal lists. */
const kTransactions = 5;

export class MapCard {
  readonly root = element("div", { class: "card map-card", hidden: true });
  readonly #server: Server;
  readonly #title = element("p", { class: "map-card-title" });
  readonly #text = element("p", { class: "quiet" });
  readonly #canvas = element("canvas", { role: "img" });
  readonly #recordings: Recordings;
  readonly #transactions = element("ul", { class: "map-card-transactions", "aria-label": "Last transactions" });
  /** To what was recorded of its camera. */
  readonly #links = element("div", { class: "map-card-links" });
  readonly #open = element("button", { type: "button", class: "button" }, "Open its camera");
  readonly #semaphore = new Semaphore(1);
  #polling: AbortController | null = null;
  #shown: MapItemView | null = null;

  constructor(server: Server) {
    this.#server = server;
    this.#recordings = new Recordings(server);
    this.root.append(this.#canvas, this.#title, this.#text, this.#transactions, this.#open, this.#links);
  }

  get isPinned(): boolean {
    return !this.root.hidden && !this.#open.hidden;
  }

  /**
   * Shows the item at its place. `camera` is what can be seen of it; `open`, where it is given, what a button opens:
   * such a card stays until it is hidden.
   */
  show(view: MapItemView, camera: Camera | null, sinceS: number, open: (() => void) | null): void {
    if (this.#shown === view && !this.isPinned && !open) return;
    this.hide();
    this.#shown = view;
    setText(this.#title, view.item.name || kindName(view.item));
    const since = sinceS > 0 ? ` since ${shortDate(sinceS * 1000)} ${clockTime(sinceS * 1000)}` : "";
    const reports = view.item.kind === "door" || view.item.kind === "io";
    const state = view.state || (reports ? "state unknown" : "");
    setText(this.#text, state ? `${kindName(view.item)}, ${state}${since}` : kindName(view.item));
    this.#canvas.hidden = true;
    this.#open.hidden = open === null;
    this.#links.replaceChildren(...(open && camera ? recordingsButtons(camera) : []));
    this.#transactions.replaceChildren();
    this.root.classList.toggle("is-pinned", open !== null);
    this.#open.onclick = open;
    this.root.hidden = false;
    this.#placeBeside(view);
    if (!camera) return;
    void this.#showPicture(camera, view);
    if (view.item.kind === "pos" && !camera.server) void this.#showTransactions(camera, view);
  }

  hide(): void {
    this.#polling?.abort();
    this.#polling = null;
    this.#shown = null;
    this.root.hidden = true;
  }

  async #showPicture(camera: Camera, view: MapItemView): Promise<void> {
    const polling = (this.#polling = new AbortController());
    this.#canvas.setAttribute("aria-label", `Picture of ${camera.name}`);
    const source = new SnapshotSource(this.#server, camera, this.#semaphore);
    const show = ({ image }: { image: ImageBitmap | VideoFrame }) => {
      draw(this.#canvas, image);
      image.close();
      const isFirst = this.#canvas.hidden;
      this.#canvas.hidden = false;
      if (isFirst) this.#placeBeside(view);
    };
    // A camera that sends nothing has a card without a picture.
    await source.run(show, polling.signal).catch(() => undefined);
  }

  async #showTransactions(camera: Camera, view: MapItemView): Promise<void> {
    const transactions = await this.#recordings.latestTransactions(camera.id, kTransactions).catch(() => []);
    if (this.#shown !== view) return;
    this.#transactions.replaceChildren(...transactions.map(transactionRow));
    this.#placeBeside(view);
  }

  /** To the right of the item or to its left; in a narrow window below or above it. Never over it. */
  #placeBeside(view: MapItemView): void {
    const frame = this.root.offsetParent?.getBoundingClientRect();
    if (!frame) return;
    const item = view.root.getBoundingClientRect();
    const { offsetWidth: width, offsetHeight: height } = this.root;
    const gap = 12;
    const within = (at: number, size: number, room: number) => Math.max(gap, Math.min(at, room - size - gap));
    let left = item.right - frame.left + gap;
    let top = within(item.top - frame.top - height / 3, height, frame.height);
    if (left + width > frame.width) left = item.left - frame.left - gap - width;
    if (left < 0) {
      left = within(item.left - frame.left - width / 2, width, frame.width);
      const below = item.bottom - frame.top + gap;
      top = below + height <= frame.height ? below : item.top - frame.top - gap - height;
    }
    this.root.style.left = `${left}px`;
    this.root.style.top = `${top}px`;
  }
}

/** The time of a transaction and its text; leads to its recording, where there is one. */
function transactionRow({ id, moment, text, isSaved }: Footage): HTMLElement {
  const label = `${minuteText(moment * 1000)} · ${text.replaceAll("\n", " · ")}`;
  return element("li", { title: text }, isSaved ? element("a", { href: `#pos=${id}` }, label) : label);
}
