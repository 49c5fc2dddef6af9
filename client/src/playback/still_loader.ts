// SPDX-License-Identifier: Apache-2.0
//
// Loads the pictures of a list, a few at once, and none that is scrolled past.

import { delay } from "../wire/delay";
import { Semaphore } from "../wire/semaphore";

/** Over HTTP/1.1 a browser has six connections, and up to four are playing. */
const kMaxConcurrent = 2;
const kDebounceMs = 120;

export class StillLoader {
  readonly #semaphore = new Semaphore(kMaxConcurrent);
  readonly #loading = new Map<HTMLImageElement, AbortController>();

  /** The image has the class "loaded" once it shows something. */
  load(image: HTMLImageElement, address: string): void {
    const abort = new AbortController();
    this.#loading.set(image, abort);
    void this.#load(image, address, abort.signal);
  }

  /** The image is not looked at any more. */
  drop(image: HTMLImageElement): void {
    this.#loading.get(image)?.abort();
    this.#loading.delete(image);
  }

  close(): void {
    for (const image of [...this.#loading.keys()]) this.drop(image);
  }

  async #load(image: HTMLImageElement, address: string, signal: AbortSignal): Promise<void> {
    await delay(kDebounceMs, signal);
    const show = async () => {
      image.src = address;
      const isLoaded = await new Promise<boolean>((resolve) => {
        image.addEventListener("load", () => resolve(true), { once: true });
        image.addEventListener("error", () => resolve(false), { once: true });
        signal.addEventListener("abort", () => resolve(false), { once: true });
      });
      if (signal.aborted) image.removeAttribute("src");
      image.classList.toggle("loaded", isLoaded);
    };
    await this.#semaphore.run(signal, show).catch(() => undefined);
    this.#loading.delete(image);
  }
}
