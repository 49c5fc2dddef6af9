// SPDX-License-Identifier: Apache-2.0
//
// The built client in a real browser: which connections it holds, what it says of a silent camera, keyboard and phone.

import { execFileSync } from "node:child_process";
import type { Page } from "playwright-core";
import { Fingers, middleOf } from "../../support/fingers";
import { hasBrowser, ServedClient, smallControls } from "../../support/served_client";

/** Pictures of H.264 that are white for the first four of each 25, else black. */
function flashes(): Buffer[] {
  const source = "color=black:s=320x180:r=25:d=2,drawbox=color=white:t=fill:enable='lt(mod(n\\,25)\\,4)'";
  const encode = ["-c:v", "libx264", "-preset", "ultrafast", "-bf", "0", "-g", "25", "-x264-params", "aud=1"];
  const video = execFileSync("ffmpeg", ["-v", "error", "-f", "lavfi", "-i", source, ...encode, "-f", "h264", "-"]);
  const delimiter = Buffer.from([0, 0, 0, 1, 9]);
  const starts: number[] = [];
  for (let at = 0; at >= 0; at = video.indexOf(delimiter, at + 1)) starts.push(at);
  return starts.map((start, index) => video.subarray(start, starts[index + 1]));
}

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();
  const { server } = client;

  beforeAll(() => {
    server.muxed.set(12, { type: "H264", pictures: flashes(), isLoud: (number) => number % 25 < 4 });
    const unplayable = Buffer.from("0000000142010101600000030090000003000003003fa0050201000000012601af", "hex");
    server.muxed.set(13, { type: "H265", pictures: [unplayable], isLoud: () => false });
  });

  async function loggedIn(cameras: number | number[], widthPx = 1440, heightPx = 900, from = client.address): Promise<Page> {
    server.hasSession = false;
    server.stalled.clear();
    server.cameras.length = 0;
    for (const id of typeof cameras === "number" ? Array.from({ length: cameras }, (_, index) => index + 1) : cameras)
      server.cameras.push({ id, name: `Camera <b>${id}</b>`, video_type: server.muxed.has(id) ? 3 : 1 });
    const page = await client.open(from, widthPx, heightPx);
    for (const input of await page.locator("input").all()) await input.fill("x");
    await page.keyboard.press("Enter");
    await page.waitForSelector(".tile[data-state=live]");
    return page;
  }

  /** Of so many tiles. */
  const allLive = (page: Page, tiles: number) => page.locator(".tile[data-state=live]").nth(tiles - 1).waitFor();
  const open = (streams: string[]) => vi.waitFor(() => expect([...server.streams].sort()).toEqual(streams), 5000);

  test("four tiles stream and the others poll in turns; what is not seen has no connection", async () => {
    const page = await loggedIn(9);
    await open(["1/1", "2/1", "3/1", "4/1"]);
    await allLive(page, 9);
    await vi.waitFor(() => expect(server.polls).toBeGreaterThan(7), 5000);
    expect(server.mostPollsAtOnce).toBe(1);
    await page.click("[data-camera='3'] .tile-open");
    await open(["3/usual"]);
    await page.keyboard.press("Escape");
    await open(["1/1", "2/1", "3/1", "4/1"]);
    await page.click("[data-layout='2']");
    await page.evaluate(() => document.querySelector(".grid")!.scrollTo(0, 1e6));
    await open(["7/1", "8/1", "9/1"]);
    await page.evaluate(() => {
      Object.defineProperty(document, "hidden", { value: true });
      document.dispatchEvent(new Event("visibilitychange"));
    });
    await open([]);
  }, 40_000);

  test("a silent camera is told from a live one, and comes back", async () => {
    const page = await loggedIn(3);
    await allLive(page, 3);
    server.stalled.add(3);
    await page.locator("[data-camera='3'] .message-sentence", { hasText: /^No signal since \d\d:\d\d:\d\d$/ }).waitFor();
    expect(await page.textContent(".bar-status")).toBe("3 cameras · 1 without signal");
    const lost = { id: 3, state: "no-signal", no_signal: { since: 0, cause: "wrong-password" } };
    server.answers = { CameraStates: { recorder: true, camera: [lost] } };
    await page.locator("[data-camera='3'] .tile-state", { hasText: "wrong password" }).waitFor();
    expect(await page.textContent("[data-camera='3'] .message")).toMatch(/since 1970-01-01 .*Camera: wrong password/);
    server.answers = {};
    expect(await page.getAttribute("[data-camera='1']", "data-state")).toBe("live");
    server.stalled.clear();
    await allLive(page, 3);
    // One of 4:3, and one that the server does not list any more.
    server.pictures.set(1, await page.screenshot({ type: "jpeg", clip: { x: 0, y: 0, width: 40, height: 30 } }));
    server.cameras.splice(1, 1);
    await page.evaluate(() => document.dispatchEvent(new Event("visibilitychange")));
    await page.locator("[data-camera='2'][data-state=absent] .message", { hasText: "Removed" }).waitFor();
    await page.waitForFunction(() => document.querySelector<HTMLCanvasElement>("[data-camera='1'] canvas")!.width === 40);
    const [first, second] = await page.locator(".tile").evaluateAll((tiles) => tiles.map((tile) => tile.getBoundingClientRect().bottom));
    expect(first).toBe(second);
    server.pictures.clear();
    await page.click("[aria-label^='Take Camera'] ");
    await page.waitForSelector("[data-camera='2']", { state: "detached" });
  }, 40_000);

  test("all can be done with keys; a snapshot opens over the picture and closes without leaving it", async () => {
    const page = await loggedIn(4);
    await page.focus("[data-camera='1'] .tile-open");
    await page.keyboard.press("ArrowDown");
    await page.keyboard.press("Enter");
    await page.locator(".large-name", { hasText: /^Camera <b>3<\/b>$/ }).waitFor();
    await page.keyboard.press("s");
    await page.waitForSelector("dialog a[download^=Camera-b-3-b_]");
    await page.keyboard.press("Escape");
    await page.waitForSelector("dialog[open]", { state: "detached" });
    await page.keyboard.press("ArrowLeft");
    expect(await page.textContent(".large-name")).toBe("Camera <b>2</b>");
    await page.waitForSelector(".large[data-state=live]");
    await page.keyboard.press("Escape");
    await page.waitForSelector(".tile[data-camera='2'] :focus");
  }, 40_000);

  test("tiles change places by mouse, finger and keys, and stay there; one can be large; a picture can be magnified", async () => {
    const page = await loggedIn(4);
    const order = () => page.locator(".tile").evaluateAll((tiles) => tiles.map((tile) => (tile as HTMLElement).dataset["camera"]).join(""));
    await page.focus("[data-camera='1'] .tile-open");
    await page.keyboard.press("Shift+ArrowRight");
    expect(await order()).toBe("2134");
    await page.dragAndDrop("[data-camera='2'] .tile-open", "[data-camera='4'] .tile-open");
    expect([await order(), await page.locator(".large").count()], "the end of a drag is no click").toEqual(["1342", 0]);
    const fingers = await Fingers.of(page);
    const [from, to] = await Promise.all([2, 1].map((id) => middleOf(page, `[data-camera='${id}'] .tile-open`)));
    await fingers.send("touchStart", [from!]);
    await page.waitForSelector("[data-camera='2'].is-dragged");
    await fingers.send("touchMove", [to!]);
    await fingers.send("touchEnd", []);
    expect([await order(), await page.locator(".large").count()], "after a long press a finger drags too").toEqual(["2134", 0]);
    await page.dragAndDrop("[data-camera='2'] .tile-open", "[data-camera='4'] .tile-open");
    await page.click("[data-layout='4']");
    await page.waitForFunction(() => {
      const [tile, grid] = [document.querySelector(".tile")!.getBoundingClientRect(), document.querySelector(".grid")!.getBoundingClientRect()];
      return [grid.width / tile.width, grid.height / tile.height].every((ratio) => ratio >= 4 && ratio < 5);
    });
    await page.click("[data-layout='first']");
    await page.reload();
    await page.waitForFunction(() => {
      const widths = [...document.querySelectorAll(".tile")].map(({ clientWidth }) => clientWidth);
      return widths.length === 4 && widths[0]! > 3 * widths[1]!;
    });
    expect(await order()).toBe("1342");
    await page.click(".tile-open");
    await page.waitForSelector(".large[data-state=live]");
    await page.mouse.wheel(0, -400);
    await page.waitForFunction(() => document.querySelector(".large canvas")!.getBoundingClientRect().width > innerWidth * 1.5);
  }, 40_000);

  test("all kinds of cameras side by side; sound on demand, and the picture in step with it", async () => {
    const page = await loggedIn([13, 1, 2, 3, 12]);
    await allLive(page, 5);
    // The camera that cannot be played has left its stream to the last one.
    await open(["1/1", "12/usual", "2/1", "3/1"]);
    expect(await page.locator(".hint").allTextContents()).toEqual(["This browser cannot play H.265: still pictures", "", "", "", ""]);
    await page.evaluate(watchSoundAndPicture);
    await page.click("[data-camera='12'] .tile-open");
    await page.locator(".large-description", { hasText: / 2[0-9] fps$/ }).waitFor();
    await page.locator(".sound", { hasText: "Sound off" }).waitFor();
    expect(await page.evaluate(() => document.body.dataset["sounds"]), "muted at first").toBe("");
    await page.keyboard.press("m");
    await page.waitForFunction(() => document.body.dataset["sounds"]!.split(" ").length >= 6);
    expect(await page.textContent(".sound")).toBe("Sound on");
    const { sounds, pictures } = (await page.evaluate(() => ({ ...document.body.dataset }))) as Record<string, string>;
    const seenMs = pictures!.split(" ").map(Number);
    // The first second, in which the picture begins to wait for the sound, is not checked.
    const offsetsMs = sounds!
      .split(" ")
      .slice(2)
      .map((heard) => Math.min(...seenMs.map((seen) => Math.abs(seen - Number(heard)))));
    expect(Math.max(...offsetsMs.sort((one, other) => one - other).slice(0, -1))).toBeLessThanOrEqual(80);
    await page.keyboard.press("m");
    await page.locator(".sound", { hasText: "Sound off" }).waitFor();
  }, 40_000);

  test("a group's tab shows its cameras alone, and no others have a connection; Back and a reload keep to it", async () => {
    const page = await loggedIn(4);
    await allLive(page, 4);
    const tiles = () => page.locator(".tile").evaluateAll((all) => all.map((tile) => (tile as HTMLElement).dataset["camera"]));
    await page.getByRole("link", { name: "Yard" }).click();
    await open(["1/1", "2/1"]);
    expect([await tiles(), await page.textContent(".bar-status")]).toEqual([["1", "2"], "2 of 4 cameras"]);
    const lost = { state: "no-signal", no_signal: { since: 0, cause: "refused" } };
    server.answers = { CameraStates: { recorder: true, camera: [1, 4, 9].map((id) => ({ id, ...lost })) } };
    // Camera 1 has its picture again, and the account may not see camera 9.
    await page.locator(".bar-status[title$=': Camera <b>4</b>']", { hasText: /^2 of 4 cameras · 1 without signal$/ }).waitFor();
    server.answers = {};
    await page.focus("[data-camera='1'] .tile-open");
    await page.keyboard.press("Shift+ArrowRight");
    await page.click("[data-camera='1'] .tile-open");
    await page.keyboard.press("ArrowRight");
    await page.waitForURL(/#camera=2$/);
    await page.keyboard.press("Escape");
    await page.waitForURL(/#group=1$/);
    await page.reload();
    await allLive(page, 2);
    expect(await tiles()).toEqual(["2", "1"]);
    await page.getByRole("link", { name: "All" }).click();
    await allLive(page, 4);
    expect((await tiles()).indexOf("2")).toBeLessThan((await tiles()).indexOf("1"));
    await page.evaluate(() => void (location.hash = "#group=7"));
    await page.locator(".wall-message", { hasText: "This group has no cameras that you may watch." }).waitFor();
    await page.getByRole("link", { name: "Show all cameras" }).click();
    await allLive(page, 4);
  }, 40_000);

  test("from a live picture to its recordings: all, and the last half a minute", async () => {
    const page = await loggedIn(2);
    await page.getByRole("button", { name: "Recordings of Camera <b>2</b>" }).click();
    await page.locator(".stage-caption", { hasText: "Camera <b>2</b>" }).waitFor();
    await page.goBack();
    await page.click("[data-camera='1'] .tile-open");
    const nowS = Date.now() / 1000;
    await page.locator(".large").getByRole("button", { name: "Last 30 seconds of Camera <b>1</b>" }).click();
    await page.locator(".stage-caption", { hasText: "Camera <b>1</b>" }).waitFor();
    await page.waitForFunction((atS) => Math.abs(Number(document.querySelector(".timeline-lanes")!.getAttribute("aria-valuenow")) - atS) < 25, nowS - 30);
  }, 40_000);

  test("over plain HTTP still pictures are shown, with a link to where there is more", async () => {
    const page = await loggedIn([1, 12], 1440, 900, client.address.replace("127.0.0.1", "lan.test"));
    await allLive(page, 2);
    await open(["1/1"]);
    expect(await page.getAttribute(".wall-advice a", "href")).toBe("https://lan.test:9443/");
    await page.click("[data-camera='12'] .tile-open");
    await page.locator(".large-state", { hasText: /^live, every 2 s$/ }).waitFor();
    expect(await page.getAttribute(".large .hint a", "href")).toBe("https://lan.test:9443/#camera=12");
  }, 40_000);

  test("a session that ends leads to the login", async () => {
    const page = await loggedIn(4);
    server.hasSession = false;
    await page.locator(".login-message", { hasText: "Your session has ended. Please log in again." }).waitFor();
  }, 40_000);

  test("a phone shows one column, and nothing too small for a finger", async () => {
    const page = await loggedIn(4, 390, 844);
    const lefts = await page.locator(".tile").evaluateAll((tiles) => tiles.map((tile) => tile.getBoundingClientRect().left));
    expect(new Set(lefts).size).toBe(1);
    expect(await page.evaluate(smallControls, "button, a")).toEqual([]);
    await page.click(".tile-open");
    await page.waitForSelector(".large[data-state=live]");
    expect(await page.evaluate(smallControls, "button, a")).toEqual([]);
    expect(await page.evaluate(() => document.documentElement.scrollWidth)).toBe(390);
  }, 40_000);
});

