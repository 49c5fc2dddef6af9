// SPDX-License-Identifier: Apache-2.0
//
// Waiting that can be cancelled.

/** Resolves after the time, or at once when `signal` is aborted. */
export function delay(milliseconds: number, signal: AbortSignal): Promise<void> {
  return new Promise((resolve) => {
    if (signal.aborted) return resolve();
    const done = () => {
      clearTimeout(timer);
      signal.removeEventListener("abort", done);
      resolve();
    };
    const timer = setTimeout(done, milliseconds);
    signal.addEventListener("abort", done);
  });
}
