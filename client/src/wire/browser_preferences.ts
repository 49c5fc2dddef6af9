// SPDX-License-Identifier: Apache-2.0
//
// Preferences that earlier versions kept in the browser for all of its users, under their present names.

const kLayout = "lookhaven.layout";
const kOrder = "lookhaven.order";
const kEvents = "lookhaven.events";

/** Empty where there is nothing, or nothing that can be read. */
export function keptByBrowser(): Record<string, unknown> {
  try {
    const events = (JSON.parse(localStorage.getItem(kEvents) ?? "{}") ?? {}) as Record<string, unknown>;
    const kept = {
      "wall.layout": localStorage.getItem(kLayout),
      "wall.order": JSON.parse(localStorage.getItem(kOrder) ?? "null") as unknown,
      "events.cameras": events["cameras"],
      "events.kinds": events["kinds"],
      "events.keptOnly": events["isKeptOnly"],
    };
    return Object.fromEntries(Object.entries(kept).filter(([, value]) => value !== null && value !== undefined));
  } catch {
    // Not of ours, or the browser lets no page keep anything.
    return {};
  }
}

export function forgetKeptByBrowser(): void {
  try {
    for (const key of [kLayout, kOrder, kEvents]) localStorage.removeItem(key);
  } catch {
    // As above.
  }
}
