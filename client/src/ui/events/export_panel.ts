// SPDX-License-Identifier: Apache-2.0
//
// Chooses what to take away as a file: a span and cameras. Says how long and how large that is, and what is missing.

import type { Camera } from "../../wire/camera";
import type { ExportPlan, Exports } from "../../wire/exports";
import type { Footage } from "../../wire/footage";
import { ServerError } from "../../wire/server";
import type { Span } from "../timeline/span_handles";
import { bytesText } from "../widgets/amounts";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { calendarDate, clockTime, spanInWords } from "../widgets/text";
import { ExportRun, type OfferedExport } from "./export_run";

const kDenied = "You may play the recordings of this camera, but not export them";
const kDebounceMs = 300;
const kAroundMs = 60_000;
/** The server's limits. */
const kMaxCameras = 16;
const kMaxSpanMs = 86_400_000;

export class ExportPanel {
  readonly root = element("section", { class: "export-panel", "aria-label": "Export", hidden: true });
  readonly #exports: Exports;
  readonly #changed: (span: Span | null) => void;
  readonly #from = element("input", { class: "input", type: "datetime-local", step: "1", "aria-label": "From" });
  readonly #to = element("input", { class: "input", type: "datetime-local", step: "1", "aria-label": "To" });
  readonly #event = element("button", { type: "button", class: "button" }, "This event");
  readonly #cameraRow = element("div", { class: "chips", role: "group", "aria-label": "Cameras to export" });
  readonly #about = element("p", { class: "export-about", role: "status" });
  readonly #start = element("a", { class: "button primary" }, icon("download"), "Export");
  readonly #run = new ExportRun(() => this.#showRunning());
  /** What the link exports. */
  #offered: OfferedExport | null = null;
  #span: Span = { fromMs: 0, toMs: 0 };
  #footage: Footage | null = null;
  #chosen = new Set<number>();
  /** Whose recordings may not be taken away. */
  #denied: ReadonlySet<number> = new Set();
  /** Nothing may be taken away of any camera that is shown. */
  #isDenied = false;
  #timer: ReturnType<typeof setTimeout> | undefined;

