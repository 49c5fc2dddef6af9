// SPDX-License-Identifier: Apache-2.0
//
// Serves the built client and cameras that do what a test wants, over HTTP/1.1 with the strictest policy.

import { execFileSync } from "node:child_process";
import { existsSync, mkdtempSync, readFileSync, rmSync } from "node:fs";
import { createServer, type IncomingMessage, type ServerResponse } from "node:http";
import type { AddressInfo } from "node:net";
import { tmpdir } from "node:os";
import { extname, join } from "node:path";
import { Readable } from "node:stream";
import { pipeline } from "node:stream/promises";
import { FakeArchive } from "./fake_archive";
import { FakeSetup, type SetupMethod } from "./fake_setup";

const kPolicy =
  "default-src 'self'; img-src 'self'; object-src 'none'; base-uri 'none'; form-action 'self'; " +
  "frame-ancestors 'none'; require-trusted-types-for 'script'";
const kTypes: Record<string, string> = { ".html": "text/html", ".js": "text/javascript", ".css": "text/css", ".svg": "image/svg+xml" };
/** Of the page over HTTPS. */
const kTlsPort = "9443";
const kFrameMs = 50;
/** 40 ms of sound at 8 kHz, µ-law. */
const kTone = Array.from({ length: 320 }, (_, sample) => (sample % 8 < 4 ? 0x90 : 0x10));
const kSilence = Array<number>(320).fill(0xff);

export class FakeServer {
  readonly cameras: { id: number; name: string; video_type: number }[] = [];
  /** Cameras that keep their streams open and send nothing. */
  readonly stalled = new Set<number>();
  /** "camera/profile" of each stream that is open. */
  readonly streams: string[] = [];
  /** Data of further answers, by method. */
  answers: Record<string, unknown> = {};
  /** What managers set up. */
  readonly setup = new FakeSetup();
  isManager = true;
  /** The content of every map. */
  emap: unknown = null;
  polls = 0;
  mostPollsAtOnce = 0;
  hasSession = false;
  hasAccount = true;
  /** With which the first account can be made. */
  setupToken = "";
  /** Takes requests of the API and answers none. */
  isAway = false;
  jpeg: Buffer = Buffer.alloc(0);
  /** Of cameras that send another picture than that. */
  readonly pictures = new Map<number, Buffer>();
  /** What cameras of another video type send, 25 pictures a second, over and over, with a tone beside each `isLoud`. */
  readonly muxed = new Map<number, { type: string; pictures: Buffer[]; isLoud(picture: number): boolean }>();
  readonly archive = new FakeArchive();
  readonly #files = mkdtempSync(join(tmpdir(), "lookhaven-client-"));
  readonly #server = createServer((request, answer) => this.#answer(request, answer));
  #pollsNow = 0;

