// SPDX-License-Identifier: Apache-2.0
//
// E-maps of the web API: the picture with its items for viewers, the plain list of items for the editor.

import type { Camera } from "./camera";
import type { Server } from "./server";

/** The numbers of the kinds on the wire. */
export const kKinds = ["camera", "emap", "door", "io", "pos"] as const;
export type ItemKind = (typeof kKinds)[number];

/** The type of a port that is an output; 3 is an input, 0 what is no port. */
export const kOutput = 1;

/** What is placed on a map. Numbers are pixels of the picture and degrees clockwise from up. */
export interface MapItem {
  kind: ItemKind;
  /** On the host that owns the device; 0 is this one. */
  id: number;
  server: number;
  name: string;
  x: number;
  y: number;
  direction: number;
  /** Where the name is shown: 0 below, 1 above, 2 left, 3 right. */
  textPos: number;
  iconCenterX: number;
  iconCenterY: number;
  /** One of the device's ports; -1: the device as a whole. */
  port: number;
}

/** An item as a viewer gets it. */
export interface ViewerItem extends MapItem {
  /** The camera itself, or the one that watches the device; null where there is none. */
  camera: Pick<Camera, "id" | "server"> | null;
  videoType: number;
  portType: number;
}

export interface MapFlags {
  hideNames: boolean;
  smallItems: boolean;
}

export interface ViewerMap extends MapFlags {
  /** Null where the server has none that can be read. */
  picture: Blob | null;
  items: ViewerItem[];
}

export interface EditedMap extends MapFlags {
  id: number;
  name: string;
  revision: number;
  items: MapItem[];
}

export interface MapName {
  id: number;
  name: string;
}

export interface DeviceState {
  kind: ItemKind;
  id: number;
  server: number;
  port: number;
  /** Empty where nothing was reported. */
  state: string;
  /** Unix seconds. */
  since: number;
  /** The camera of this host that watches it; 0: none. */
  camera: number;
}

/** A device or port that can be placed on a map. */
export interface Placeable {
  kind: ItemKind;
  id: number;
  server: number;
  name: string;
  port: number;
}

interface RawItem {
  type: number | string;
  id: number | string;
  hxId: number | string;
  name: string;
  x: number | string;
  y: number | string;
  direction: number | string;
  textPos: number | string;
  iconCenterX: number;
  iconCenterY: number;
  portIdx?: number;
}

interface RawViewerItem extends RawItem {
  VideoType?: number;
  portType?: number;
  pairedCamId?: number;
  pairedCamHxId?: number;
  pairedCamIdOnRec?: number;
}

interface RawDevice {
  id: number;
  name: string;
  hxId: number;
  idOnRec: number;
  inputs?: number;
  outputs?: number;
  port?: { idx: number; type: number }[];
}

type RawState = { id: number; hxId: number; portIdx: number; state: string; since: number; camera: number };

const kApi = "VEXO.Emap";
const kMediaTypes: Record<string, string> = {
  svg: "image/svg+xml",
  png: "image/png",
  jpg: "image/jpeg",
  webp: "image/webp",
};

