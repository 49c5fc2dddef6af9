// SPDX-License-Identifier: Apache-2.0
//
// Where the pictures of a tile come from. Each way of getting them is one LiveSource; a tile knows no more than this.

export interface Frame {
  /** Whoever receives the frame draws it and closes it. */
  readonly image: ImageBitmap | VideoFrame;
  /** Unix milliseconds of the capture, by the server's clock. */
  readonly capturedMs: number;
  /** How old the picture was when it was sent. */
  readonly ageMs: number;
}

export interface LiveSource {
  /** Without a new picture for so long the signal counts as lost. */
  readonly lostAfterMs: number;
  /** A picture every so many milliseconds for a source that polls; 0 for a stream. */
  readonly everyMs: number;
  /**
   * Shows pictures until `signal` is aborted or the connection ends (both resolve) or fails (rejects with a ServerError).
   * May be called again after that.
   */
  run(show: (frame: Frame) => void, signal: AbortSignal): Promise<void>;
}
