// SPDX-License-Identifier: Apache-2.0
//
// What covers a screen that shows cameras: the large view of one of them, and the dialog with a snapshot.

import type { Camera } from "../../wire/camera";
import type { Server } from "../../wire/server";
import type { KeyList } from "../widgets/keys_dialog";
import { titleCover } from "../widgets/title";
import { LargeView } from "./large_view";
import type { LivePicture } from "./live_picture";
import { SnapshotDialog } from "./snapshot_dialog";

export interface CameraOverlayActions {
  /** The user wants to see again what the large view covers. */
  back(): void;
  /** Goes to the next camera (1) or the previous one (-1); absent where there is no order. */
  step?(by: 1 | -1): void;
}

export class CameraOverlay {
  readonly #server: Server;
  readonly #root: HTMLElement;
  readonly #front: HTMLElement;
  readonly #actions: CameraOverlayActions;
  readonly #dialog: SnapshotDialog;
  #large: LargeView | null = null;

  /** Adds itself to `root`, and hides `front` there while a camera is shown large. */
  constructor(server: Server, root: HTMLElement, front: HTMLElement, actions: CameraOverlayActions) {
    this.#server = server;
    this.#root = root;
    this.#front = front;
    this.#actions = actions;
    this.#dialog = new SnapshotDialog(server);
    root.append(this.#dialog.root);
  }

  /** The one that is shown large. */
  get camera(): Camera | null {
    return this.#large?.camera ?? null;
  }

  /** Shows a camera large, or the screen again (null). `still` is its first picture until one of its own comes. */
  show(camera: Camera | null, still?: LivePicture): void {
    if (camera && this.camera && isSame(camera, this.camera)) return;
    this.#large?.close();
    this.#large = null;
    this.#front.hidden = camera !== null;
    titleCover(camera?.name ?? null);
    if (!camera) return;
    const { back, step } = this.#actions;
    const common = { back, snapshot: () => this.takeSnapshot(camera) };
    this.#large = new LargeView(camera, this.#server, step ? { ...common, step } : common, still);
    this.#root.prepend(this.#large.root);
    this.#large.focus();
  }

  /** The keys of the large view. */
  get keys(): KeyList {
    const step: KeyList = this.#actions.step ? [["Left Right", "The camera before or after"]] : [];
    return [["Esc", "Back"], ...step, ["S", "Snapshot"], ["M", "Sound on or off"], ["F", "Full screen"]];
  }

  takeSnapshot(camera: Camera): void {
    void this.#dialog.take(camera);
  }

  /** Brings the large view up to date with the clock. */
  refresh(): void {
    this.#large?.refresh();
  }

  /** Does what the key asks for; undefined where nothing covers the screen, so that the key is the screen's. */
  pressKey(event: KeyboardEvent): boolean | undefined {
    if (this.#dialog.isOpen) return false;
    return this.#large?.pressKey(event);
  }

  close(): void {
    if (this.#dialog.isOpen) this.#dialog.root.close();
    this.#large?.close();
  }
}

function isSame(one: Camera, other: Camera): boolean {
  return one.id === other.id && (one.server ?? 0) === (other.server ?? 0);
}
