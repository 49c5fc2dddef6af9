// SPDX-License-Identifier: Apache-2.0
//
// Requests one at a time.

import { Semaphore } from "../../../client/src/wire/semaphore";

test("semaphore: one at a time in order, a failure or a leaver blocks nobody", async () => {
  const semaphore = new Semaphore(1);
  const log: string[] = [];
  const stay = new AbortController();
  const leave = new AbortController();
  const work =
    (name: string, fails = false) =>
    async () => {
      log.push(`${name} in`);
      await Promise.resolve();
      log.push(`${name} out`);
      if (fails) throw new Error(name);
    };
  const all = [
    semaphore.run(stay.signal, work("a", true)),
    semaphore.run(leave.signal, work("b")),
    semaphore.run(stay.signal, work("c")),
  ];
  leave.abort();
  expect((await Promise.allSettled(all)).map(({ status }) => status)).toEqual(["rejected", "rejected", "fulfilled"]);
  await semaphore.run(stay.signal, work("d"));
  expect(log).toEqual(["a in", "a out", "c in", "c out", "d in", "d out"]);
});