  /** `changed` is called with the span that is to be shown, null once the panel is closed. */
  constructor(exports: Exports, changed: (span: Span | null) => void) {
    this.#exports = exports;
    this.#changed = changed;
    for (const input of [this.#from, this.#to]) input.addEventListener("change", () => this.#readInputs());
    this.#event.addEventListener("click", () => this.#footage && this.setSpan(spanOf(this.#footage), true));
    this.#start.addEventListener("click", (event) => {
      if (this.#offered && this.#run.begin(this.#offered)) event.preventDefault();
    });
    const close = iconButton("close", "Close export", () => this.close());
    const times = element("div", { class: "export-times" }, this.#from, "–", this.#to, this.#event);
    const end = element("div", { class: "export-end" }, this.#about, this.#start, close);
    this.root.append(times, this.#cameraRow, end, this.#run.root);
  }

  get isOpen(): boolean {
    return !this.root.hidden;
  }

  /** It goes on while the panel is closed. */
  get isRunning(): boolean {
    return this.#run.isRunning;
  }

  cancel(): void {
    this.#run.cancel();
  }

  /** `footage` is what plays, where something does. */
  open(cameras: readonly Camera[], onStage: readonly number[], footage: Footage | null, atMs: number): void {
    this.#footage = footage;
    this.#event.hidden = !footage;
    this.#chosen = new Set(onStage.filter((id) => !this.#denied.has(id)).slice(0, kMaxCameras));
    this.#cameraRow.replaceChildren(...cameras.map((camera) => this.#chip(camera)));
    this.#isDenied = cameras.length > 0 && cameras.every(({ id }) => this.#denied.has(id));
    this.root.hidden = false;
    this.setSpan(footage ? spanOf(footage) : { fromMs: atMs - kAroundMs, toMs: Math.min(atMs + kAroundMs, Date.now()) }, true);
    this.#from.focus();
  }

  /** These cameras cannot be chosen from then on. */
  deny(denied: ReadonlySet<number>): void {
    this.#denied = denied;
  }

  close(): void {
    clearTimeout(this.#timer);
    if (!this.isOpen) return;
    this.root.hidden = true;
    this.#changed(null);
  }

  /** With `tell` the span is shown elsewhere, too. */
  setSpan(span: Span, tell = false): void {
    this.#span = span;
    this.#from.value = inputText(span.fromMs);
    this.#to.value = inputText(span.toMs);
    if (tell) this.#changed(span);
    this.#planSoon();
  }

  #chip({ id, name }: Camera): HTMLElement {
    const isDenied = this.#denied.has(id);
    const box = element("input", { type: "checkbox", checked: this.#chosen.has(id), disabled: isDenied });
    box.addEventListener("change", () => {
      if (box.checked) this.#chosen.add(id);
      else this.#chosen.delete(id);
      this.#planSoon();
    });
    return element("label", { class: "chip", title: isDenied ? kDenied : "" }, box, isDenied ? `${name} (no export)` : name);
  }

  #readInputs(): void {
    const [fromMs, toMs] = [this.#from.value, this.#to.value].map((text) => new Date(text).getTime()) as [number, number];
    if (fromMs < toMs) return this.setSpan({ fromMs, toMs }, true);
    this.#tell("The end must come after the beginning.");
  }

  /** One at a time. */
  #showRunning(): void {
    this.#start.hidden = this.isRunning;
    if (!this.isRunning && document.activeElement === document.body) this.#start.focus();
  }

  /** What is said while nothing can be exported. */
  #tell(text: string): void {
    this.#offered = null;
    this.#start.removeAttribute("href");
    this.#start.setAttribute("aria-disabled", "true");
    setText(this.#about, text);
  }

  #planSoon(): void {
    clearTimeout(this.#timer);
    const { fromMs, toMs } = this.#span;
    if (this.#isDenied) return this.#tell("You may play these recordings, but not export them.");
    if (this.#chosen.size === 0) return this.#tell("Choose a camera.");
    if (this.#chosen.size > kMaxCameras) return this.#tell(`Choose at most ${kMaxCameras} cameras.`);
    if (toMs - fromMs > kMaxSpanMs) return this.#tell("Choose at most one day.");
    this.#tell("Calculating the size…");
    this.#timer = setTimeout(() => void this.#plan(this.#span, [...this.#chosen]), kDebounceMs);
  }

  async #plan(span: Span, cameras: readonly number[]): Promise<void> {
    const isStale = () => span !== this.#span || !this.isOpen || String(cameras) !== String([...this.#chosen]);
    const [fromS, toS] = [Math.floor(span.fromMs / 1000), Math.ceil(span.toMs / 1000)];
    try {
      const plan = await this.#exports.plan(cameras, fromS, toS);
      if (isStale()) return;
      setText(this.#about, aboutText(plan, toS - fromS));
      this.#start.removeAttribute("aria-disabled");
      this.#start.href = this.#exports.address(cameras, fromS, toS);
      this.#offered = { ...plan, open: (signal) => this.#exports.open(cameras, fromS, toS, signal) };
    } catch (error) {
      if (isStale()) return;
      const isNothing = error instanceof ServerError && error.status === 404;
      this.#tell(isNothing ? "Nothing was recorded in this time." : error instanceof ServerError ? error.message : String(error));
    }
  }
}

function spanOf({ start, stop }: Footage): Span {
  return { fromMs: start * 1000, toMs: stop * 1000 };
}

/** As an input of a local time takes it. */
function inputText(ms: number): string {
  return `${calendarDate(ms)}T${clockTime(ms)}`;
}

/** "5 min · about 120 MB · 2 files in a ZIP · 12 s of Parking missing". */
function aboutText({ sizeBytes, files, missing }: ExportPlan, spanS: number): string {
  const parts = [spanInWords(spanS), `about ${bytesText(sizeBytes)}`];
  if (files > 1) parts.push(`${files} files in a ZIP`);
  for (const { camera, seconds } of missing) parts.push(`${spanInWords(seconds)} of ${camera} missing`);
  return parts.join(" · ");
}
