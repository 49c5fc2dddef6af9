// SPDX-License-Identifier: Apache-2.0
//
// Live pictures of an MJPEG camera out of one endless multipart answer.
//
// Why so        An image element would show the stream with less code, but tells neither when a picture was captured nor
//               that the stream has ended. Here each part is known, and one that comes while another is being decoded
//               takes the place of any that waits: a slow viewer sees fewer pictures, never older ones.

import { Deadline } from "../wire/deadline";
import { MultipartError, MultipartParser, boundaryOf, type Part } from "../wire/multipart";
import { ServerError, type Server } from "../wire/server";
import type { Frame, LiveSource } from "./source";

/** The small picture of cameras that have one. */
const kSmallProfile = 1;
/** Longer than the server takes to find out that a camera is silent. */
const kSilenceLimitMs = 25_000;
/** No answer, no session, too busy: failures that another profile would meet as well. */
const kNotTheProfile = [0, 401, 503];

/** Reads capture time and age of a part; a part without them counts as captured on arrival. */
export function captureOf(headers: ReadonlyMap<string, string>, nowMs: number): { capturedMs: number; ageMs: number } {
  const captured = Number(headers.get("x-capture-time"));
  const age = Number(headers.get("x-age-ms"));
  return { capturedMs: captured > 0 ? Math.round(captured * 1000) : nowMs, ageMs: age > 0 ? age : 0 };
}

/** Decodes one picture at a time, and of those that come meanwhile the newest only. */
export class NewestPicture {
  #waiting: Part | null = null;
  #busy = false;
  readonly #show: (part: Part) => Promise<void>;

  constructor(show: (part: Part) => Promise<void>) {
    this.#show = show;
  }

  offer(part: Part): void {
    this.#waiting = part;
    if (!this.#busy) void this.#drain();
  }

  async #drain(): Promise<void> {
    this.#busy = true;
    while (this.#waiting) {
      const part = this.#waiting;
      this.#waiting = null;
      // A picture that cannot be decoded is left out; if none can, the signal is lost by the clock.
      await this.#show(part).catch(() => undefined);
    }
    this.#busy = false;
  }
}

export class MjpegSource implements LiveSource {
  readonly lostAfterMs = 5_000;
  readonly everyMs = 0;
  readonly #server: Server;
  readonly #cameraId: number;
  readonly #small: boolean;
  #smallWorks = true;

  /** `small` asks for the small picture, if the camera has one. */
  constructor(server: Server, cameraId: number, small: boolean) {
    this.#server = server;
    this.#cameraId = cameraId;
    this.#small = small;
  }

  async run(show: (frame: Frame) => void, signal: AbortSignal): Promise<void> {
    const trySmall = this.#small && this.#smallWorks;
    let pictures = 0;
    const count = () => (pictures += 1);
    if (trySmall) {
      const failure = await this.#stream(kSmallProfile, show, count, signal).catch((error: ServerError) => error);
      const hopeless = failure instanceof ServerError && kNotTheProfile.includes(failure.status);
      if (pictures > 0 || signal.aborted || hopeless) {
        if (failure instanceof ServerError) throw failure;
        return;
      }
    }
    try {
      await this.#stream(null, show, count, signal);
    } finally {
      // The usual picture came where the small one did not: ask for it first from now on.
      if (trySmall && pictures > 0) this.#smallWorks = false;
    }
  }

  async #stream(profile: number | null, show: (frame: Frame) => void, count: () => void, owner: AbortSignal) {
    const deadline = new Deadline(kSilenceLimitMs, owner);
    try {
      const answer = await this.#server.live(this.#cameraId, profile, deadline.signal);
      const boundary = boundaryOf(answer.headers.get("Content-Type"));
      if (!answer.body || boundary === null) throw new ServerError(502, 0, "The server sent no pictures.");
      const newest = new NewestPicture(async (part) => {
        const capture = captureOf(part.headers, Date.now());
        const image = await createImageBitmap(new Blob([part.body], { type: "image/jpeg" }));
        if (deadline.signal.aborted) return image.close();
        show({ image, ...capture });
      });
      const parser = new MultipartParser(boundary, (part) => {
        deadline.extend();
        if (part.body.length === 0) return;
        count();
        newest.offer(part);
      });
      const reader = answer.body.getReader();
      for (let read = await reader.read(); !read.done; read = await reader.read()) parser.push(read.value);
    } catch (error) {
      if (owner.aborted) return;
      throw streamError(error);
    } finally {
      deadline.release();
    }
  }
}

function streamError(error: unknown): ServerError {
  if (error instanceof ServerError) return error;
  if (error instanceof MultipartError) return new ServerError(502, 0, "The stream is damaged.");
  return new ServerError(0, 0, "The connection was lost.");
}
