// SPDX-License-Identifier: Apache-2.0
//
// Splits a stream of server-sent events into its events, in whatever pieces it arrives.

export interface StreamEvent {
  /** "message" where the stream names none. */
  name: string;
  /** The last that the stream has given; empty before it gave one. */
  id: string;
  data: string;
}

/** Much more than the longest event that the server sends. */
const kMaxEventChars = 1 << 18;

export class EventStreamParser {
  readonly #deliver: (event: StreamEvent) => void;
  readonly #text = new TextDecoder();
  #rest = "";
  #name = "";
  #id = "";
  #data: string[] = [];

  /** `deliver` is called from within `push`, once an event. */
  constructor(deliver: (event: StreamEvent) => void) {
    this.#deliver = deliver;
  }

  /** Takes the next bytes. Throws RangeError for an event that is too long; do not use the parser after that. */
  push(chunk: Uint8Array): void {
    const lines = (this.#rest + this.#text.decode(chunk, { stream: true })).split("\n");
    this.#rest = lines.pop()!;
    for (const line of lines) this.#takeLine(line.endsWith("\r") ? line.slice(0, -1) : line);
    const length = this.#data.reduce((sum, { length }) => sum + length, this.#rest.length);
    if (length > kMaxEventChars) throw new RangeError("an event is too long");
  }

  #takeLine(line: string): void {
    if (line === "") return this.#finish();
    const [, field, value] = /^([^:]*):? ?(.*)$/s.exec(line)!;
    if (field === "event") this.#name = value!;
    else if (field === "id") this.#id = value!;
    else if (field === "data") this.#data.push(value!);
  }

  #finish(): void {
    const [name, data] = [this.#name || "message", this.#data];
    this.#name = "";
    this.#data = [];
    if (data.length > 0) this.#deliver({ name, id: this.#id, data: data.join("\n") });
  }
}
