// SPDX-License-Identifier: Apache-2.0
//
// Builds elements: attributes as given, text as text nodes only, so that no name of a camera is ever markup.

type Attributes = Record<string, string | boolean>;

export function element<Tag extends keyof HTMLElementTagNameMap>(
  tag: Tag,
  attributes: Attributes = {},
  ...children: (Node | string)[]
): HTMLElementTagNameMap[Tag] {
  const made = document.createElement(tag);
  for (const [name, value] of Object.entries(attributes)) {
    if (typeof value === "boolean") made.toggleAttribute(name, value);
    else made.setAttribute(name, value);
  }
  made.append(...children);
  return made;
}

/** Writes the text only when it changes: tiles call this twice a second. */
export function setText(target: HTMLElement, text: string): void {
  if (target.textContent !== text) target.textContent = text;
}

/** Draws an image into a canvas of the image's own size. */
export function draw(canvas: HTMLCanvasElement, image: ImageBitmap | VideoFrame | HTMLCanvasElement): void {
  const width = "displayWidth" in image ? image.displayWidth : image.width;
  const height = "displayHeight" in image ? image.displayHeight : image.height;
  if (canvas.width !== width || canvas.height !== height) {
    canvas.width = width;
    canvas.height = height;
  }
  canvas.getContext("2d", { alpha: false })?.drawImage(image, 0, 0);
}
