// SPDX-License-Identifier: Apache-2.0
//
// Which cameras send no picture, since when and why, as the recorder knows it.

import type { Camera } from "./camera";

export interface SignalLoss {
  /** Unix milliseconds; when it was first noticed. */
  sinceMs: number;
  /** In few words, for the user. */
  cause: string;
}

/** Answer of CameraStates. */
export interface CameraStates {
  camera: { id: number; state: string; no_signal?: { since: number; cause: string } }[];
}

const kCauses: Record<string, string> = {
  refused: "connection refused",
  unreachable: "unreachable",
  "unknown-host": "unknown host",
  "wrong-password": "wrong password",
  certificate: "untrusted certificate",
  stalled: "no picture in time",
};

/** In few words, for the user. */
export function causeText(cause: string): string {
  return kCauses[cause] ?? "failure";
}

export class SignalLosses {
  readonly #ask: () => Promise<CameraStates>;
  readonly #known = new Map<number, SignalLoss>();

  /** `ask` asks the server for the states as they are now. */
  constructor(ask: () => Promise<CameraStates>) {
    this.#ask = ask;
  }

  /** Asks the server. A failure changes nothing: the pictures themselves show that something is wrong. */
  async refresh(): Promise<void> {
    try {
      const { camera } = await this.#ask();
      this.#known.clear();
      for (const { id, no_signal: lost } of camera) {
        if (lost) this.#known.set(id, { sinceMs: lost.since * 1000, cause: causeText(lost.cause) });
      }
    } catch {
      // As before.
    }
  }

  /** Null for a camera that is well, that nobody asks for, or that a paired host has. */
  of({ id, server }: Camera): SignalLoss | null {
    return server ? null : (this.#known.get(id) ?? null);
  }
}
