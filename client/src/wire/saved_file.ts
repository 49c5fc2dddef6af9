// SPDX-License-Identifier: Apache-2.0
//
// Saves an answer of the server in a file that the user chooses, where the browser lets a page do so.
//
// Invariants    A file that was not received whole is not left behind: the browser keeps what is written apart until it
//               is closed.

import { Deadline } from "./deadline";

/** Nothing has come for so long. */
const kSilenceMs = 60_000;

/** What `showSaveFilePicker` gives. */
export interface ChosenFile {
  readonly name: string;
  createWritable(): Promise<WritableStream<Uint8Array>>;
  getFile(): Promise<{ readonly size: number }>;
  /** Not in all browsers. */
  remove?(): Promise<void>;
}

export type FilePicker = (options: { suggestedName: string }) => Promise<ChosenFile>;

/** Null where the browser has none: in Firefox, and on pages that are not secure. */
export function filePicker(): FilePicker | null {
  const { showSaveFilePicker: picker } = window as { showSaveFilePicker?: FilePicker };
  return picker ? (options) => picker.call(window, options) : null;
}

export interface SaveOptions {
  /** Ends request and file. */
  signal: AbortSignal;
  /** `totalBytes` is null where the server does not say it. */
  onProgress(receivedBytes: number, totalBytes: number | null): void;
}

/** Resolves once the file is complete. Rejects where it is not, and leaves no part of it. */
export async function saveAnswer(
  chosen: ChosenFile,
  open: (signal: AbortSignal) => Promise<Response>,
  { signal, onProgress }: SaveOptions,
): Promise<void> {
  const deadline = new Deadline(kSilenceMs, signal);
  let file: WritableStream<Uint8Array> | null = null;
  try {
    file = await chosen.createWritable();
    const answer = await open(deadline.signal);
    const totalBytes = lengthOf(answer);
    let receivedBytes = 0;
    const counter = new TransformStream<Uint8Array, Uint8Array>({
      transform(chunk, out) {
        deadline.extend();
        receivedBytes += chunk.length;
        onProgress(receivedBytes, totalBytes);
        out.enqueue(chunk);
      },
      flush() {
        // Closing may take the browser long, as it may check the file.
        deadline.suspend();
        if (totalBytes !== null && receivedBytes !== totalBytes) throw new TypeError("the answer was cut");
      },
    });
    if (!answer.body) throw new TypeError("the answer is empty");
    await answer.body.pipeThrough(counter).pipeTo(file, { signal: deadline.signal });
  } catch (error) {
    await file?.abort().catch(() => {});
    await removeEmpty(chosen);
    throw error;
  } finally {
    deadline.release();
  }
}

/** Null where it is not that of the file. */
function lengthOf({ headers }: Response): number | null {
  const length = headers.get("Content-Length");
  return length === null || headers.has("Content-Encoding") ? null : Number(length);
}

/** Choosing a file has made it, or has emptied it. */
async function removeEmpty(chosen: ChosenFile): Promise<void> {
  try {
    if ((await chosen.getFile()).size === 0) await chosen.remove?.();
  } catch {
    // The user has taken it away.
  }
}
