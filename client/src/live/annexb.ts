// SPDX-License-Identifier: Apache-2.0
//
// Reads of an H.264 or H.265 picture in Annex B form what a decoder has to be told: whether it is a key frame, and the
// name of the codec's variant.
//
// Why so        The stream does not mark key frames, and a decoder starts at none but a true one (IDR, or the random access
//               pictures of H.265); so the kinds of the units are looked at, which stand in clear in their first byte.

export type VideoCodec = "H264" | "H265";

export interface PictureFacts {
  isKey: boolean;
  /** As VideoDecoder wants it, out of the picture's own parameter set; null for a picture without one. */
  codecString: string | null;
}

const kH264 = { idr: 5, parameterSet: 7 };
const kH265 = { firstRandomAccess: 16, lastRandomAccess: 21, parameterSet: 33 };
/** Enough for what is read of a parameter set. */
const kReadBytes = 32;

export function factsOf(codec: VideoCodec, picture: Uint8Array): PictureFacts {
  const facts: PictureFacts = { isKey: false, codecString: null };
  for (let at = nextUnit(picture, 0); at < picture.length; at = nextUnit(picture, at)) {
    const first = picture[at]!;
    const kind = codec === "H264" ? first & 0x1f : (first >> 1) & 0x3f;
    if (codec === "H264") {
      facts.isKey ||= kind === kH264.idr;
      if (kind === kH264.parameterSet) facts.codecString = h264String(unescaped(picture, at));
      // What follows a slice of the picture is more slices, most of the bytes.
      if (kind >= 1 && kind <= kH264.idr) break;
    } else {
      facts.isKey ||= kind >= kH265.firstRandomAccess && kind <= kH265.lastRandomAccess;
      if (kind === kH265.parameterSet) facts.codecString = h265String(unescaped(picture, at));
      if (kind < 32) break;
    }
  }
  return facts;
}

/** Where the unit after the next start code begins; the length of the bytes when there is none. */
function nextUnit(bytes: Uint8Array, from: number): number {
  for (let at = bytes.indexOf(1, from + 2); at >= 0; at = bytes.indexOf(1, at + 1)) {
    if (bytes[at - 1] === 0 && bytes[at - 2] === 0) return at + 1;
  }
  return bytes.length;
}

/** The first bytes of a unit, without the threes that keep start codes out of it. */
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

/** Profile, constraints and level stand right behind the unit's byte. */
function h264String(unit: number[]): string | null {
  return unit.length < 4 ? null : `avc1.${unit.slice(1, 4).map(hex).join("")}`;
}

/** As ISO 14496-15 Annex E writes it. Behind the unit's two bytes and one more stands the profile, tier and level. */
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
