// SPDX-License-Identifier: Apache-2.0
//
// Plays what a jitter buffer holds; runs in the audio thread, apart from everything else of the client.

import { JitterBuffer, type SoundPiece } from "./jitter_buffer";

/** To the worklet: sound, or how much later to play it. */
export type SpeakerOrder = SoundPiece | { waitMs: number };

/** From the worklet: the stream time that leaves it at a time of its context; null while nothing does. */
export interface SpeakerReport {
  playedUs: number | null;
  contextTime: number;
}

// The audio thread has names of its own, of which TypeScript's library knows nothing.
declare const sampleRate: number;
declare const currentTime: number;
declare class AudioWorkletProcessor {
  readonly port: MessagePort;
}
declare function registerProcessor(name: string, processor: new () => AudioWorkletProcessor): void;

const kReportEverySeconds = 0.05;

class Speaker extends AudioWorkletProcessor {
  readonly #buffer = new JitterBuffer(sampleRate);
  #reportedAt = 0;

  constructor() {
    super();
    this.port.onmessage = ({ data }: MessageEvent<SpeakerOrder>) => {
      if ("waitMs" in data) this.#buffer.wait(data.waitMs);
      else this.#buffer.push(data);
    };
  }

  process(_inputs: Float32Array[][], outputs: Float32Array[][]): boolean {
    const playedUs = this.#buffer.pull(outputs[0] ?? []);
    if (currentTime - this.#reportedAt >= kReportEverySeconds) {
      this.#reportedAt = currentTime;
      const report: SpeakerReport = { playedUs, contextTime: currentTime };
      this.port.postMessage(report);
    }
    return true;
  }
}

registerProcessor("speaker", Speaker);
