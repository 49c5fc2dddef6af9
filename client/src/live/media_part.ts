// SPDX-License-Identifier: Apache-2.0
//
// What a part of a live stream carries: a JPEG picture, or a piece of compressed video or audio.

import type { Part } from "../wire/multipart";
import type { VideoCodec } from "./annexb";

export interface Capture {
  /** Unix milliseconds, by the server's clock. */
  capturedMs: number;
  /** How old the picture was when it was sent. */
  ageMs: number;
}

export type MediaPart =
  | { kind: "jpeg" }
  | { kind: "video"; codec: VideoCodec; timestampUs: number }
  | { kind: "audio"; config: AudioDecoderConfig | null; codec: string; timestampUs: number };

/** Reads capture time and age of a part; a part without them counts as captured on arrival. */
export function captureOf(headers: ReadonlyMap<string, string>, nowMs: number): Capture {
  const captured = Number(headers.get("x-capture-time"));
  const age = Number(headers.get("x-age-ms"));
  return { capturedMs: captured > 0 ? Math.round(captured * 1000) : nowMs, ageMs: age > 0 ? age : 0 };
}

/** Null for a kind of part that this client does not know. */
export function mediaOf({ headers }: Part): MediaPart | null {
  const type = headers.get("content-type") ?? "image/jpeg";
  const timestampUs = Number(headers.get("x-timestamp")) || 0;
  const [medium, codec = ""] = type.split("/");
  if (/^image\/jpeg\b/i.test(type)) return { kind: "jpeg" };
  if (medium === "image" && (codec === "H264" || codec === "H265")) return { kind: "video", codec, timestampUs };
  if (medium !== "audio") return null;
  const config = audioConfig(codec, fromBase64(headers.get("x-audio-extra") ?? ""));
  return { kind: "audio", config, codec, timestampUs };
}

/** For AudioDecoder; null for a codec that is unknown, or whose configuration is missing or damaged. */
export function audioConfig(codec: string, extra: Uint8Array): AudioDecoderConfig | null {
  switch (codec) {
    case "PCMU":
      return { codec: "ulaw", sampleRate: 8000, numberOfChannels: 1 };
    case "PCMA":
      return { codec: "alaw", sampleRate: 8000, numberOfChannels: 1 };
    case "OPUS":
      // The configuration is an Ogg identification header; its tenth byte is the number of channels.
      return { codec: "opus", sampleRate: 48000, numberOfChannels: extra.length >= 19 ? extra[9]! : 2 };
    case "AAC":
      return aacConfig(extra);
    default:
      return null;
  }
}

const kAacRates = [96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050, 16000, 12000, 11025, 8000, 7350];
const kExplicitRate = 15;

/** AudioSpecificConfig: five bits of object type, four of rate (or 24 more with the rate itself), four of channels. */
function aacConfig(description: Uint8Array): AudioDecoderConfig | null {
  const bits = [...description.subarray(0, 8)].map((byte) => byte.toString(2).padStart(8, "0")).join("");
  const read = (from: number, count: number) => parseInt(bits.slice(from, from + count), 2);
  const rateIndex = read(5, 4);
  const isExplicit = rateIndex === kExplicitRate;
  const sampleRate = isExplicit ? read(9, 24) : kAacRates[rateIndex];
  const channels = read(isExplicit ? 33 : 9, 4);
  if (!sampleRate || !(channels >= 1 && channels <= 7)) return null;
  return { codec: `mp4a.40.${read(0, 5)}`, sampleRate, numberOfChannels: channels === 7 ? 8 : channels, description };
}

function fromBase64(text: string): Uint8Array {
  try {
    return Uint8Array.from(atob(text), (character) => character.charCodeAt(0));
  } catch {
    return new Uint8Array();
  }
}
