// SPDX-License-Identifier: Apache-2.0
//
// What is asked before a map is added, renamed, given another picture or removed.

import type { EmapRecord, EmapSetup } from "../../../wire/emap_setup";
import type { UploadOptions } from "../../../wire/upload";
import { counted } from "../../widgets/amounts";
import { element } from "../../widgets/dom";
import { fileField, textField } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";
import { SeenRecord } from "../seen_record";
import { kPictureFiles, nameOfFile, pictureOfFile } from "./picture_file";

const kPictureHint = "PNG, JPEG, WebP or SVG, at most 20 MB. Nothing but the picture itself is kept of the file.";

/** Each of these resolves with whether it is done. */
export function askToAdd(host: HTMLElement, setup: EmapSetup): Promise<boolean> {
  const name = textField("Name", { maxlength: "64" });
  return askForPicture(host, "Add a map", "Add", [name.root], {
    onFile: (file) => (name.value ||= nameOfFile(file.name)),
    problem: () => (name.value.trim() ? "" : "Please give the map a name."),
    upload: (picture, options) => setup.add(name.value.trim(), picture, options),
  });
}

export function askToReplace(host: HTMLElement, setup: EmapSetup, map: EmapRecord): Promise<boolean> {
  const seen = new SeenRecord(map, "Replace");
  const hint =
    "What is placed on the map stays where it is, counted in pixels: look at it if the new picture has another size.";
  const content = map.items > 0 ? [element("p", {}, hint)] : [];
  return askForPicture(host, `Another picture for ${map.name}`, "Replace", content, {
    onFile: () => undefined,
    problem: () => "",
    upload: (picture, options) => seen.attempt((current) => setup.replacePicture(current, picture, options)),
  });
}

export function askToRename(host: HTMLElement, setup: EmapSetup, map: EmapRecord): Promise<boolean> {
  const name = textField("Name", { maxlength: "64" });
  const seen = new SeenRecord(map, "Rename");
  name.value = map.name;
  return openDialog(host, {
    title: `Rename ${map.name}`,
    content: [name.root],
    submit: "Rename",
    attempt: async () => {
      const text = name.value.trim();
      return text ? seen.attempt((current) => setup.rename(current, text)) : "Please give the map a name.";
    },
  });
}

export function askToRemove(host: HTMLElement, setup: EmapSetup, map: EmapRecord): Promise<boolean> {
  const seen = new SeenRecord(map, "Remove");
  return openDialog(host, {
    title: `Remove ${map.name}?`,
    content: removalSentences(map).map((sentence) => element("p", {}, sentence)),
    submit: "Remove",
    attempt: () => seen.attempt((current) => setup.remove(current)),
  });
}

/** What goes with it, and what else shows it. */
export function removalSentences({ items, linkedFrom }: Pick<EmapRecord, "items" | "linkedFrom">): string[] {
  const links = linkedFrom.map(({ name }) => name).join(", ");
  return [
    items > 0
      ? `Its picture is deleted, and so are the places of ${counted(items, "item")} on it. Cameras and devices stay.`
      : "Its picture is deleted.",
    links
      ? `It is also shown as a link on: ${links}. That link stays and will no longer work.`
      : "No other map has a link to it.",
  ];
}

interface PictureWork {
  onFile(file: File): void;
  /** A sentence where something is missing beside the picture. */
  problem(): string;
  upload(picture: Blob, options: UploadOptions): Promise<unknown>;
}

async function askForPicture(
  host: HTMLElement,
  title: string,
  submit: string,
  content: HTMLElement[],
  work: PictureWork,
): Promise<boolean> {
  const file = fileField("Picture", kPictureFiles, kPictureHint);
  const bar = element("progress", { class: "upload-bar", max: "1", value: "0", "aria-label": "Upload", hidden: true });
  const stage = element("p", { class: "quiet", role: "status" });
  const leaving = new AbortController();
  file.input.addEventListener("change", () => file.file && work.onFile(file.file));
  const showProgress = (fraction: number) => {
    bar.hidden = false;
    bar.value = fraction;
    stage.textContent = fraction < 1 ? "Uploading the picture…" : "The server is checking the picture…";
  };
  const isDone = await openDialog(host, {
    title,
    content: [file.root, ...content, bar, stage],
    submit,
    attempt: async () => {
      if (!file.file) return "Please choose a picture.";
      const problem = work.problem();
      if (problem) return problem;
      const picture = await pictureOfFile(file.file);
      if (typeof picture === "string") return picture;
      showProgress(0);
      try {
        const said = await work.upload(picture, { signal: leaving.signal, onProgress: showProgress });
        if (typeof said === "string") return said;
      } finally {
        bar.hidden = true;
        stage.textContent = "";
      }
    },
  });
  leaving.abort();
  return isDone;
}
