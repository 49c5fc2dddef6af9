// SPDX-License-Identifier: Apache-2.0
//
// Builds elements of drawings; the style sheets colour them.

const kSvg = "http://www.w3.org/2000/svg";

export function svgElement(
  tag: string,
  attributes: Record<string, string | number>,
  ...children: (Node | string)[]
): SVGElement {
  const made = document.createElementNS(kSvg, tag);
  for (const [name, value] of Object.entries(attributes)) made.setAttribute(name, String(value));
  made.append(...children);
  return made;
}
