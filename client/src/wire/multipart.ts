// SPDX-License-Identifier: Apache-2.0
//
// Splits an endless multipart body into its parts as it arrives, in whatever chunks.
//
// Why so        A picture may contain the boundary by chance, and searching every picture for it costs time. So a body
//               is taken by its Content-Length, straight into an array of that size; only the few lines between two
//               bodies are read as text.
// Invariants    (1) Memory is bounded by the two limits, whatever the sender says.
//               (2) A part is delivered as soon as its last byte is here, before the boundary that follows it.

export interface Part {
  /** Names in lower case. */
  readonly headers: ReadonlyMap<string, string>;
  readonly body: Uint8Array<ArrayBuffer>;
}

/** The body breaks the multipart format or a limit; the stream cannot be continued. */
export class MultipartError extends Error {}

const kMaxHeadBytes = 8 * 1024;
const kMaxBodyBytes = 16 * 1024 * 1024;
const kLineFeed = 10;

/** The boundary named in a Content-Type header; null when this is no multipart answer. */
export function boundaryOf(contentType: string | null): string | null {
  const found = /^multipart\/[^;]+;.*\bboundary=(?:"([^"]+)"|([^\s;"]+))/i.exec(contentType ?? "");
  return found?.[1] ?? found?.[2] ?? null;
}

export class MultipartParser {
  readonly #delimiter: string;
  readonly #deliver: (part: Part) => void;
  readonly #text = new TextDecoder("latin1");
  #line = "";
  /** Bytes read as text since the last body. */
  #headBytes = 0;
  /** Set between a boundary and the blank line that ends the part's headers. */
  #headers: Map<string, string> | null = null;
  #body: Uint8Array<ArrayBuffer> | null = null;
  #bodyBytes = 0;
  #ended = false;

  /** `deliver` is called from within `push`, once a part. */
  constructor(boundary: string, deliver: (part: Part) => void) {
    this.#delimiter = `--${boundary}`;
    this.#deliver = deliver;
  }

  /** Whether the boundary has come behind which there are no more parts. */
  get hasEnded(): boolean {
    return this.#ended;
  }

  /** Takes the next bytes of the body. Throws MultipartError; do not use the parser after that. */
  push(chunk: Uint8Array): void {
    let at = 0;
    while (at < chunk.length && !this.#ended) {
      at = this.#body ? this.#takeBody(this.#body, chunk, at) : this.#takeLine(chunk, at);
    }
  }

  #takeBody(body: Uint8Array<ArrayBuffer>, chunk: Uint8Array, at: number): number {
    const piece = chunk.subarray(at, at + body.length - this.#bodyBytes);
    body.set(piece, this.#bodyBytes);
    this.#bodyBytes += piece.length;
    if (this.#bodyBytes === body.length) this.#finishPart(body);
    return at + piece.length;
  }

  #takeLine(chunk: Uint8Array, at: number): number {
    const lineFeed = chunk.indexOf(kLineFeed, at);
    const end = lineFeed < 0 ? chunk.length : lineFeed;
    this.#headBytes += end - at + 1;
    if (this.#headBytes > kMaxHeadBytes) throw new MultipartError("no part within the allowed length");
    this.#line += this.#text.decode(chunk.subarray(at, end));
    if (lineFeed < 0) return end;
    const line = this.#line.endsWith("\r") ? this.#line.slice(0, -1) : this.#line;
    this.#line = "";
    this.#readLine(line);
    return end + 1;
  }

  #readLine(line: string): void {
    if (!this.#headers) {
      const bare = line.trimEnd();
      if (bare === this.#delimiter) this.#headers = new Map();
      else if (bare === `${this.#delimiter}--`) this.#ended = true;
    } else if (line === "") {
      this.#startBody(this.#headers.get("content-length"));
    } else {
      const colon = line.indexOf(":");
      if (colon < 1) throw new MultipartError("malformed part header");
      this.#headers.set(line.slice(0, colon).trim().toLowerCase(), line.slice(colon + 1).trim());
    }
  }

  #startBody(length: string | undefined): void {
    if (length === undefined || !/^\d+$/.test(length)) throw new MultipartError("part without a length");
    if (Number(length) > kMaxBodyBytes) throw new MultipartError("part too large");
    this.#body = new Uint8Array(Number(length));
    this.#bodyBytes = 0;
    if (this.#body.length === 0) this.#finishPart(this.#body);
  }

  #finishPart(body: Uint8Array<ArrayBuffer>): void {
    const headers = this.#headers ?? new Map<string, string>();
    this.#body = this.#headers = null;
    this.#headBytes = 0;
    this.#deliver({ headers, body });
  }
}
