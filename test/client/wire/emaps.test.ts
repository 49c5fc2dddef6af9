// SPDX-License-Identifier: Apache-2.0
//
// Maps of the server: what its two forms of an item become, and what is saved.

import { Emaps } from "../../../client/src/wire/emaps";
import { Server } from "../../../client/src/wire/server";

const kText = { name: "Gate <b>", x: "5", y: "7", direction: "90", textPos: "2", iconCenterX: 3, iconCenterY: -3 };

describe("a map as the server tells it", () => {
  const asked: { url: URL; init: RequestInit | undefined }[] = [];
  const emaps = new Emaps(new Server(() => undefined));

  function answerWith(data: unknown, status = 200): void {
    asked.length = 0;
    vi.stubGlobal("fetch", (url: string, init?: RequestInit) => {
      asked.push({ url: new URL(url, "http://localhost/"), init });
      const body = status === 200 ? { success: true, data } : { success: false, error: { code: status } };
      return Promise.resolve(new Response(JSON.stringify(body), { status }));
    });
  }

  afterEach(() => vi.unstubAllGlobals());

  it.each([
    [{ type: "0", id: "4", hxId: "0", VideoType: 3, portIdx: -1, portType: 0 }, { id: 4, server: 0 }],
    [{ type: "0", id: "4", hxId: "2", VideoType: 1, portIdx: 1, portType: 3 }, { id: 4, server: 2 }],
    [{ type: "3", id: "6", hxId: "0", portIdx: 0, pairedCamId: 9, pairedCamHxId: 2, pairedCamIdOnRec: 4 }, { id: 4, server: 2 }],
    [{ type: "3", id: "6", hxId: "0", portIdx: 0, pairedCamId: 0, pairedCamHxId: 0, pairedCamIdOnRec: 0 }, null],
    [{ type: "4", id: "6", hxId: "2", pairedCamHxId: 2, pairedCamIdOnRec: 5 }, { id: 5, server: 2 }],
    [{ type: "2", id: "6", hxId: "0" }, null],
    [{ type: "1", id: "6", hxId: "0" }, null],
  ])("finds the camera of %o", async (raw, camera) => {
    answerWith({ emap: "PHN2Zy8+", emapType: "svg", hideItemName: true, smallItemSize: false, items: [{ ...raw, ...kText }] });
    const map = await emaps.open(1);
    expect(map).toMatchObject({ hideNames: true, smallItems: false });
    expect(map.picture?.type).toBe("image/svg+xml");
    expect(await map.picture?.text()).toBe("<svg/>");
    expect(map.items[0]).toMatchObject({ camera, x: 5, y: 7, direction: 90, textPos: 2, iconCenterX: 3, name: "Gate <b>" });
  });

  it("has no picture where the server has none", async () => {
    answerWith({ emap: "", emapType: "png", hideItemName: false, smallItemSize: false, items: [] });
    expect((await emaps.open(1)).picture).toBeNull();
  });

  it("is saved as it was read", async () => {
    const raw = { type: 3, id: 6, hxId: 2, name: "a", x: 1, y: 2, direction: 3, textPos: 1, iconCenterX: 4, iconCenterY: 5, portIdx: 0 };
    answerWith({ id: 1, name: "m", revision: 8, hideItemName: true, smallItemSize: true, items: [raw] });
    const map = await emaps.edit(1);
    answerWith({ revision: 9 });
    expect(await emaps.save(map)).toBe(9);
    expect(asked[0]?.init?.method).toBe("POST");
    const saved = { emap: 1, revision: 8, hideItemName: true, smallItemSize: true, items: [raw] };
    expect(JSON.parse(String(asked[0]?.init?.body))).toEqual(saved);
    answerWith(null, 409);
    await expect(emaps.save(map)).rejects.toMatchObject({ status: 409 });
  });

  it("may hold each port of what has ports", async () => {
    const device = { id: 1, name: "A", hxId: 2, idOnRec: 7 };
    const io = { ...device, port: [{ idx: 5, type: 1 }] };
    answerWith({ camera: [{ ...device, inputs: 1, outputs: 1 }], emap: [device], door: [], io: [io], pos: [] });
    const found = (await emaps.placeable()).map(({ kind, id, server, port, name }) => [kind, id, server, port, name]);
    expect(found).toEqual([
      ["camera", 7, 2, -1, "A"],
      ["camera", 7, 2, 0, "A, input 0"],
      ["camera", 7, 2, 1, "A, output 1"],
      ["emap", 7, 2, -1, "A"],
      ["io", 7, 2, 5, "A, output 5"],
    ]);
  });

  it("asks this host for the cameras of another", async () => {
    const server = new Server(() => undefined);
    const camera = { id: 4, name: "", video_type: 1, liveview_port: 0, cam_ptz: 0, sound_support: 0 };
    answerWith(null, 504);
    await server.live({ ...camera, server: 3 }, 1, new AbortController().signal).catch(() => undefined);
    await server.live({ ...camera, server: 0 }, null, new AbortController().signal).catch(() => undefined);
    const [far, own] = asked.map(({ url }) => Object.fromEntries(url.searchParams));
    expect(far).toMatchObject({ api: "VEXO.Relay", server: "3", camera: "4", profileType: "1" });
    expect(own).toEqual({ api: "VEXO.Lookhaven.Player.LiveviewSrc", version: "1", method: "Play", camera: "4" });
  });
});
