// SPDX-License-Identifier: Apache-2.0
//
// The protocol that the page and its requests come over.

/** The protocol over which the page was loaded; undefined for a page from the browser's cache. */
export function protocol(): string | undefined {
  const loaded = [...performance.getEntriesByType("navigation"), ...performance.getEntriesByType("resource")];
  return (loaded as PerformanceResourceTiming[]).find(({ nextHopProtocol }) => nextHopProtocol !== "")?.nextHopProtocol;
}
