// SPDX-License-Identifier: Apache-2.0
//
// Decodes recorded video, frame by frame, into pictures in the order in which they are shown.
//
// Why so        A decoder holds frames back until it knows their order, and takes some time: so it is fed until enough
//               pictures are ready, and its frames are known by their timestamps. Some decoders take frames for ever and
//               give no picture, or stand still: then the recording is played as pictures.

import { frameInfoOf, type VideoCodec } from "../live/annexb";
import { ServerError } from "../wire/server";

/** The server's status for what this client has to have as pictures. */
export const kNotStreamed = 406;
/** Each takes some megabytes. */
const kMaxReady = 3;
const kMaxQueued = 4;
/** Between two pictures; decoders hold up to 16 frames back. */
const kMaxHeld = 64;
const kMaxDecodeMs = 8_000;

/** What the server says of a frame. */
export interface FrameFacts {
  index: number;
  capturedMs: number;
  timestampUs: number;
}

export interface DecodedFrame extends FrameFacts {
  /** The caller of `take` closes it. */
  picture: VideoFrame;
}

export class VideoDecoding {
  readonly #changed: () => void;
  /** What is known of the frames in the decoder, by timestamp. */
  readonly #facts = new Map<number, FrameFacts>();
  readonly #ready: DecodedFrame[] = [];
  #decoder: VideoDecoder | null = null;
  #codecString = "";
  #failure: ServerError | null = null;
  /** How many frames the decoder was given since its last picture. */
  #held = 0;
  #stalled: ReturnType<typeof setTimeout> | undefined;
  #isFinishing = false;

  /** `changed` is called when a picture is ready, there is room again, or decoding has failed. */
  constructor(changed: () => void) {
    this.#changed = changed;
  }

  get hasRoom(): boolean {
    return this.#ready.length < kMaxReady && (this.#decoder?.decodeQueueSize ?? 0) < kMaxQueued;
  }

  /** Takes the next frame, the first one a key frame. Without facts it is not shown. Rejects with a ServerError. */
  async decode(codec: VideoCodec, timestampUs: number, data: Uint8Array, facts: FrameFacts | null): Promise<void> {
    const { isKey, codecString } = frameInfoOf(codec, data);
    if (isKey && codecString && codecString !== this.#codecString) await this.#configure(codecString);
    if (this.#failure) throw this.#failure;
    if (!this.#decoder) return;
    if (facts) this.#facts.set(timestampUs, facts);
    // The decoder dropped it.
    const [oldest] = this.#facts.keys();
    if (this.#facts.size > kMaxHeld) this.#facts.delete(oldest!);
    this.#held += 1;
    if (this.#held > kMaxHeld) throw undecodable();
    try {
      this.#decoder.decode(new EncodedVideoChunk({ type: isKey ? "key" : "delta", timestamp: timestampUs, data }));
      this.#restartStallTimer();
    } catch {
      throw undecodable();
    }
  }

  /** The next picture that is ready. Throws a ServerError where there will be none. */
  take(): DecodedFrame | undefined {
    if (this.#failure && this.#ready.length === 0) throw this.#failure;
    return this.#ready.shift();
  }

  /** Makes all pictures ready; the next frame must be a key frame. */
  async finish(): Promise<void> {
    if (this.#decoder?.state !== "configured") return;
    this.#isFinishing = true;
    this.#restartStallTimer();
    // Closing the decoder ends it as well.
    await this.#decoder.flush().catch(() => undefined);
    this.#isFinishing = false;
    clearTimeout(this.#stalled);
  }

  close(): void {
    clearTimeout(this.#stalled);
    if (this.#decoder && this.#decoder.state !== "closed") this.#decoder.close();
    this.#decoder = null;
    for (const { picture } of this.#ready.splice(0)) picture.close();
  }

  async #configure(codec: string): Promise<void> {
    const config = { codec };
    const { supported } = await VideoDecoder.isConfigSupported(config);
    if (!supported) throw new ServerError(kNotStreamed, 0, "This browser cannot play the recording.");
    await this.finish();
    if (this.#decoder?.state === "configured") this.#decoder.close();
    const decoder = new VideoDecoder({
      output: (picture) => this.#receive(picture),
      error: () => this.#fail(),
    });
    decoder.addEventListener("dequeue", () => {
      this.#restartStallTimer();
      this.#changed();
    });
    decoder.configure(config);
    this.#decoder = decoder;
    this.#codecString = codec;
  }

  /**
   * Restarts the timer that gives a stalled decoder up; it does not run out while finished pictures wait to be taken.
   */
  #restartStallTimer(): void {
    clearTimeout(this.#stalled);
    if (!this.#isFinishing && !this.#decoder?.decodeQueueSize) return;
    const giveUp = () => {
      if (this.#ready.length > 0 && !this.#isFinishing) return this.#restartStallTimer();
      if (this.#decoder?.state === "configured") this.#decoder.close();
      this.#fail();
    };
    this.#stalled = setTimeout(giveUp, kMaxDecodeMs);
  }

  #fail(): void {
    clearTimeout(this.#stalled);
    this.#failure = undecodable();
    this.#changed();
  }

  #receive(picture: VideoFrame): void {
    this.#held = 0;
    this.#restartStallTimer();
    const facts = this.#facts.get(picture.timestamp);
    this.#facts.delete(picture.timestamp);
    if (!facts || !this.#decoder) return picture.close();
    this.#ready.push({ ...facts, picture });
    this.#changed();
  }
}

function undecodable(): ServerError {
  return new ServerError(kNotStreamed, 0, "The recording cannot be decoded.");
}
