// SPDX-License-Identifier: Apache-2.0
//
// Why a recording does not play, for the user.

import type { Footage } from "../wire/footage";
import type { Recordings } from "../wire/recordings";
import type { ServerError } from "../wire/server";

const kShowsWarning = 200;
const kNotFound = 404;

/** Tells a recording that retention has deleted from one that cannot be played. */
export async function reasonOf(error: ServerError, footage: Footage, recordings: Recordings): Promise<string> {
  if (error.status !== kShowsWarning && error.status !== kNotFound) return error.message;
  const found = await recordings.find(footage).catch(() => footage);
  if (!found) return "The recording no longer exists.";
  return error.status === kNotFound ? "The recording cannot be played." : error.message;
}
