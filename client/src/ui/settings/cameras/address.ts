// SPDX-License-Identifier: Apache-2.0
//
// Addresses of cameras: what is wrong with one, and one with another path.

/** How addresses begin of the kinds of camera that the server reads over the network; the usual one first. */
const kSchemes = ["rtsp://", "http://", "https://"] as const;
const kBeginning = new RegExp(`^(${kSchemes.join("|")})[^/\\s]+`, "i");

/** The address with this path; what is missing before it is there as a pattern. */
export function withPath(address: string, path: string): string {
  const [, scheme = kSchemes[0], host = ""] = /^([a-z]+:\/\/)?([^/]*)/i.exec(address.trim()) ?? [];
  return `${scheme}${host}${path.startsWith("/") ? "" : "/"}${path}`;
}

/** A sentence for the user; empty where nothing is wrong. */
export function addressProblem(address: string): string {
  if (!kBeginning.test(address)) {
    const list = `${kSchemes.slice(0, -1).join(", ")} or ${kSchemes.at(-1)}`;
    return `The address must begin with ${list}, then the camera's host name or IP address.`;
  }
  if (/^[a-z]+:\/\/[^/]*@/i.test(address)) return "Please enter account and password in their own fields.";
  return /\s/.test(address) ? "The address contains a space." : "";
}
