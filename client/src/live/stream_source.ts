// SPDX-License-Identifier: Apache-2.0
//
// Live pictures of a camera out of one endless multipart answer: JPEG pictures, or compressed picture and sound.
//
// Why so        An image element would show JPEG streams with less code, but tells neither when a picture was captured
//               nor that the stream has ended. Here each part is known, and a JPEG picture that comes while another is
//               being decoded replaces any that waits: a slow viewer sees fewer pictures, never older ones.
//
//               A stream that cannot be played here is closed, and still pictures are asked for in its place for a
//               while.

import { kVideoTypeMjpeg, type Camera } from "../wire/camera";
import { Deadline } from "../wire/deadline";
import { MultipartError, MultipartParser, boundaryOf, type Part } from "../wire/multipart";
import { ServerError, type Server } from "../wire/server";
import type { AudioPlayer } from "./audio_player";
import { captureOf, mediaOf } from "./media_part";
import type { Frame, LiveSource } from "./source";
import { missingDecoder, type Unplayable } from "./unplayable";
import { VideoPlayer } from "./video_player";

/** The profile of small pictures, of cameras that have one. */
const kSmallProfile = 1;
/** Longer than the server takes to notice that a camera sends nothing. */
const kMaxSilenceMs = 25_000;
/** No answer, no session, too busy: failures that do not depend on the profile. */
const kProfileIndependent = [0, 401, 503];
/** The longest that a timer can wait. */
const kMaxTimerMs = 2 ** 31 - 1;

/** Decodes one picture at a time, and of those that come meanwhile the newest only. */
export class NewestFrame {
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
      // A picture that cannot be decoded is dropped; if none can, the signal is lost by the clock.
      await this.#show(part).catch(() => undefined);
    }
    this.#busy = false;
  }
}

export class StreamSource implements LiveSource {
  readonly #server: Server;
  readonly #camera: Camera;
  readonly #small: boolean;
  readonly #stills: LiveSource;
  readonly #audio: AudioPlayer | null;
  #smallWorks = true;
  #unplayable: Unplayable | null;
  #retryAtMs = 0;

  /**
   * `small` asks for the small picture, if the camera has one; `stills` stands in for a stream that cannot be played.
   */
  constructor(server: Server, camera: Camera, small: boolean, stills: LiveSource, audio: AudioPlayer | null = null) {
    this.#server = server;
    this.#camera = camera;
    this.#small = small;
    this.#stills = stills;
    this.#audio = audio;
    this.#unplayable = null;
    const missing = camera.video_type === kVideoTypeMjpeg ? null : missingDecoder();
    if (missing) this.#markUnplayable(missing);
  }

  /** Why still pictures are shown, or null while the stream is worth a try. */
  get unplayable(): Unplayable | null {
    return performance.now() < this.#retryAtMs ? this.#unplayable : null;
  }

  get lostAfterMs(): number {
    return this.unplayable ? this.#stills.lostAfterMs : 5_000;
  }

  get pollIntervalMs(): number {
    return this.unplayable ? this.#stills.pollIntervalMs : 0;
  }

  async run(show: (frame: Frame) => void, signal: AbortSignal): Promise<void> {
    if (!this.unplayable) return this.#play(show, signal);
    const untilRetry = new Deadline(Math.min(this.#retryAtMs - performance.now(), kMaxTimerMs), signal);
    try {
      await this.#stills.run(show, untilRetry.signal);
    } finally {
      untilRetry.release();
    }
  }

  #markUnplayable(unplayable: Unplayable): void {
    this.#unplayable = unplayable;
    this.#retryAtMs = performance.now() + unplayable.retryMs;
  }

  async #play(show: (frame: Frame) => void, signal: AbortSignal): Promise<void> {
    const trySmall = this.#small && this.#smallWorks;
    let pictures = 0;
    const count = () => (pictures += 1);
    if (trySmall) {
      const failure = await this.#stream(kSmallProfile, show, count, signal).catch((error: ServerError) => error);
      const hopeless = failure instanceof ServerError && kProfileIndependent.includes(failure.status);
      if (pictures > 0 || signal.aborted || hopeless) {
        if (failure instanceof ServerError) throw failure;
        return;
      }
    }
    try {
      await this.#stream(null, show, count, signal);
    } finally {
      // The default profile works where the small one does not: ask for it first from now on.
      if (trySmall && pictures > 0) this.#smallWorks = false;
    }
  }

  async #stream(profile: number | null, show: (frame: Frame) => void, count: () => void, owner: AbortSignal) {
    const deadline = new Deadline(kMaxSilenceMs, owner);
    const pictures = new NewestFrame(async (part) => {
      const capture = captureOf(part.headers, Date.now());
      const image = await createImageBitmap(new Blob([part.body], { type: "image/jpeg" }));
      if (deadline.signal.aborted) return image.close();
      show({ image, ...capture });
    });
    const giveUp = (unplayable: Unplayable) => {
      this.#markUnplayable(unplayable);
      deadline.release();
    };
    const video = new VideoPlayer(show, giveUp, this.#audio);
    try {
      const answer = await this.#server.live(this.#camera, profile, deadline.signal);
      const boundary = boundaryOf(answer.headers.get("Content-Type"));
      if (!answer.body || boundary === null) throw new ServerError(502, 0, "The server sent no pictures.");
      const parser = new MultipartParser(boundary, (part) => {
        if (deadline.signal.aborted) return;
        deadline.extend();
        if (part.body.length === 0) return;
        count();
        this.#deliver(part, pictures, video);
      });
      const reader = answer.body.getReader();
      for (let read = await reader.read(); !read.done; read = await reader.read()) parser.push(read.value);
    } catch (error) {
      if (owner.aborted || this.unplayable) return;
      throw streamError(error);
    } finally {
      video.close();
      deadline.release();
    }
  }

  #deliver(part: Part, pictures: NewestFrame, video: VideoPlayer): void {
    const media = mediaOf(part);
    if (media?.kind === "jpeg") pictures.offer(part);
    else if (media?.kind === "audio") this.#audio?.take(media, part.body);
    else if (media) video.take(media.codec, media.timestampUs, part.body, captureOf(part.headers, Date.now()));
  }
}

function streamError(error: unknown): ServerError {
  if (error instanceof ServerError) return error;
  if (error instanceof MultipartError) return new ServerError(502, 0, "The stream is damaged.");
  return new ServerError(0, 0, "The connection was lost.");
}
