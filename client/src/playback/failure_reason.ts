// SPDX-License-Identifier: Apache-2.0
//
// Why a recording does not play, for the user; and which failures pass by themselves.

import type { Footage } from "../wire/footage";
import type { Recordings } from "../wire/recordings";
import type { ServerError } from "../wire/server";

const kShowsWarning = 200;
const kNotFound = 404;
/** No answer, or a server that is being started. */
const kPassing: readonly number[] = [0, 502, 503];

export function isPassing({ status }: ServerError): boolean {
  return kPassing.includes(status);
}

/** Whether nobody has answered, rather than the server for itself. */
export function isAway({ status }: ServerError): boolean {
  return status === 0 || status === 502;
}

/** Tells a recording that retention has deleted from one that cannot be played. */
export async function reasonOf(error: ServerError, footage: Footage, recordings: Recordings): Promise<string> {
  if (error.status !== kShowsWarning && error.status !== kNotFound) return error.message;
  const found = await recordings.find(footage).catch(() => footage);
  if (!found) return "The recording no longer exists.";
  return error.status === kNotFound ? "The recording cannot be played." : error.message;
}
