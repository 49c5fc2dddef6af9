// SPDX-License-Identifier: Apache-2.0
//
// Keeps the stream of what is being reported open: from where the user last looked on, and after each loss of the
// connection from where it was.
//
// Why so        Over HTTP/1.1 a stream would hold one of the browser's six connections for good. There it is opened
//               every few seconds instead, and closed when it has told what was missed.

import { Backoff } from "../wire/backoff";
import { Deadline } from "../wire/deadline";
import { delay } from "../wire/delay";
import { EventStreamParser, type StreamEvent } from "../wire/event_stream";
import type { RawMark } from "../wire/footage";
import { asServerError, type Server } from "../wire/server";

const kBadRequest = 400;
/** Longer than two of the server's events apart: each 15 seconds, it tells at least that it is alive. */
const kMaxSilenceMs = 40_000;
const kPauseMs = 5_000;
/** What happened longer ago was missed. */
const kMaxNewsAgeS = 60;

/** Runs until `signal` is aborted. Kinds that `admits` refuses are skipped. */
export async function watchAlerts(
  server: Server,
  isBrief: boolean,
  admits: (kind: RawMark["kind"]) => boolean,
  signal: AbortSignal,
): Promise<void> {
  const backoff = new Backoff();
  let place = server.alerts.start;
  while (!signal.aborted) {
    let isTold = false;
    const deadline = new Deadline(kMaxSilenceMs, signal);
    let missed = 0;
    let nowS = 0;
    const take = ({ name, id, data }: StreamEvent) => {
      place = server.alerts.place = id;
      if (name === "start") {
        const start = JSON.parse(data) as { missed: number; resumed: boolean; time: number };
        if (!start.resumed) server.alerts.beginAt(id);
        [missed, nowS] = [start.missed, start.time - performance.now() / 1000];
      } else if (name === "mark") {
        const mark = JSON.parse(data) as RawMark;
        missed -= 1;
        if (admits(mark.kind)) server.alerts.note(mark, mark.time > nowS + performance.now() / 1000 - kMaxNewsAgeS);
      }
      backoff.reset();
      // Fewer missed events may come than were announced: those denied meanwhile do not.
      const isAll = missed <= 0 || (name !== "start" && name !== "mark");
      if (isAll) server.alerts.catchUp();
      isTold = isBrief && isAll;
    };
    try {
      const answer = await server.media("VEXO.Event", "Watch", place ? { after: place } : {}, deadline);
      const parser = new EventStreamParser(take);
      const reader = answer.body!.getReader();
      for (let read = await reader.read(); !read.done && !signal.aborted; read = await reader.read()) {
        deadline.extend();
        parser.push(read.value);
        if (isTold) break;
      }
    } catch (error) {
      // The next attempt continues where this one was, unless that is no place of this server.
      if (asServerError(error).status === kBadRequest) place = "";
    } finally {
      deadline.release();
    }
    await delay(isTold ? kPauseMs : backoff.next(), signal);
  }
}
