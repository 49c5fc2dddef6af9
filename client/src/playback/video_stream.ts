// SPDX-License-Identifier: Apache-2.0
//
// Reads a recording as it was recorded: decodes its video, and hands its sound on.
//
// Why so        The next frames are decoded while one waits to be shown, yet only a few of them, and what is not
//               decoded is not read: so a slow screen holds the server back through the connection. A picture that
//               stays for more than a second is told once more for each, as the server does with pictures.

import { mediaOf } from "../live/media_part";
import { Deadline } from "../wire/deadline";
import { MultipartError, MultipartParser, boundaryOf, type Part } from "../wire/multipart";
import { ServerError } from "../wire/server";
import type { RecordedFrame } from "./frame_stream";
import type { RecordedSound } from "./recorded_sound";
import { kMaxFrameMs } from "./shown_frame";
import { kNotStreamed, VideoDecoding, type DecodedFrame, type FrameFacts } from "./video_decoding";

/** Video of some seconds; more is left on the connection. */
const kMaxParts = 50;
/** The server ends a recording earlier when its camera sends nothing. */
const kMaxSilenceMs = 20_000;

type Take = (frame: RecordedFrame) => Promise<boolean>;

/**
 * Opens a stream of that rate and hands its frames from the index `from` on to `take` until that returns false or the
 * stream ends; resolves with whether it ended after the last frame. Rejects with a ServerError: of status 0 when the
 * connection was lost, `kNotStreamed` for what has to be played as pictures from here on. Ends at once when `owner` is
 * aborted.
 */
export async function readVideo(
  open: (signal: AbortSignal) => Promise<Response>,
  { from, rate }: { from: number; rate: number },
  take: Take,
  sound: RecordedSound,
  owner: AbortSignal,
): Promise<boolean> {
  const deadline = new Deadline(kMaxSilenceMs * Math.max(1, -rate), owner);
  const leaveSound = sound.begin(rate);
  const stream = new VideoStream(from, take, sound, deadline);
  try {
    const answer = await open(deadline.signal);
    const boundary = boundaryOf(answer.headers.get("Content-Type"));
    if (!answer.body || boundary === null) throw new ServerError(kNotStreamed, 0, "The server sent no video.");
    return await stream.play(answer.body.getReader(), boundary, owner);
  } catch (error) {
    if (owner.aborted) return false;
    if (error instanceof ServerError) throw error;
    if (error instanceof MultipartError) throw new ServerError(kNotStreamed, 0, "The stream is damaged.");
    throw new ServerError(0, 0, "The connection was lost.");
  } finally {
    stream.close();
    leaveSound();
    deadline.release();
  }
}

class VideoStream {
  readonly #from: number;
  readonly #take: Take;
  readonly #sound: RecordedSound;
  readonly #deadline: Deadline;
  readonly #decoding = new VideoDecoding(() => this.#wake());
  /** Video that is not decoded yet. */
  readonly #parts: Part[] = [];
  #wake: () => void = () => undefined;
  #isReading = false;
  #isDone = false;
  /** Why nothing more will be read. */
  #failure: unknown = null;
  #last: FrameFacts | null = null;

  constructor(from: number, take: Take, sound: RecordedSound, deadline: Deadline) {
    this.#from = from;
    this.#take = take;
    this.#sound = sound;
    this.#deadline = deadline;
  }

  async play(reader: ReadableStreamDefaultReader<Uint8Array>, boundary: string, owner: AbortSignal): Promise<boolean> {
    const parser = new MultipartParser(boundary, (part) => this.#receive(part));
    while (!owner.aborted) {
      const changed = new Promise<void>((resolve) => (this.#wake = resolve));
      const leave = () => this.#wake();
      while (this.#parts.length > 0 && this.#decoding.hasRoom) await this.#decode(this.#parts.shift()!);
      if (!this.#isReading && !this.#isDone && this.#parts.length < kMaxParts) void this.#read(reader, parser);
      const isAtEnd = this.#isDone && this.#parts.length === 0;
      if (isAtEnd) await this.#decoding.finish();
      const frame = this.#decoding.take();
      if (frame) {
        // A frame may wait until it is due, and the server with what comes after it.
        this.#deadline.suspend();
        if (!(await this.#show(frame, owner))) return false;
        if (this.#isReading) this.#deadline.extend();
      } else if (isAtEnd) {
        if (this.#failure) throw this.#failure;
        return parser.hasEnded;
      } else {
        owner.addEventListener("abort", leave);
        await changed;
        owner.removeEventListener("abort", leave);
      }
    }
    return false;
  }

  close(): void {
    this.#decoding.close();
  }

  async #read(reader: ReadableStreamDefaultReader<Uint8Array>, parser: MultipartParser): Promise<void> {
    this.#isReading = true;
    this.#deadline.extend();
    try {
      const { done, value } = await reader.read();
      if (done) this.#isDone = true;
      else parser.push(value);
    } catch (error) {
      this.#failure ??= error;
      this.#isDone = true;
    }
    this.#deadline.suspend();
    this.#isReading = false;
    this.#wake();
  }

  #receive(part: Part): void {
    if (part.headers.get("content-type") === "text/plain") {
      this.#failure = new ServerError(kNotStreamed, 0, new TextDecoder().decode(part.body));
      return;
    }
    const media = mediaOf(part);
    if (media?.kind === "audio") this.#sound.take(media, part.body);
    else if (media?.kind === "video") this.#parts.push(part);
  }

  async #decode(part: Part): Promise<void> {
    const media = mediaOf(part);
    if (media?.kind !== "video") return;
    const { codec, timestampUs } = media;
    await this.#decoding.decode(codec, timestampUs, part.body, this.#factsOf(part, timestampUs));
  }

  /** Null for a frame that is not shown. */
  #factsOf({ headers }: Part, timestampUs: number): FrameFacts | null {
    const index = parseInt(headers.get("x-frame") ?? "", 10);
    if (!(index >= this.#from)) return null;
    const capturedMs = Math.round(Number(headers.get("x-capture-time")) * 1000);
    if (!(capturedMs > 0)) throw new MultipartError("a picture without its time");
    return { index, capturedMs, timestampUs };
  }

  async #show({ picture, ...facts }: DecodedFrame, owner: AbortSignal): Promise<boolean> {
    try {
      const last = this.#last;
      const stays = last && facts.capturedMs - last.capturedMs > kMaxFrameMs;
      for (let index = (last?.index ?? 0) + 1; stays && index < facts.index; index += 1) {
        if (!(await this.#take({ index, capturedMs: last.capturedMs, picture: null })) || owner.aborted) return false;
      }
      this.#last = facts;
      const goesOn = await this.#take({ index: facts.index, capturedMs: facts.capturedMs, picture });
      if (goesOn) this.#sound.follow(facts.timestampUs);
      return goesOn && !owner.aborted;
    } finally {
      picture.close();
    }
  }
}
