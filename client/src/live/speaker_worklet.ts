// SPDX-License-Identifier: Apache-2.0
//
// Plays what a jitter buffer holds; runs in the audio thread, separate from the rest of the client.

import { JitterBuffer, type AudioChunk } from "./jitter_buffer";

/** To the worklet: audio to play, or by how much more to delay it. */
export type SpeakerCommand = AudioChunk | { postponeMs: number };

/** From the worklet: the stream time that it plays at a time of its context; null while it plays nothing. */
export interface SpeakerReport {
  playedUs: number | null;
  contextTime: number;
}

// Globals of the audio thread, which TypeScript's library does not declare.
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
    this.port.onmessage = ({ data }: MessageEvent<SpeakerCommand>) => {
      if ("postponeMs" in data) this.#buffer.postpone(data.postponeMs);
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