export class Emaps {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  /** Those that the user may see. */
  async list(): Promise<MapName[]> {
    return (await this.#server.call<{ emap: MapName[] }>("VEXO.Catalog", "Emaps", {})).emap;
  }

  async open(id: number): Promise<ViewerMap> {
    type Raw = { emap: string; emapType: string; hideItemName: boolean; smallItemSize: boolean; items: RawViewerItem[] };
    const api = "VEXO.Lookhaven.Player.LiveviewSrc";
    const raw = await this.#server.call<Raw>(api, "Play", { itemType: "1", camera: String(id) });
    return {
      picture: raw.emap ? pictureOf(raw.emap, kMediaTypes[raw.emapType] ?? "image/png") : null,
      hideNames: raw.hideItemName,
      smallItems: raw.smallItemSize,
      items: raw.items.map(viewerItemOf),
    };
  }

  async states(id: number): Promise<DeviceState[]> {
    const parameters = { emap: String(id) };
    const raw = await this.#server.call<{ door: RawState[]; io: RawState[] }>(kApi, "States", parameters);
    const of = (kind: ItemKind) => (state: RawState) => ({
      kind,
      id: state.id,
      server: state.hxId,
      port: state.portIdx,
      state: state.state,
      since: state.since,
      camera: state.camera,
    });
    return [...raw.door.map(of("door")), ...raw.io.map(of("io"))];
  }

  async edit(id: number): Promise<EditedMap> {
    type Raw = { name: string; revision: number; hideItemName: boolean; smallItemSize: boolean; items: RawItem[] };
    const raw = await this.#server.call<Raw>(kApi, "Items", { emap: String(id) });
    const { name, revision, hideItemName: hideNames, smallItemSize: smallItems } = raw;
    return { id, name, revision, hideNames, smallItems, items: raw.items.map(itemOf) };
  }

  /** Returns the new revision. Rejects with status 409 where the map's revision is another by now. */
  async save(map: EditedMap): Promise<number> {
    const json = {
      emap: map.id,
      revision: map.revision,
      hideItemName: map.hideNames,
      smallItemSize: map.smallItems,
      items: map.items.map(({ kind, server, port, ...rest }) => ({
        ...rest,
        type: kKinds.indexOf(kind),
        hxId: server,
        portIdx: port,
      })),
    };
    return (await this.#server.call<{ revision: number }>(kApi, "SaveItems", {}, { json })).revision;
  }

  /** Devices, and each of their ports. */
  async placeable(): Promise<Placeable[]> {
    const raw = await this.#server.call<Record<ItemKind, RawDevice[]>>(kApi, "Devices", {});
    return kKinds.flatMap((kind) => raw[kind].flatMap((device) => placesOf(kind, device)));
  }
}

function placesOf(kind: ItemKind, device: RawDevice): Placeable[] {
  const whole = { kind, id: device.idOnRec, server: device.hxId, name: device.name, port: -1 };
  const inputs = device.inputs ?? 0;
  const ports =
    kind === "camera"
      ? Array.from({ length: inputs + (device.outputs ?? 0) }, (_, port) => ({ port, isInput: port < inputs }))
      : (device.port ?? []).map(({ idx, type }) => ({ port: idx, isInput: type === 3 }));
  const named = ports.map(({ port, isInput }) => ({
    ...whole,
    port,
    name: `${device.name}, ${isInput ? "input" : "output"} ${port}`,
  }));
  return kind === "io" ? named : [whole, ...named];
}

function pictureOf(base64: string, type: string): Blob {
  const bytes = Uint8Array.from(atob(base64), (character) => character.charCodeAt(0));
  return new Blob([bytes], { type });
}

/** The viewer's answer has numbers as strings, the editor's as numbers. */
function itemOf(raw: RawItem): MapItem {
  return {
    kind: kKinds[Number(raw.type)] ?? "camera",
    id: Number(raw.id),
    server: Number(raw.hxId),
    name: raw.name,
    x: Number(raw.x),
    y: Number(raw.y),
    direction: Number(raw.direction),
    textPos: Number(raw.textPos),
    iconCenterX: raw.iconCenterX,
    iconCenterY: raw.iconCenterY,
    port: raw.portIdx ?? -1,
  };
}

function viewerItemOf(raw: RawViewerItem): ViewerItem {
  const item = itemOf(raw);
  return { ...item, camera: cameraOf(item, raw), videoType: raw.VideoType ?? 0, portType: raw.portType ?? 0 };
}

function cameraOf(item: MapItem, raw: RawViewerItem): ViewerItem["camera"] {
  if (item.kind === "camera") return { id: item.id, server: item.server };
  const id = raw.pairedCamIdOnRec ?? 0;
  return id === 0 ? null : { id, server: raw.pairedCamHxId ?? 0 };
}
