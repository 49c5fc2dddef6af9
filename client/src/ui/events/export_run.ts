// SPDX-License-Identifier: Apache-2.0
//
// One export while it runs: how much has come, how long it still takes, and a button that cancels it.

import { filePicker, saveAnswer, type ChosenFile } from "../../wire/saved_file";
import { ServerError } from "../../wire/server";
import { bytesText } from "../widgets/amounts";
import { element, setText } from "../widgets/dom";
import { notify } from "../widgets/notice";
import { OncePerFrame } from "../widgets/once_per_frame";
import { spanInWords } from "../widgets/text";

/** Before, the rate says little. */
const kRateAfterMs = 2_000;

export interface OfferedExport {
  name: string;
  /** As estimated. */
  sizeBytes: number;
  open(signal: AbortSignal): Promise<Response>;
}

export class ExportRun {
  readonly root = element("div", { class: "export-run", hidden: true });
  readonly #changed: () => void;
  readonly #bar = element("progress", { "aria-label": "Export" });
  readonly #text = element("p", { class: "export-about" });
  readonly #cancel = element("button", { type: "button", class: "button" }, "Cancel");
  readonly #showing = new OncePerFrame(() => this.#show());
  readonly #onLeave = (event: BeforeUnloadEvent) => event.preventDefault();
  #abort: AbortController | null = null;
  #startedMs = 0;
  #receivedBytes = 0;
  #totalBytes = 0;
  #isEstimate = true;

  /** `changed` is called when an export begins or ends. */
  constructor(changed: () => void) {
    this.#changed = changed;
    this.#cancel.addEventListener("click", () => this.cancel());
    this.root.append(this.#bar, this.#text, this.#cancel);
  }

  get isRunning(): boolean {
    return this.#abort !== null;
  }

  /** Has the user choose a file, during a click. Returns false where the browser itself has to download. */
  begin(offered: OfferedExport): boolean {
    const picker = filePicker();
    if (!picker) {
      this.#tell("The browser's list of downloads shows the progress and can cancel.");
      return false;
    }
    if (!this.isRunning) void this.#run(offered, picker({ suggestedName: offered.name }));
    return true;
  }

  cancel(): void {
    this.#abort?.abort();
  }

  async #run({ name, sizeBytes, open }: OfferedExport, choice: Promise<ChosenFile>): Promise<void> {
    const { signal } = (this.#abort = new AbortController());
    this.root.hidden = true;
    let chosen: ChosenFile | null = null;
    try {
      chosen = await choice;
      this.#start(sizeBytes);
      await saveAnswer(chosen, open, { signal, onProgress: (received, total) => this.#note(received, total) });
      this.#end(`Exported ${chosen.name}, ${bytesText(this.#receivedBytes)}.`);
    } catch (error) {
      const wasDismissed = !chosen && error instanceof DOMException && error.name === "AbortError";
      this.#end(wasDismissed ? "" : signal.aborted ? `The export of ${name} was cancelled. No file was saved.` : failureText(error));
    }
  }

  #start(sizeBytes: number): void {
    [this.#startedMs, this.#receivedBytes, this.#totalBytes, this.#isEstimate] = [performance.now(), 0, sizeBytes, true];
    this.root.hidden = this.#bar.hidden = this.#cancel.hidden = false;
    this.#show();
    addEventListener("beforeunload", this.#onLeave);
    this.#changed();
    this.#cancel.focus();
  }

  #note(receivedBytes: number, totalBytes: number | null): void {
    this.#receivedBytes = receivedBytes;
    this.#isEstimate = totalBytes === null;
    this.#totalBytes = totalBytes ?? this.#totalBytes;
    this.#showing.request();
  }

  #show(): void {
    const [received, total] = [this.#receivedBytes, this.#totalBytes];
    this.#bar.max = Math.max(total, received, 1);
    this.#bar.value = received;
    const parts = [`${bytesText(received)} of ${this.#isEstimate ? "about " : ""}${bytesText(total)}`];
    const elapsedMs = performance.now() - this.#startedMs;
    if (elapsedMs > kRateAfterMs && received > 0) {
      parts.push(`${bytesText((received / elapsedMs) * 1000)}/s`);
      if (total > received) parts.push(`${spanInWords((((total - received) / received) * elapsedMs) / 1000)} left`);
    }
    setText(this.#text, parts.join(" · "));
  }

  #end(text: string): void {
    this.#abort = null;
    this.#showing.cancel();
    removeEventListener("beforeunload", this.#onLeave);
    this.#tell(text);
    if (text) notify(text);
    this.#changed();
  }

  #tell(text: string): void {
    this.#bar.hidden = this.#cancel.hidden = true;
    this.root.hidden = text === "";
    setText(this.#text, text);
  }
}

/** The server's refusal, a file that cannot be written, or a connection that was lost or has been silent. */
function failureText(error: unknown): string {
  if (error instanceof ServerError) return `Nothing was exported. ${error.message}`;
  const isOfFile = error instanceof DOMException && error.name !== "AbortError" && error.name !== "NetworkError";
  if (isOfFile) return `The file could not be written: ${error.message}`;
  return "The export broke off: the connection to the server was lost. No file was saved.";
}
