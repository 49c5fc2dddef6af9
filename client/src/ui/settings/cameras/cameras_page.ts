// SPDX-License-Identifier: Apache-2.0
//
// All cameras with their pictures and states, in the order that everyone gets them.

import { CameraSetup, type CameraOrder, type CameraSetupList } from "../../../wire/camera_setup";
import { Semaphore } from "../../../wire/semaphore";
import { asServerError } from "../../../wire/server";
import { settingsAddress } from "../../route";
import { linkButton } from "../../widgets/button";
import { element, setText } from "../../widgets/dom";
import { notify } from "../../widgets/notice";
import { orderHandle } from "../../widgets/order_list";
import { conflictPanel } from "../conflict_panel";
import { emptyState, LoadedPage, type PageContext } from "../page";
import { CameraRow } from "./camera_row";

const kStatesIntervalMs = 4_000;
const kPicturesIntervalMs = 30_000;
const kMaxConcurrentPictures = 2;
/** After several moves in quick succession only the last is stored. */
const kOrderDelayMs = 500;

export class CamerasPage extends LoadedPage<CameraSetupList> {
  readonly #setup: CameraSetup;
  readonly #count = element("p", { class: "quiet settings-count" });
  readonly #list = element("ol", { class: "settings-list cameras-list" });
  readonly #pictures = new Semaphore(kMaxConcurrentPictures);
  readonly #conflict = element("div", { class: "form-conflict-place" });
  #rows: CameraRow[] = [];
  /** As the server had it last. */
  #order: CameraOrder = { id: [], revision: 0 };
  /** Until this is null, the server's own order is an older one. */
  #ordering: ReturnType<typeof setTimeout> | null = null;
  /** Orders are stored one after the other: each goes by the revision that the one before has led to. */
  #storing = Promise.resolve();

  constructor(context: PageContext) {
    const groups = linkButton("Groups", settingsAddress("groups"));
    const add = linkButton("Add a camera", settingsAddress("cameras", "new"), true);
    super(context, "Cameras", element("div", { class: "form-buttons" }, groups, add));
    this.#setup = new CameraSetup(context.server);
    const ask = (footage: boolean) => () => this.#setup.list({ footage });
    void this.start(ask(true), (list) => {
      this.#showList(list);
      this.refresh(kStatesIntervalMs, ask(false), (newer) => this.#showList(newer));
      const timer = setInterval(() => this.#loadPictures(this.#rows), kPicturesIntervalMs);
      this.closed.addEventListener("abort", () => clearInterval(timer));
    });
  }

  override close(): void {
    super.close();
    if (this.#ordering) this.#storeOrder();
  }

  override get isChanged(): boolean {
    return this.#conflict.childElementCount > 0;
  }

  #showList({ camera, group, order }: CameraSetupList): void {
    if (this.#ordering || this.isChanged || this.#list.querySelector(".is-dragged")) return;
    this.#order = order;
    if (camera.length === 0) {
      this.#rows = [];
      const add = linkButton("Add the first camera", settingsAddress("cameras", "new"), true);
      const sentence = "There are no cameras yet. All that is needed is the camera's address in your network, and its account.";
      return this.show(emptyState("camera", sentence, add));
    }
    const inOrder = [...camera].sort((one, other) => one.order - other.order);
    const added: CameraRow[] = [];
    const rows = inOrder.map((one) => {
      const row = this.#rows.find(({ id }) => id === one.id) ?? new CameraRow(this.context.server, one, group);
      if (!this.#rows.includes(row)) {
        row.root.prepend(orderHandle(this.#list, row.root, one.name, () => this.#orderSoon()));
        added.push(row);
      }
      row.show(one, group);
      return row;
    });
    this.#rows = rows;
    // Elements that are moved lose the focus.
    if (rows.some(({ root }, at) => this.#list.children[at] !== root) || this.#list.children.length !== rows.length) {
      this.#list.replaceChildren(...rows.map(({ root }) => root));
    }
    const live = camera.filter(({ state }) => state === "running").length;
    setText(this.#count, `${live} of ${camera.length} live. Drag the handles to change the order of the wall.`);
    if (!this.#list.isConnected) this.show(this.#count, this.#conflict, this.#list);
    this.#loadPictures(added);
  }

  #loadPictures(rows: readonly CameraRow[]): void {
    if (document.hidden) return;
    for (const row of rows) void this.#pictures.run(this.closed, () => row.loadPicture(this.closed)).catch(() => undefined);
  }

  #orderSoon(): void {
    if (this.#ordering) clearTimeout(this.#ordering);
    this.#ordering = setTimeout(() => this.#storeOrder(), kOrderDelayMs);
  }

  #storeOrder(): void {
    const moved = this.#ordering;
    if (moved) clearTimeout(moved);
    this.#storing = this.#storing.then(async () => {
      await this.#sendOrder([...this.#list.children].map((child) => Number((child as HTMLElement).dataset.camera)));
      if (this.#ordering === moved) this.#ordering = null;
    });
  }

  async #sendOrder(wanted: number[]): Promise<void> {
    try {
      this.#order = await this.#setup.order(wanted, this.#order.revision);
      this.#conflict.replaceChildren();
    } catch (error) {
      const { status, data, message } = asServerError(error);
      if (status === 409 && !this.closed.aborted) this.#showConflict(wanted, data as CameraOrder);
      else notify(`The order is not saved. ${message}`);
    }
  }

  /** What the server has is shown once the user has chosen. */
  #showConflict(mine: number[], theirs: CameraOrder): void {
    const names = new Map(this.#rows.map((row) => [row.id, row.name]));
    const text = (ids: number[]) => ids.map((id) => names.get(id) ?? "a new camera").join(", ");
    const keepMine = () => {
      this.#order = theirs;
      const added = theirs.id.filter((id) => !mine.includes(id));
      void this.#sendOrder([...mine.filter((id) => theirs.id.includes(id)), ...added]).then(() => this.#reload());
    };
    const takeTheirs = () => {
      this.#conflict.replaceChildren();
      void this.#reload();
    };
    const [base, own, now] = [{ order: this.#order.id }, { order: mine }, { order: theirs.id }];
    const panel = conflictPanel("order of cameras", base, own, now, { order: ["Order", text] }, { keepMine, takeTheirs });
    this.#conflict.replaceChildren(panel);
  }

  async #reload(): Promise<void> {
    const list = await this.#setup.list({ footage: false }).catch((error: unknown) => void notify(asServerError(error).message));
    if (list && !this.closed.aborted) this.#showList(list);
  }
}
