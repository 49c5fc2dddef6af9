// SPDX-License-Identifier: Apache-2.0
//
// Live pictures of a camera by polling for snapshots: for tiles without a stream of their own.

import type { Camera } from "../wire/camera";
import { delay } from "../wire/delay";
import type { Semaphore } from "../wire/semaphore";
import type { Server } from "../wire/server";
import type { Frame, LiveSource } from "./source";

/** Short, since a camera that does not answer must not hold up the others. */
const kAnswerTimeoutMs = 3_000;

export class SnapshotSource implements LiveSource {
  readonly lostAfterMs = 10_000;
  readonly pollIntervalMs = 2_000;
  readonly #server: Server;
  readonly #camera: Camera;
  readonly #semaphore: Semaphore;

  /** `semaphore` is shared by all that poll the same server. */
  constructor(server: Server, camera: Camera, semaphore: Semaphore) {
    this.#server = server;
    this.#camera = camera;
    this.#semaphore = semaphore;
  }

  async run(show: (frame: Frame) => void, signal: AbortSignal): Promise<void> {
    while (!signal.aborted) {
      try {
        const snapshot = await this.#semaphore.run(signal, () =>
          this.#server.snapshot(this.#camera, signal, kAnswerTimeoutMs),
        );
        const image = await createImageBitmap(snapshot.jpeg);
        if (signal.aborted) return image.close();
        show({ image, capturedMs: snapshot.takenMs, ageMs: 0 });
      } catch (error) {
        if (signal.aborted) return;
        throw error;
      }
      await delay(this.pollIntervalMs, signal);
    }
  }
}
