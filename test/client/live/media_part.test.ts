// SPDX-License-Identifier: Apache-2.0
//
// What the headers of a live stream's parts tell.

import { audioConfig, captureOf } from "../../../client/src/live/media_part";
import { bytes } from "../support/bytes";

test.each([
  [{ "x-capture-time": "1764023456.123", "x-age-ms": "40" }, { capturedMs: 1764023456123, ageMs: 40 }],
  [{}, { capturedMs: 99, ageMs: 0 }],
  [{ "x-capture-time": "soon", "x-age-ms": "-5" }, { capturedMs: 99, ageMs: 0 }],
])("capture of %j", (headers, capture) => {
  expect(captureOf(new Map(Object.entries(headers)), 99)).toEqual(capture);
});

test.each([
  ["AAC", "1188", "mp4a.40.2", 48000, 1],
  ["AAC", "1210", "mp4a.40.2", 44100, 2],
  ["AAC", "1408", "mp4a.40.2", 16000, 1],
  ["AAC", "2b8a0800", "mp4a.40.5", 22050, 1],
  ["AAC", "17801f4008", "mp4a.40.2", 16000, 1],
  ["AAC", "", null, 0, 0],
  ["AAC", "1680", null, 0, 0],
  ["PCMU", "", "ulaw", 8000, 1],
  ["PCMA", "", "alaw", 8000, 1],
  ["OPUS", "", "opus", 48000, 2],
  ["OPUS", "4f70757348656164 0101 3801 80bb0000 0000 00", "opus", 48000, 1],
  ["G726", "", null, 0, 0],
])("sound %s with configuration %s: %s", (codec, extra, codecString, sampleRate, numberOfChannels) => {
  const config = audioConfig(codec, bytes(extra));
  if (codecString === null) expect(config).toBe(null);
  else expect(config).toMatchObject({ codec: codecString, sampleRate, numberOfChannels });
});