/** Runs in the page: notes in its body when a sound begins to be heard, and when the large picture turns white. */
function watchSoundAndPicture(): void {
  const notes = Object.assign(document.body.dataset, { sounds: "", pictures: "" });
  const note = (what: "sounds" | "pictures", ms: number) => (notes[what] = `${notes[what]} ${ms}`.trim());
  const connect = AudioNode.prototype.connect as (to: AudioNode) => AudioNode;
  AudioNode.prototype.connect = function (this: AudioNode, to: AudioNode) {
    const context = this.context as AudioContext;
    const ear = context.createAnalyser();
    const samples = new Float32Array(ear.fftSize);
    let lastLoud = 0;
    setInterval(() => {
      const endTime = context.currentTime;
      ear.getFloatTimeDomainData(samples);
      samples.forEach((sample, index) => {
        const atTime = endTime - (samples.length - index) / context.sampleRate;
        if (Math.abs(sample) < 0.05 || atTime <= lastLoud) return;
        const { contextTime, performanceTime } = context.getOutputTimestamp();
        if (atTime - lastLoud > 0.5) note("sounds", performanceTime! + (atTime - contextTime!) * 1000);
        lastLoud = atTime;
      });
    }, 20);
    connect.call(this, ear);
    return connect.call(this, to);
  } as typeof AudioNode.prototype.connect;
  const eye = new OffscreenCanvas(1, 1).getContext("2d", { willReadFrequently: true })!;
  let wasWhite = false;
  const look = () => {
    const canvas = document.querySelector<HTMLCanvasElement>(".large canvas");
    if (canvas) eye.drawImage(canvas, 5, 5, 1, 1, 0, 0, 1, 1);
    const isWhite = eye.getImageData(0, 0, 1, 1).data[0]! > 128;
    if (isWhite && !wasWhite) note("pictures", performance.now());
    wasWhite = isWhite;
    requestAnimationFrame(look);
  };
  look();
}
