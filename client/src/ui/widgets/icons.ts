// SPDX-License-Identifier: Apache-2.0
//
// The client's icons, drawn on a grid of 24 with round strokes of 1.75 in the colour of the text.

const kShapes = {
  lighthouse:
    "M12 2.5v2 M8.5 8a3.5 3.5 0 0 1 7 0 M7.5 8h9 M9 8l-1.5 13h9L15 8 M8.3 14.5h7.4 M18.5 6.5 21 5.5 M5.5 6.5 3 5.5",
  snapshot:
    "M4.5 7.5h3L9 5h6l1.5 2.5h3A1.5 1.5 0 0 1 21 9v8.5a1.5 1.5 0 0 1-1.5 1.5h-15A1.5 1.5 0 0 1 3 17.5V9a1.5 1.5 0 0 1 1.5-1.5Z " +
    "M15.5 13a3.5 3.5 0 1 1-7 0a3.5 3.5 0 0 1 7 0",
  download: "M12 4v11 M7.5 11 12 15.5 16.5 11 M4.5 19.5h15",
  export: "M4 7V5.5A1.5 1.5 0 0 1 5.5 4H7 M17 4h1.5A1.5 1.5 0 0 1 20 5.5V7 M4 11v2 M20 11v2 M12 8v9 M8 13.5l4 4 4-4 M5 20.5h14",
  close: "M6 6l12 12 M18 6 6 18",
  back: "M19.5 12h-15 M10.5 5.5 4 12l6.5 6.5",
  previous: "M14.5 5.5 8 12l6.5 6.5",
  next: "M9.5 5.5 16 12l-6.5 6.5",
  fullScreen: "M4 9V4h5 M15 4h5v5 M20 15v5h-5 M9 20H4v-5",
  soundOn: "M4 9.5v5h3.5L12 18.5v-13L7.5 9.5Z M15.5 9a4.2 4.2 0 0 1 0 6 M18 6.5a7.8 7.8 0 0 1 0 11",
  soundOff: "M4 9.5v5h3.5L12 18.5v-13L7.5 9.5Z M16 9.5l5 5 M21 9.5l-5 5",
  logout: "M10 4H5.5A1.5 1.5 0 0 0 4 5.5v13A1.5 1.5 0 0 0 5.5 20H10 M15.5 7.5 20 12l-4.5 4.5 M20 12H9.5",
  noSignal:
    "M3 3l18 18 M10 6h4.5A1.5 1.5 0 0 1 16 7.5V12l5-3v8 M16 16v.5a1.5 1.5 0 0 1-1.5 1.5h-10A1.5 1.5 0 0 1 3 16.5v-9A1.5 1.5 0 0 1 4.5 6H6",
  camera:
    "M4.5 6h10A1.5 1.5 0 0 1 16 7.5v9a1.5 1.5 0 0 1-1.5 1.5h-10A1.5 1.5 0 0 1 3 16.5v-9A1.5 1.5 0 0 1 4.5 6Z M16 11l5-3v8l-5-3",
  play: "M8 5.2v13.6L19 12Z",
  pause: "M8.5 5v14 M15.5 5v14",
  stepBack: "M17 6.5 9.5 12l7.5 5.5Z M6.5 6v12",
  stepForward: "M7 6.5l7.5 5.5L7 17.5Z M17.5 6v12",
  eventBefore: "M19 6.5 12.5 12l6.5 5.5Z M12 6.5 5.5 12l6.5 5.5Z",
  eventAfter: "M5 6.5l6.5 5.5L5 17.5Z M12 6.5l6.5 5.5-6.5 5.5Z",
  jumpBack: "M4 5v5h5 M4.6 10a8 8 0 1 1-.4 4.5 M9.5 10v5.5 M12.5 12.7a1.6 2.7 0 1 0 3.2 0a1.6 2.7 0 1 0-3.2 0",
  jumpForward: "M20 5v5h-5 M19.4 10a8 8 0 1 0 .4 4.5 M8.5 10v5.5 M11.5 12.7a1.6 2.7 0 1 0 3.2 0a1.6 2.7 0 1 0-3.2 0",
  recent: "M4 5v5h5 M4.6 10a8 8 0 1 1-.4 4.5 M12 8v4.5l3 2",
  sameMoment: "M4 4h6.5v6.5H4Z M13.5 4H20v6.5h-6.5Z M4 13.5h6.5V20H4Z M16.8 21a3.7 3.7 0 1 0 0-7.4 3.7 3.7 0 0 0 0 7.4Z M16.8 15.6v1.9l1.2.8",
  calendar: "M5 5.5h14A1.5 1.5 0 0 1 20.5 7v12A1.5 1.5 0 0 1 19 20.5H5A1.5 1.5 0 0 1 3.5 19V7A1.5 1.5 0 0 1 5 5.5Z M3.5 10h17 M8 3v4 M16 3v4",
  events: "M4 12h16 M7 8v8 M12 5v14 M17 8v8",
  live: "M12 14a2 2 0 1 0 0-4 2 2 0 0 0 0 4Z M7.8 7.8a6 6 0 0 0 0 8.4 M16.2 7.8a6 6 0 0 1 0 8.4 M4.9 4.9a10 10 0 0 0 0 14.2 M19.1 4.9a10 10 0 0 1 0 14.2",
  now: "M5 6.5l7 5.5-7 5.5Z M18.5 6v12",
  zoomIn: "M15.5 10.5a5 5 0 1 1-10 0 5 5 0 0 1 10 0Z M14.2 14.2 20 20 M10.5 8.3v4.4 M8.3 10.5h4.4",
  zoomOut: "M15.5 10.5a5 5 0 1 1-10 0 5 5 0 0 1 10 0Z M14.2 14.2 20 20 M8.3 10.5h4.4",
  filter: "M4 6h16 M7 12h10 M10 18h4",
  warning: "M12 4 2.8 19.5h18.4Z M12 10v4.5 M12 17v.2",
  map: "M9 4.5 3.5 6.5v13L9 17.5l6 2 5.5-2v-13L15 6.5Z M9 4.5v13 M15 6.5v13",
  door: "M6.5 20.5v-16A1 1 0 0 1 7.5 3.5h9a1 1 0 0 1 1 1v16 M3.5 20.5h17 M14.2 12v.6",
  doorOpen: "M6.5 20.5v-16A1 1 0 0 1 7.5 3.5h9 M3.5 20.5h17 M6.5 4.5l7 3v15l-7-2 M11.2 14v.6",
  kept: "M7 11h10a1 1 0 0 1 1 1v7a1 1 0 0 1-1 1H7a1 1 0 0 1-1-1v-7a1 1 0 0 1 1-1Z M8.5 11V7.5a3.5 3.5 0 0 1 7 0V11",
  notKept: "M7 11h10a1 1 0 0 1 1 1v7a1 1 0 0 1-1 1H7a1 1 0 0 1-1-1v-7a1 1 0 0 1 1-1Z M8.5 11V6.5a3.5 3.5 0 0 1 6.8-1.2",
  doorLocked: "M7.5 11h9a1 1 0 0 1 1 1v7a1 1 0 0 1-1 1h-9a1 1 0 0 1-1-1v-7a1 1 0 0 1 1-1Z M8.5 11V7.5a3.5 3.5 0 0 1 7 0V11 M12 14.5v2",
  io: "M12 3.5v6 M8 6.5a7.5 7.5 0 1 0 8 0",
  pos: "M5 3.5h14v17l-2.3-1.8-2.4 1.8-2.3-1.8-2.3 1.8-2.4-1.8L5 20.5Z M8.5 8h7 M8.5 12h7",
  edit: "M4 20l1-4.5L16 4.5l3.5 3.5L8.5 19Z M13.5 7l3.5 3.5",
  undo: "M8.5 5 4 9.5 8.5 14 M4 9.5h10a5.5 5.5 0 0 1 0 11h-4",
  redo: "M15.5 5 20 9.5 15.5 14 M20 9.5H10a5.5 5.5 0 0 0 0 11h4",
  turnLeft: "M5 5v5h5 M5.5 10a7.5 7.5 0 1 1-.8 5",
  turnRight: "M19 5v5h-5 M18.5 10a7.5 7.5 0 1 0 .8 5",
  remove: "M5 7h14 M9.5 7V4.5h5V7 M6.5 7l1 13h9l1-13 M10 11v5.5 M14 11v5.5",
  fit: "M4 9V4h5 M20 9V4h-5 M4 15v5h5 M20 15v5h-5 M9 9h6v6H9Z",
  keys: "M4.5 6.5h15A1.5 1.5 0 0 1 21 8v8a1.5 1.5 0 0 1-1.5 1.5h-15A1.5 1.5 0 0 1 3 16V8a1.5 1.5 0 0 1 1.5-1.5Z M7 10.5h.01 M10.3 10.5h.01 M13.7 10.5h.01 M17 10.5h.01 M8.5 14h7",
  settings: "M4 7h9 M17 7h3 M15 9.2a2.2 2.2 0 1 0 0-4.4 2.2 2.2 0 0 0 0 4.4Z M4 17h3 M11 17h9 M9 19.2a2.2 2.2 0 1 0 0-4.4 2.2 2.2 0 0 0 0 4.4Z",
  people: "M9.5 11a3.5 3.5 0 1 0 0-7 3.5 3.5 0 0 0 0 7Z M3 19.5a6.5 6.5 0 0 1 13 0 M15.5 4.6a3.5 3.5 0 0 1 0 6 M18 14.4a6.5 6.5 0 0 1 3 5.1",
  account: "M12 12a4 4 0 1 0 0-8 4 4 0 0 0 0 8Z M4.5 20a7.5 7.5 0 0 1 15 0",
  storage: "M12 8.5c4.1 0 7.5-1.1 7.5-2.5S16.1 3.5 12 3.5 4.5 4.6 4.5 6s3.4 2.5 7.5 2.5Z M4.5 6v12c0 1.4 3.4 2.5 7.5 2.5s7.5-1.1 7.5-2.5V6 M4.5 12c0 1.4 3.4 2.5 7.5 2.5s7.5-1.1 7.5-2.5",
  hosts: "M5.5 4h13A1.5 1.5 0 0 1 20 5.5v4a1.5 1.5 0 0 1-1.5 1.5h-13A1.5 1.5 0 0 1 4 9.5v-4A1.5 1.5 0 0 1 5.5 4Z M5.5 13h13a1.5 1.5 0 0 1 1.5 1.5v4a1.5 1.5 0 0 1-1.5 1.5h-13A1.5 1.5 0 0 1 4 18.5v-4A1.5 1.5 0 0 1 5.5 13Z M7.5 7.5h.01 M7.5 16.5h.01",
  system: "M3 12h4l2.5-6.5 4.5 13 2.5-6.5H21",
  audit: "M12 20.5a8.5 8.5 0 1 0 0-17 8.5 8.5 0 0 0 0 17Z M12 7.5V12l3 2",
  grip: "M9 6h.01 M15 6h.01 M9 12h.01 M15 12h.01 M9 18h.01 M15 18h.01",
  savedLayouts: "M8 7.5V4h12v12h-3.5 M4 8h12.5v12H4Z M10 8v12 M4 14h12.5",
  overwrite: "M5.5 4H16l4 4v10.5a1.5 1.5 0 0 1-1.5 1.5h-13A1.5 1.5 0 0 1 4 18.5v-13A1.5 1.5 0 0 1 5.5 4Z M8 4v4.5h7V4 M7.5 20v-6.5h9V20",
  layoutAuto: "M4 4h9.5v16H4Z M17 4h3v5h-3Z M17 12.5h3V20h-3Z",
  layoutFirst: "M4 4h11v11H4Z M17.5 4H20v3h-2.5Z M17.5 10H20v5h-2.5Z M4 17.5h4V20H4Z M11 17.5h4V20h-4Z M17.5 17.5H20V20h-2.5Z",
  layout1: "M4 5h16v14H4Z",
  layout2: "M4 5h16v14H4Z M12 5v14 M4 12h16",
  layout3: "M4 5h16v14H4Z M9.3 5v14 M14.7 5v14 M4 9.7h16 M4 14.3h16",
  layout4: "M4 4h16v16H4Z M8 4v16 M12 4v16 M16 4v16 M4 8h16 M4 12h16 M4 16h16",
} as const;

export type IconName = keyof typeof kShapes;

const kSvg = "http://www.w3.org/2000/svg";

/** Purely visual: the control around it carries the label. */
export function icon(name: IconName): SVGSVGElement {
  const svg = document.createElementNS(kSvg, "svg");
  const attributes = { viewBox: "0 0 24 24", class: "icon", "aria-hidden": "true", focusable: "false" };
  for (const [attribute, value] of Object.entries(attributes)) svg.setAttribute(attribute, value);
  const path = document.createElementNS(kSvg, "path");
  path.setAttribute("d", kShapes[name]);
  svg.append(path);
  return svg;
}
