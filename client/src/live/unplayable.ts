// SPDX-License-Identifier: Apache-2.0
//
// Why a camera's stream cannot be played here, so that still pictures are shown in its place.

export interface Unplayable {
  /** For the user, without a full stop. */
  reason: string;
  /** How long to wait before the stream is tried again. */
  retryMs: number;
  /** Where the stream can be played. */
  remedy?: { label: string; address: string };
}

const kUsualTlsPort = "8443";

/** The same page over HTTPS, at the port that the web server put into the page. */
export function secureAddress(page: Location = location): string {
  const port = document.querySelector<HTMLMetaElement>("meta[name=tls-port]")?.content || kUsualTlsPort;
  return `https://${page.hostname}${port === "443" ? "" : `:${port}`}${page.pathname}${page.hash}`;
}

/** Why this browser can decode no stream at all; null where it can. */
export function missingDecoder(): Unplayable | null {
  if (typeof VideoDecoder !== "undefined") return null;
  if (isSecureContext) return { reason: "This browser is too old to play live video", retryMs: Infinity };
  const remedy = { label: "Use https", address: secureAddress() };
  return { reason: "Live video needs HTTPS", retryMs: Infinity, remedy };
}

export const kUndecodable: Unplayable = { reason: "The stream cannot be decoded", retryMs: 60_000 };

export function unsupported(codec: "H264" | "H265"): Unplayable {
  return { reason: `This browser cannot play ${codec === "H264" ? "this kind of H.264" : "H.265"}`, retryMs: 300_000 };
}