  async start(): Promise<string> {
    const client = join(__dirname, "../../../client");
    const vite = ["node_modules/vite/bin/vite.js", "build", "--logLevel=error", "--emptyOutDir", `--outDir=${this.#files}`];
    execFileSync(process.execPath, vite, { cwd: client, env: { ...process.env, NODE_ENV: "production" } });
    await new Promise<void>((resolve) => this.#server.listen(0, "127.0.0.1", resolve));
    return `http://127.0.0.1:${(this.#server.address() as AddressInfo).port}/`;
  }

  close(): void {
    this.#server.close();
    this.#server.closeAllConnections();
    rmSync(this.#files, { recursive: true, force: true });
  }

  #answer(request: IncomingMessage, answer: ServerResponse): void {
    const { pathname, searchParams } = new URL(request.url ?? "", "http://localhost");
    if (pathname !== "/webapi") return this.#file(pathname === "/" ? "/index.html" : pathname, answer);
    if (this.isAway) return void request.socket.destroy();
    const method = searchParams.get("method");
    if (method === "Login") this.hasSession = true;
    if (method === "MakeFirstAccount") return void this.#makeFirstAccount(request, answer);
    const data = this.hasAccount ? null : { noAccount: true };
    if (!this.hasSession) return json(answer, 401, { success: false, error: { code: 401, data } });
    if (method === "Logout") this.hasSession = false;
    const change = this.setup.methods[`${searchParams.get("api")}.${method}`];
    if (change) return void this.#setUp(change, request, answer);
    if (method! in this.answers) return json(answer, 200, { success: true, data: this.answers[method!] });
    if (method === "Get" && searchParams.get("api") === "VEXO.Picture") return this.#snapshot(answer);
    if (searchParams.get("itemType") === "1" && this.emap) return json(answer, 200, { success: true, data: this.emap });
    if (method === "Play") return this.#play(searchParams, answer);
    if (/VEXO\.(Playback|Event|Catalog|Picture)|Player$/.test(searchParams.get("api")!) && method !== "LoadCamera") {
      return void this.#recordings(searchParams, request, answer);
    }
    const camera = this.cameras.map((one) => ({ ...one, liveview_port: 1, cam_ptz: 0, sound_support: 0 }));
    const list = { camera, selected: 1, isManager: true, ShowAll: 1, CamNum: camera.length, EnableCamNum: camera.length };
    json(answer, 200, { success: true, data: method === "LoadCamera" ? list : this.#account });
  }

  get #account() {
    return { account: "admin", user_id: this.setup.userId, is_manager: this.isManager, players_per_session: this.archive.playersPerSession };
  }

  async #makeFirstAccount(request: IncomingMessage, answer: ServerResponse): Promise<void> {
    let form = "";
    for await (const piece of request) form += String(piece);
    const refuse = (code: number, message: string) => json(answer, code, { success: false, error: { code, message, data: null } });
    if (this.hasAccount) return refuse(409, "There is an account already.");
    if (new URLSearchParams(form).get("token") !== this.setupToken) return refuse(403, "This address has expired.");
    this.hasAccount = this.hasSession = true;
    json(answer, 200, { success: true, data: this.#account });
  }

  async #setUp(change: SetupMethod, request: IncomingMessage, answer: ServerResponse): Promise<void> {
    let body = "";
    for await (const piece of request) body += String(piece);
    const { status, ...envelope } = change(JSON.parse(body) as never);
    json(answer, status, envelope);
  }

  async #recordings(query: URLSearchParams, request: IncomingMessage, answer: ServerResponse): Promise<void> {
    let form = "";
    for await (const piece of request) form += String(piece);
    for (const [name, value] of new URLSearchParams(form)) query.set(name, value);
    const left = new AbortController();
    answer.on("close", () => left.abort());
    const given = this.archive.answer(query, left.signal) ?? new Response(null, { status: 404 });
    answer.writeHead(given.status, Object.fromEntries(given.headers));
    if (!given.body) return void answer.end();
    await pipeline(Readable.fromWeb(given.body as never), answer).catch(() => answer.destroy());
  }

  #file(path: string, answer: ServerResponse): void {
    const file = join(this.#files, path);
    if (!existsSync(file)) return void answer.writeHead(404).end();
    answer.writeHead(200, { "Content-Type": kTypes[extname(path)], "Content-Security-Policy": kPolicy });
    // As the web server does.
    answer.end(path === "/index.html" ? readFileSync(file, "utf8").replace("8443", kTlsPort) : readFileSync(file));
  }

  #play(parameters: URLSearchParams, answer: ServerResponse): void {
    const id = Number(parameters.get("camera"));
    if (parameters.get("snapshot") === "1") return this.#snapshot(answer);
    const muxed = this.muxed.get(id);
    if (muxed && parameters.has("profileType")) return json(answer, 502, { success: false, error: { code: 502 } });
    const name = `${id}/${parameters.get("profileType") ?? "usual"}`;
    this.streams.push(name);
    answer.writeHead(200, { "Content-Type": "multipart/x-mixed-replace; boundary=b" }).write("--b\r\n");
    const startMs = Date.now();
    let sent = 0;
    const timer = setInterval(() => {
      // A stream of an ended session ends, as the host has it.
      if (!this.hasSession) return void answer.end();
      if (this.stalled.has(id)) return;
      for (; muxed && sent * 40 <= Date.now() - startMs; sent += 1) {
        const at = `X-Timestamp: ${(startMs + sent * 40) * 1000}\r\nX-Codecs: ${muxed.type};PCMU\r\n`;
        const sound = Buffer.from(muxed.isLoud(sent) ? kTone : kSilence);
        answer.write(part(`Content-Type: image/${muxed.type}\r\n${at}`, muxed.pictures[sent % muxed.pictures.length]!));
        answer.write(part(`Content-Type: audio/PCMU\r\n${at}`, sound));
      }
      if (muxed) return;
      answer.write(part(`X-Capture-Time: ${Date.now() / 1000}\r\nX-Age-Ms: 1\r\n`, this.pictures.get(id) ?? this.jpeg));
    }, kFrameMs);
    answer.on("close", () => {
      clearInterval(timer);
      this.streams.splice(this.streams.indexOf(name), 1);
    });
  }

  #snapshot(answer: ServerResponse): void {
    this.polls += 1;
    this.#pollsNow += 1;
    this.mostPollsAtOnce = Math.max(this.mostPollsAtOnce, this.#pollsNow);
    setTimeout(() => {
      this.#pollsNow -= 1;
      answer.writeHead(200, { "Content-Type": "image/jpeg" }).end(this.jpeg);
    }, kFrameMs);
  }
}

function part(head: string, body: Buffer): Buffer {
  return Buffer.concat([Buffer.from(`${head}Content-Length: ${body.length}\r\n\r\n`), body, Buffer.from("\r\n--b\r\n")]);
}

function json(answer: ServerResponse, status: number, body: unknown): void {
  answer.writeHead(status, { "Content-Type": "application/json", "Cache-Control": "no-store" }).end(JSON.stringify(body));
}
