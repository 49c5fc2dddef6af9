// SPDX-License-Identifier: Apache-2.0
//
// A headless Chromium for tests, driven through its debugging pipe.

import { spawn, type ChildProcess } from "node:child_process";
import { existsSync, mkdtempSync, rmSync } from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import type { Readable, Writable } from "node:stream";

const kChromium = "/usr/bin/chromium";
const kFlags = [
  "--headless",
  "--no-sandbox",
  "--disable-gpu",
  "--disable-quic",
  "--no-first-run",
  "--remote-debugging-pipe",
  // A name for this machine that a browser does not trust as it does 127.0.0.1.
  "--host-resolver-rules=MAP lan.test 127.0.0.1",
].concat(["--disable-background-networking", "--disable-component-update", "--disable-sync"]);

export const hasBrowser = existsSync(kChromium);

type Answer = { id?: number; result?: Record<string, unknown>; error?: { message: string } };

export class Browser {
  readonly #profile = mkdtempSync(join(tmpdir(), "lookhaven-browser-"));
  readonly #process: ChildProcess;
  readonly #waiting = new Map<number, (answer: Answer) => void>();
  #received = "";
  #lastId = 0;

  constructor() {
    const stdio = ["ignore", "ignore", "ignore", "pipe", "pipe"] as const;
    this.#process = spawn(kChromium, [...kFlags, `--user-data-dir=${this.#profile}`], { stdio: [...stdio] });
    (this.#process.stdio[4] as Readable).setEncoding("utf8").on("data", (text: string) => this.#receive(text));
  }

  send(method: string, params: object, sessionId?: string): Promise<Record<string, unknown>> {
    const id = (this.#lastId += 1);
    (this.#process.stdio[3] as Writable).write(`${JSON.stringify({ id, method, params, sessionId })}\0`);
    return new Promise((resolve, reject) => {
      this.#waiting.set(id, ({ result, error }) => (result ? resolve(result) : reject(new Error(error?.message))));
    });
  }

  async open(address: string, widthPx: number, heightPx: number): Promise<Page> {
    const { browserContextId } = await this.send("Target.createBrowserContext", {});
    const { targetId } = await this.send("Target.createTarget", { url: "about:blank", browserContextId });
    const { sessionId } = await this.send("Target.attachToTarget", { targetId, flatten: true });
    const page = new Page(this, sessionId as string);
    const metrics = { width: widthPx, height: heightPx, deviceScaleFactor: 1, mobile: false };
    await page.send("Emulation.setDeviceMetricsOverride", metrics);
    await page.send("Page.navigate", { url: address });
    await page.until(() => document.readyState === "complete" && location.protocol === "http:");
    return page;
  }

  async close(): Promise<void> {
    const gone = new Promise((resolve) => this.#process.once("exit", resolve));
    void this.send("Browser.close", {});
    await gone;
    rmSync(this.#profile, { recursive: true, force: true, maxRetries: 5 });
  }

  #receive(text: string): void {
    const messages = (this.#received + text).split("\0");
    this.#received = messages.pop() ?? "";
    for (const message of messages) {
      const answer = JSON.parse(message) as Answer;
      if (answer.id !== undefined) this.#waiting.get(answer.id)?.(answer);
    }
  }
}

export class Page {
  readonly #browser: Browser;
  readonly #session: string;

  constructor(browser: Browser, session: string) {
    this.#browser = browser;
    this.#session = session;
  }

  send(method: string, params: object): Promise<Record<string, unknown>> {
    return this.#browser.send(method, params, this.#session);
  }

  /** Runs a function in the page; it sees its arguments and the page, nothing around it here. */
  async run<Arguments extends unknown[], Result>(work: (...given: Arguments) => Result, ...given: Arguments): Promise<Awaited<Result>> {
    const expression = `(${String(work)})(...${JSON.stringify(given)})`;
    const how = { expression, awaitPromise: true, returnByValue: true, userGesture: true };
    const { result, exceptionDetails } = await this.send("Runtime.evaluate", how);
    if (exceptionDetails) throw new Error(JSON.stringify(exceptionDetails));
    return (result as { value: Awaited<Result> }).value;
  }

  async until<Arguments extends unknown[]>(condition: (...given: Arguments) => boolean, ...given: Arguments): Promise<void> {
    await vi.waitFor(async () => expect(await this.run(condition, ...given), String(condition)).toBe(true), {
      timeout: 12_000,
      interval: 50,
    });
  }

  click(selector: string): Promise<void> {
    return this.run((wanted) => document.querySelector<HTMLElement>(wanted)!.click(), selector);
  }

  async press(key: string): Promise<void> {
    const text = key.length === 1 ? { text: key } : key === "Enter" ? { text: "\r" } : {};
    const common = { key, code: key, windowsVirtualKeyCode: kCodes[key] ?? 0 };
    await this.send("Input.dispatchKeyEvent", { type: "keyDown", ...common, ...text });
    await this.send("Input.dispatchKeyEvent", { type: "keyUp", ...common });
  }
}

/** Chromium acts by itself only on keys that come with their number. */
const kCodes: Record<string, number> = { Enter: 13, Escape: 27, ArrowLeft: 37, ArrowUp: 38, ArrowRight: 39, ArrowDown: 40 };
