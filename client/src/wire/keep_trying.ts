// SPDX-License-Identifier: Apache-2.0
//
// Asks the server again until it answers, so that a screen that was opened while the server was unreachable fills by
// itself.

import { Backoff } from "./backoff";
import { delay } from "./delay";
import { asServerError } from "./server";

/**
 * The answer; undefined once `signal` is aborted. `failed` gets a sentence for the user after each attempt that failed.
 */
export async function keepTrying<Answer>(
  ask: () => Promise<Answer>,
  failed: (sentence: string) => void,
  signal: AbortSignal,
): Promise<Answer | undefined> {
  const backoff = new Backoff();
  while (!signal.aborted) {
    try {
      const answer = await ask();
      return signal.aborted ? undefined : answer;
    } catch (error) {
      if (signal.aborted) break;
      failed(`${asServerError(error).message} Trying again…`);
      await delay(backoff.next(), signal);
    }
  }
  return undefined;
}
