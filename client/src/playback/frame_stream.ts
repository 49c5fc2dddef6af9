// SPDX-License-Identifier: Apache-2.0
//
// Reads the frames of a recording's stream: of each a part with its number, then one with the picture.
//
// Why so        The next frames are read only when the last was taken. So a slow screen holds the server back through
//               the connection, and the number that is shown is that of the frame on the screen.

import { Deadline } from "../wire/deadline";
import { MultipartError, MultipartParser, boundaryOf, type Part } from "../wire/multipart";
import { ServerError } from "../wire/server";

/** At rate 1 a frame comes at least every second; opening a stream takes longer where the server is busy. */
export const kMaxSilenceMs = 8_000;

export interface RecordedFrame {
  index: number;
  /** Unix milliseconds at which the camera's picture was taken in. */
  capturedMs: number;
  /** A JPEG, or what was decoded, until the frame is taken; null for the one before, which stays. */
  picture: Blob | VideoFrame | null;
}

/**
 * Opens a stream and hands its frames to `take` until that returns false, the stream ends (both resolve) or fails
 * (rejects with a ServerError, of status 0 when the connection was lost or nothing came for `maxSilenceMs`). Ends at
 * once when `owner` is aborted.
 */
export async function readFrames(
  open: (signal: AbortSignal) => Promise<Response>,
  take: (frame: RecordedFrame) => Promise<boolean>,
  owner: AbortSignal,
  maxSilenceMs: number,
): Promise<void> {
  const deadline = new Deadline(maxSilenceMs, owner);
  try {
    const answer = await open(deadline.signal);
    const boundary = boundaryOf(answer.headers.get("Content-Type"));
    if (!answer.body || boundary === null) throw new ServerError(502, 0, "The server sent no pictures.");
    const parts: Part[] = [];
    const parser = new MultipartParser(boundary, (part) => parts.push(part));
    const reader = answer.body.getReader();
    let index = -1;
    for (let read = await reader.read(); !read.done; read = await reader.read()) {
      deadline.extend();
      parser.push(read.value);
      for (const part of parts.splice(0)) {
        if (owner.aborted) return;
        // A frame may wait until it is due.
        deadline.suspend();
        if (!/^image\//.test(part.headers.get("content-type") ?? "")) index = indexOf(part, index);
        else if (!(await take(frameOf(part, index)))) return;
        deadline.extend();
      }
    }
  } catch (error) {
    if (owner.aborted) return;
    if (error instanceof ServerError) throw error;
    if (error instanceof MultipartError) throw new ServerError(502, 0, "The stream is damaged.");
    throw new ServerError(0, 0, "The connection was lost.");
  } finally {
    deadline.release();
  }
}

function indexOf(part: Part, before: number): number {
  const index = parseInt(new TextDecoder().decode(part.body), 10);
  return Number.isNaN(index) ? before : index;
}

function frameOf({ headers, body }: Part, index: number): RecordedFrame {
  const capturedMs = Math.round(Number(headers.get("x-capture-time")) * 1000);
  if (!(capturedMs > 0)) throw new MultipartError("a picture without its time");
  return { index, capturedMs, picture: new Blob([body], { type: "image/jpeg" }) };
}
