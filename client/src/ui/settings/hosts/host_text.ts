// SPDX-License-Identifier: Apache-2.0
//
// Hosts in words, and addresses as they are typed.

import type { HostDenial, HostLoss } from "../../../wire/hosts";

const kUsualPort = 8443;

/**
 * "https://nvr:443/#settings", "nvr:443", "[2001:db8::1]:443" or a plain address; `port` where none is typed with it.
 */
export function hostAndPort(typed: string, port: number | null): { address: string; port: number } {
  const host = typed.trim().replace(/^https?:\/\//i, "").replace(/[/?#].*$/, "");
  const [, inBrackets, plain, ownPort] = /^(?:\[(.*)\]|([^:]*))(?::(\d+))?$/.exec(host) ?? [];
  return { address: inBrackets ?? plain ?? host, port: ownPort ? Number(ownPort) : (port ?? kUsualPort) };
}

/** The address at which others reach the page's own host; null where the page only knows a loopback address. */
export function ownAddress(page: { hostname: string }): string | null {
  const name = page.hostname.replace(/^\[|\]$/g, "");
  return /^(localhost|127\..*|::1)$/.test(name) ? null : name;
}

/** "guest: Yard, I/O module 2; ann: Yard" */
export function denialsText({ denial, camera }: HostLoss): string {
  const nameOf = ({ kind, id }: HostDenial) =>
    kind === "ioModule" ? `I/O module ${id}` : (camera.find((one) => one.id === id)?.name ?? `camera ${id}`);
  const byUser = new Map<string, string[]>();
  for (const one of denial) byUser.set(one.user, [...(byUser.get(one.user) ?? []), nameOf(one)]);
  return [...byUser].map(([user, names]) => `${user}: ${names.join(", ")}`).join("; ");
}
