// SPDX-License-Identifier: Apache-2.0
//
// The picture of a map out of a file that the user has chosen.
//
// Why so        The server stores pixels alone, and an SVG file has none. The browser draws it, as it would on the map.

import { kMaxUploadBytes } from "../../../wire/emap_setup";

export const kPictureFiles = ".png,.jpg,.jpeg,.webp,.svg";
/** The longer side of a drawing that is smaller, in pixels. */
const kDrawnSide = 2400;
const kMaxDrawnSide = 5000;

/** By how much a drawing of this size is enlarged, or made smaller. */
export function drawnScale(width: number, height: number): number {
  const side = Math.max(width, height);
  return Math.min(Math.max(1, kDrawnSide / side), kMaxDrawnSide / side);
}

/** "plans/Ground floor.v2.png": "Ground floor.v2". */
export function nameOfFile(name: string): string {
  return (name.split(/[/\\]/).pop() ?? "").replace(/\.[^.]*$/, "").slice(0, 64);
}

/** A sentence where the file can be no picture of a map; what it holds is the server's to judge. */
export async function pictureOfFile(file: File): Promise<Blob | string> {
  const isDrawing = file.type === "image/svg+xml" || /\.svg$/i.test(file.name);
  const picture = isDrawing ? await drawn(file) : file;
  if (!picture) return "This drawing cannot be shown.";
  if (picture.size === 0) return "This file is empty.";
  return picture.size > kMaxUploadBytes ? "This picture is too large: a map takes 20 MB at most." : picture;
}

async function drawn(file: Blob): Promise<Blob | null> {
  const url = URL.createObjectURL(new Blob([file], { type: "image/svg+xml" }));
  try {
    const image = new Image();
    image.src = url;
    await image.decode();
    const { naturalWidth, naturalHeight } = image;
    if (naturalWidth === 0 || naturalHeight === 0) return null;
    const scale = drawnScale(naturalWidth, naturalHeight);
    const canvas = document.createElement("canvas");
    canvas.width = Math.max(1, Math.round(naturalWidth * scale));
    canvas.height = Math.max(1, Math.round(naturalHeight * scale));
    canvas.getContext("2d")?.drawImage(image, 0, 0, canvas.width, canvas.height);
    return await new Promise((resolve) => canvas.toBlob(resolve, "image/png"));
  } catch {
    return null;
  } finally {
    URL.revokeObjectURL(url);
  }
}
