// SPDX-License-Identifier: Apache-2.0
//
// Reads from an H.264 or H.265 frame in Annex B format what a decoder has to be told: whether it is a key frame, and
// the codec string.
//
// Why so        The stream does not mark key frames, and a decoder can only start at one (IDR, or the random access
//               frames of H.265); so the types of the NAL units are read from their first byte.

export type VideoCodec = "H264" | "H265";

export interface FrameInfo {
  isKey: boolean;
  /** For VideoDecoder, from the frame's own sequence parameter set; null for a frame without one. */
  codecString: string | null;
}

const kH264 = { idr: 5, parameterSet: 7 };
const kH265 = { firstRandomAccess: 16, lastRandomAccess: 21, parameterSet: 33 };
/** As much as is read of a parameter set. */
const kReadBytes = 32;

export function frameInfoOf(codec: VideoCodec, frame: Uint8Array): FrameInfo {
  const info: FrameInfo = { isKey: false, codecString: null };
  for (let at = nextUnit(frame, 0); at < frame.length; at = nextUnit(frame, at)) {
    const first = frame[at]!;
    const type = codec === "H264" ? first & 0x1f : (first >> 1) & 0x3f;
    if (codec === "H264") {
      info.isKey ||= type === kH264.idr;
      if (type === kH264.parameterSet) info.codecString = h264String(unescaped(frame, at));
      // What follows a slice of the frame is more slices, most of the bytes.
      if (type >= 1 && type <= kH264.idr) break;
    } else {
      info.isKey ||= type >= kH265.firstRandomAccess && type <= kH265.lastRandomAccess;
      if (type === kH265.parameterSet) info.codecString = h265String(unescaped(frame, at));
      if (type < 32) break;
    }
  }
  return info;
}

/** Where the NAL unit after the next start code begins; the length of the bytes when there is none. */
function nextUnit(bytes: Uint8Array, from: number): number {
  for (let at = bytes.indexOf(1, from + 2); at >= 0; at = bytes.indexOf(1, at + 1)) {
    if (bytes[at - 1] === 0 && bytes[at - 2] === 0) return at + 1;
  }
  return bytes.length;
}

/** The first bytes of a NAL unit, without its emulation prevention bytes. */
function unescaped(bytes: Uint8Array, at: number): number[] {
  const plain: number[] = [];
  for (let zeros = 0; plain.length < kReadBytes && at < bytes.length; at += 1) {
    const byte = bytes[at]!;
    if (zeros >= 2 && byte === 3) zeros = 0;
    else {
      zeros = byte === 0 ? zeros + 1 : 0;
      plain.push(byte);
    }
  }
  return plain;
}

const hex = (byte: number) => byte.toString(16).padStart(2, "0");

/** Profile, constraints and level follow the header of one byte. */
function h264String(unit: number[]): string | null {
  return unit.length < 4 ? null : `avc1.${unit.slice(1, 4).map(hex).join("")}`;
}

/** In the format of ISO 14496-15 Annex E. Profile, tier and level follow the header of two bytes and one more. */
function h265String(unit: number[]): string | null {
  if (unit.length < 15) return null;
  const profile = unit[3]!;
  const space = ["", "A", "B", "C"][profile >> 6]!;
  const compatibility = unit.slice(4, 8).reduce((bits, byte) => bits * 256 + byte, 0);
  let reversed = 0;
  for (let bit = 0; bit < 32; bit += 1) reversed = reversed * 2 + (Math.floor(compatibility / 2 ** bit) % 2);
  const tier = profile & 0x20 ? "H" : "L";
  const constraints = unit.slice(8, 14);
  while (constraints.at(-1) === 0) constraints.pop();
  const parts = [`${space}${profile & 0x1f}`, reversed.toString(16), `${tier}${unit[14]!}`, ...constraints.map(hex)];
  return `hev1.${parts.join(".").toUpperCase()}`;
}
