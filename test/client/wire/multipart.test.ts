// SPDX-License-Identifier: Apache-2.0
//
// The multipart parser against splits, odd headers and senders that lie.

import { MultipartError, MultipartParser, boundaryOf, type Part } from "../../../client/src/wire/multipart";

const latin1 = (text: string) => Uint8Array.from(text, (letter) => letter.charCodeAt(0));
const textOf = (bytes: Uint8Array) => String.fromCharCode(...bytes);

function parse(text: string, pieceBytes = () => text.length): Part[] {
  const parts: Part[] = [];
  const parser = new MultipartParser("b", (part) => parts.push(part));
  const bytes = latin1(text);
  for (let at = 0; at < bytes.length;) {
    const end = at + pieceBytes();
    parser.push(bytes.subarray(at, end));
    at = end;
  }
  return parts;
}

const part = (body: string, head = `Content-Length: ${body.length}\r\n`) => `--b\r\n${head}\r\n${body}\r\n`;

test("bodies survive every way of being split, with the boundary and line ends inside them", () => {
  const bodies = ["", "\r\n--b\r\nContent-Length: 3\r\n\r\n", "\xff\xd8\n\r\x00\xff\xd9", "--b--", "x".repeat(5000)];
  const stream = bodies.map((body) => part(body)).join("");
  let seed = 1;
  const random = () => (seed = (seed * 48271) % 0x7fffffff);
  const ways = [() => 1, () => 2, () => 7, () => 1 + (random() % 40), () => 1 + (random() % 3000), () => stream.length];
  for (const way of ways) expect(parse(stream, way).map(({ body }) => textOf(body))).toEqual(bodies);
});

test.each([
  ["a part as soon as its last byte is here", "--b\r\nContent-Length: 2\r\n\r\nhi", ["hi"]],
  ["nothing before", "--b\r\nContent-Length: 2\r\n\r\nh", []],
  ["letter case and blanks of a header", part("ab", "CONTENT-length:2  \r\n"), ["ab"]],
  ["line feeds alone", "--b\nContent-Length: 2\n\nab\n--b\nContent-Length: 1\n\nc", ["ab", "c"]],
  ["a value with colons", part("ab", "X-A: 1:2:3\r\nContent-Length: 2\r\n"), ["ab"]],
  ["a preamble, and a longer boundary that is not ours", `hello\r\n--bb\r\n${part("ab")}`, ["ab"]],
  ["nothing after the end", `${part("ab")}--b--\r\n${part("cd")}`, ["ab"]],
])("reads %s", (_name, stream, bodies) => {
  expect(parse(stream).map(({ body }) => textOf(body))).toEqual(bodies);
});

test("headers reach the reader by their lower-case names", () => {
  const [only] = parse(part("", "X-Capture-Time: 1764023456.123\r\nContent-Length: 0\r\n"));
  expect(only?.headers.get("x-capture-time")).toBe("1764023456.123");
});

test.each([
  ["no length", part("ab", "Content-Type: image/jpeg\r\n")],
  ["a negative length", part("ab", "Content-Length: -1\r\n")],
  ["a length that is no number", part("ab", "Content-Length: 0x10\r\n")],
  ["a length that would take all memory", part("ab", "Content-Length: 99999999999\r\n")],
  ["a header without a colon", part("ab", "Content-Length 2\r\n")],
  ["endless headers", `--b\r\n${"X: y\r\n".repeat(5000)}`],
  ["an endless line", `--b\r\n${"x".repeat(50_000)}`],
  ["an endless preamble", "x\r\n".repeat(20_000)],
])("refuses %s", (_name, stream) => {
  expect(() => parse(stream, () => 100)).toThrow(MultipartError);
});

test.each([
  ["multipart/x-mixed-replace; boundary=abc", "abc"],
  ['multipart/x-mixed-replace;boundary="a b;c"; charset=x', "a b;c"],
  ["multipart/mixed; charset=x; Boundary=--q", "--q"],
  ["multipart/mixed", null],
  ["application/json; boundary=abc", null],
  [null, null],
])("boundary of %s", (contentType, boundary) => {
  expect(boundaryOf(contentType)).toBe(boundary);
});
