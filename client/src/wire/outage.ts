// SPDX-License-Identifier: Apache-2.0
//
// Which failures of a request come from a server that is away, and end by themselves.

import type { ServerError } from "./server";

/** No answer, or a server that is being started or needs another host that is away. */
const kTemporary: readonly number[] = [0, 502, 503];

/** Whether the same request may succeed later. */
export function isTemporary({ status }: ServerError): boolean {
  return kTemporary.includes(status);
}

/** Whether the web API itself has not answered. */
export function isAway({ status }: ServerError): boolean {
  return status === 0 || status === 502;
}
