// SPDX-License-Identifier: Apache-2.0
//
// Addresses of cameras: what is wrong with one, and one with another path.

/** The address with this path; what is missing before it is there as a pattern. */
export function withPath(address: string, path: string): string {
  const [, scheme = "rtsp://", host = ""] = /^([a-z]+:\/\/)?([^/]*)/i.exec(address.trim()) ?? [];
  return `${scheme}${host}${path.startsWith("/") ? "" : "/"}${path}`;
}

/** A sentence for the user; empty where nothing is wrong. */
export function addressProblem(address: string): string {
  if (!/^(rtsp|https?):\/\/[^/\s]+/i.test(address)) {
    return "The address must begin with rtsp://, http:// or https://, then the camera's host name or IP address.";
  }
  if (/^[a-z]+:\/\/[^/]*@/i.test(address)) return "Please enter account and password in their own fields.";
  return /\s/.test(address) ? "The address contains a space." : "";
}
