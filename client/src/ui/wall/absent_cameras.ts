// SPDX-License-Identifier: Apache-2.0
//
// Cameras that were on the wall and that the server no longer lists, and why: their tiles stay, grey, until the user
// takes them off. A camera that vanishes without a word would be missed by nobody.

import type { Camera, CameraList } from "../../wire/camera";

export interface AbsentCamera {
  readonly camera: Camera;
  /** For the user. */
  readonly reason: string;
}

/** Those of one account, since the page was loaded. */
export class AbsentCameras {
  #last: CameraList | null = null;
  #absent: AbsentCamera[] = [];

  get all(): readonly AbsentCamera[] {
    return this.#absent;
  }

  /** Call it with each list that the server sends. */
  update(list: CameraList): void {
    const before = this.#last;
    this.#last = list;
    const isListed = ({ id }: Camera) => list.camera?.some((camera) => camera.id === id) ?? false;
    const left = before?.camera?.filter((camera) => !isListed(camera)) ?? [];
    const reason = before ? reasonFor(before, list, left.length) : "";
    this.#absent = [...this.#absent.filter(({ camera }) => !isListed(camera)), ...left.map((camera) => ({ camera, reason }))];
  }

  dismiss(id: number): void {
    this.#absent = this.#absent.filter(({ camera }) => camera.id !== id);
  }
}

/** The server names no camera that is not there; but it counts those that are disabled. */
function reasonFor(before: CameraList, now: CameraList, left: number): string {
  const gone = before.CamNum - now.CamNum;
  if (gone <= 0) return "Disabled";
  if (gone < left) return "Disabled or removed";
  return now.isManager ? "Removed" : "Removed, or denied to you";
}
