// SPDX-License-Identifier: Apache-2.0
//
// Which tiles stream and which poll snapshots.
//
// Why so        Over HTTP/1.1 a browser opens six connections to a host, and a stream holds one for good; the seventh
//               request would wait without any event. So four tiles stream, the polling tiles share one connection, and
//               one is left for what the user does. Over HTTP/2 all requests share a connection.

const kStreamsOverHttp1 = 4;

/**
 * The number of streams for a protocol as PerformanceNavigationTiming.nextHopProtocol names it; unknown counts as old.
 */
export function streamLimit(nextHopProtocol: string | undefined): number {
  return /^h[23]/.test(nextHopProtocol ?? "") ? Infinity : kStreamsOverHttp1;
}

/**
 * Which of the visible ids (in screen order) may stream: first those that stream already, since a change costs a
 * reconnect and a visible stutter, then from the top of the screen.
 */
export function chooseStreams(visible: readonly number[], streaming: ReadonlySet<number>, limit: number): Set<number> {
  const kept = visible.filter((id) => streaming.has(id));
  const others = visible.filter((id) => !streaming.has(id));
  return new Set([...kept, ...others].slice(0, limit));
}
