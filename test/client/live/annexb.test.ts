// SPDX-License-Identifier: Apache-2.0
//
// Key frames and codec strings of H.264 and H.265.

import { frameInfoOf, type VideoCodec } from "../../../client/src/live/annexb";
import { bytes } from "../support/bytes";

// The parameter sets are those that x264 and x265 write; the other profiles follow the tables of ISO 14496-15.
const kSps = "00000001 674d401fda014016ec04400000030040";
const kHevcSps = "00000001 420101 01600000030090000003000003003f a0050201";

test.each<[string, VideoCodec, string, boolean, string | null]>([
  ["a key frame behind delimiter and parameter sets", "H264", `00000001 0910 ${kSps} 00000001 68ef 00000001 6588`, true, "avc1.4d401f"],
  ["short start codes", "H264", "000001 6764001f 000001 68ef 000001 6588", true, "avc1.64001f"],
  ["a slice that builds on others", "H264", "00000001 419a", false, null],
  ["parameter sets alone are no key frame", "H264", `${kSps} 00000001 419a`, false, "avc1.4d401f"],
  ["what looks like a key frame within a slice", "H264", "00000001 419a000001 65", false, null],
  ["nothing", "H264", "", false, null],
  ["no unit at all", "H264", "00000000000002", false, null],
  ["IDR of H.265", "H265", `00000001 460110 ${kHevcSps} 00000001 2601af`, true, "hev1.1.6.L63.90"],
  ["clean random access of H.265", "H265", "00000001 2a01af", true, null],
  ["a leading picture of H.265", "H265", "00000001 1201af", false, null],
  ["ten bits, high tier", "H265", "000001 420101 22200000030 0b0000003000003 0099a0", false, "hev1.2.4.H153.B0"],
])("annex B: %s", (_name, codec, hex, isKey, codecString) => {
  expect(frameInfoOf(codec, bytes(hex))).toEqual({ isKey, codecString });
});
