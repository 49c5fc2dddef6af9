// SPDX-License-Identifier: Apache-2.0
//
// Where live pictures come from; each way of getting them is one implementation.

export interface Frame {
  /** The receiver of the frame draws it and closes it. */
  readonly image: ImageBitmap | VideoFrame;
  /** Unix milliseconds of the capture, by the server's clock. */
  readonly capturedMs: number;
  /** How old the picture was when it was sent. */
  readonly ageMs: number;
}

export interface LiveSource {
  /** Without a new picture for this long the signal counts as lost. */
  readonly lostAfterMs: number;
  /** For a source that polls for pictures; 0 for a stream. */
  readonly pollIntervalMs: number;
  /**
   * Shows pictures until `signal` is aborted or the connection ends (both resolve) or fails (rejects with a
   * ServerError). May be called again after that.
   */
  run(show: (frame: Frame) => void, signal: AbortSignal): Promise<void>;
}
