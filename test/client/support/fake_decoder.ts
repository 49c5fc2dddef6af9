// SPDX-License-Identifier: Apache-2.0
//
// A browser's decoder of video, whose pictures have nothing but their timestamps.

export class FakePicture {
  static open = 0;
  constructor(readonly timestamp: number) {
    FakePicture.open += 1;
  }
  close(): void {
    FakePicture.open -= 1;
  }
}

interface Chunk {
  type: string;
  timestamp: number;
}

/** Gives the frames that it has decoded, but for the last `kHeldBack` before a flush. */
const kHeldBack = 2;

export class FakeDecoder extends EventTarget {
  static isSupported = true;
  /** The timestamp, in the stream, of a frame that cannot be decoded. */
  static brokenUs = NaN;
  /** It gives no picture: it takes all frames, also when it is flushed, or none, or ends no flush. */
  static silence: "takes" | "stands" | "flushes" | null = null;
  static async isConfigSupported(): Promise<{ supported: boolean }> {
    return { supported: FakeDecoder.isSupported };
  }

  state = "unconfigured";
  decodeQueueSize = 0;
  readonly #callbacks: { output: (frame: FakePicture) => void; error: () => void };
  #held: number[] = [];
  #hasKey = false;

  constructor(callbacks: FakeDecoder["callbacks"]) {
    super();
    this.#callbacks = callbacks;
  }

  configure(): void {
    this.state = "configured";
  }

  decode({ type, timestamp }: Chunk): void {
    this.#hasKey ||= type === "key";
    if (this.state !== "configured" || !this.#hasKey) throw new Error("not configured, or no key frame");
    this.decodeQueueSize += 1;
    if (FakeDecoder.silence === "stands") return;
    setTimeout(() => {
      this.decodeQueueSize -= 1;
      if (this.state !== "configured") return;
      if (timestamp === FakeDecoder.brokenUs) {
        this.state = "closed";
        return this.#callbacks.error();
      }
      if (FakeDecoder.silence !== "takes") this.#held.push(timestamp);
      if (this.#held.length > kHeldBack) this.#callbacks.output(new FakePicture(this.#held.shift()!));
      this.dispatchEvent(new Event("dequeue"));
    });
  }

  async flush(): Promise<void> {
    while ((this.decodeQueueSize > 0 || FakeDecoder.silence === "flushes") && this.state === "configured") await new Promise((resolve) => setTimeout(resolve));
    if (this.state !== "configured") throw new Error("closed");
    for (const timestamp of this.#held.splice(0)) this.#callbacks.output(new FakePicture(timestamp));
  }

  close(): void {
    this.state = "closed";
  }

  declare callbacks: { output: (frame: FakePicture) => void; error: () => void };
}

/** Lets the page have it, and undoes what a test has changed. */
export function stubDecoder(): void {
  FakeDecoder.isSupported = true;
  FakeDecoder.brokenUs = NaN;
  FakeDecoder.silence = null;
  vi.stubGlobal("VideoDecoder", FakeDecoder);
  vi.stubGlobal(
    "EncodedVideoChunk",
    class {
      constructor(chunk: Chunk) {
        Object.assign(this, chunk);
      }
    },
  );
}
