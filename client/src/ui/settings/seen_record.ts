// SPDX-License-Identifier: Apache-2.0
//
// A record as the user of a dialog has seen it, which someone else may change meanwhile.

import { asServerError } from "../../wire/server";
import type { Revised } from "./record_form";

export class SeenRecord<Stored extends Revised & { name: string }> {
  readonly #submit: string;
  #record: Stored;

  /** `submit`: the word on the button that makes the change. */
  constructor(record: Stored, submit: string) {
    this.#record = record;
    this.#submit = submit;
  }

  /** A sentence where someone else was faster; the next attempt is made on what there is now. */
  async attempt(work: (current: Stored) => Promise<unknown>): Promise<string | void> {
    try {
      await work(this.#record);
    } catch (error) {
      const { status, data } = asServerError(error);
      if (status !== 409 || typeof data !== "object" || data === null || !("revision" in data)) throw error;
      // What is no record of many has no name there.
      this.#record = { ...this.#record, ...(data as Stored) };
      return `Someone else has changed ${this.#record.name} in the meantime. Press ${this.#submit} again to save it anyway.`;
    }
  }
}
