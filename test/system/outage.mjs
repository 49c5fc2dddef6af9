// SPDX-License-Identifier: Apache-2.0
//
// One visit to all screens at once, in a tab each, while the server goes away and comes back: what is shown says so, and
// goes on by itself. Then a link to what was played, from one tab to another. PLAYING is the address of a recording.
import { address, folder, logIn, report, visit } from "./visit.mjs";

const playing = process.env.PLAYING;

await visit(async (first) => {
  const tabs = {};
  const open = async (name, hash, content) => {
    const page = name === "wall" ? first : await first.context().newPage();
    await page.goto(address + hash);
    if (name === "wall") await logIn(page);
    await page.locator(content).first().waitFor({ timeout: 20_000 });
    tabs[name] = page;
  };
  const told = (page) => page.locator(".transport-frame").textContent();
  const numberIn = (text) => Number(/^frame (\d+)/.exec(text)?.[1]);

  await open("wall", "", '.tile[data-camera="1"][data-state="live"]');
  await open("large", "#camera=1", '.large[data-state="live"]');
  // Where they go while the server is away, and what they show once it is back.
  const goes = {
    events: ["#events", ".row"],
    map: ["#map=1", ".map-item"],
    cameras: ["#settings=cameras", ".camera-row"],
    accounts: ["#settings=accounts", ".record-row"],
    storage: ["#settings=storage", ".record-card"],
    maps: ["#settings=maps", ".emap-row"],
    devices: ["#settings=devices", ".device-row"],
    hosts: ["#settings=hosts", ".record-card, .settings-state:not(:has(.spinner))"],
    system: ["#settings=system", ".health-summary"],
    audit: ["#settings=audit", ".audit-entry, .settings-state:not(:has(.spinner))"],
  };
  for (const name of Object.keys(goes)) await open(name, "#settings=groups", ".record-row");
  tabs.login = await (await first.context().browser().newContext({ ignoreHTTPSErrors: true })).newPage();
  await tabs.login.goto(address);
  await tabs.login.locator(".login-form").waitFor();
  goes.login = [null, ".tile"];
  await open("playing", playing, '.stage-picture[data-state="playing"]');
  await report("all shown");

  await tabs.playing.getByText("The connection was lost. Playback continues").first().waitFor({ timeout: 20_000 });
  const lost = numberIn(await told(tabs.playing));
  for (const [name, shown] of [["wall", '.tile[data-camera="1"]'], ["large", ".large"]]) {
    await tabs[name].bringToFront();
    await tabs[name].locator(`${shown}:not([data-state="live"])`).first().waitFor({ timeout: 20_000 });
  }
  for (const [name, [hash]] of Object.entries(goes)) {
    await tabs[name].bringToFront();
    if (hash) await tabs[name].evaluate((to) => void (location.hash = to), hash);
    else await logIn(tabs[name]);
    await tabs[name].getByText("does not answer").first().waitFor({ timeout: 20_000 });
  }
  await tabs.playing.bringToFront();
  // The first frame that is told from here on, however long it takes to pause.
  await tabs.playing.evaluate(() => {
    const shown = document.querySelector(".transport-frame");
    new MutationObserver(() => (window.resumed ??= shown.textContent)).observe(shown, { childList: true, subtree: true });
  });
  await report("all told");

  await tabs.playing.locator('.stage-picture[data-state="playing"]').first().waitFor({ timeout: 30_000 });
  await tabs.playing.keyboard.press(" ");
  await tabs.playing.locator('.stage-picture[data-state="paused"]').first().waitFor({ timeout: 20_000 });
  const resumed = numberIn(await tabs.playing.evaluate(() => window.resumed));
  await tabs.wall.bringToFront();
  await tabs.wall.locator('.tile[data-camera="1"][data-state="live"]').waitFor({ timeout: 30_000 });
  await tabs.large.bringToFront();
  await tabs.large.locator('.large[data-state="live"]').waitFor({ timeout: 30_000 });
  for (const [name, [, content]] of Object.entries(goes)) {
    await tabs[name].bringToFront();
    await tabs[name].locator(content).first().waitFor({ timeout: 30_000 });
    await tabs[name].getByText("does not answer").first().waitFor({ state: "hidden" });
    await tabs[name].screenshot({ path: `${folder}/back-${name}.png` });
  }
  await report("all back", { lost, resumed });

  const shown = (page) =>
    page.evaluate(() => ({
      picture: document.querySelector(".stage-picture canvas").toDataURL("image/jpeg", 0.95).split(",")[1],
      caption: document.querySelector(".stage-time").textContent,
      hash: location.hash,
      cells: document.querySelectorAll(".stage > *").length,
      kinds: [...document.querySelectorAll(".chips input")].map(({ checked }) => checked),
    }));
  const paused = (page) => page.locator('.stage-picture.has-picture[data-state="paused"]').first().waitFor({ timeout: 20_000 });
  const same = async (page, step) => {
    await page.bringToFront();
    await paused(page);
    await page.waitForFunction((caption) => document.querySelector(".stage-time").textContent === caption, link.caption);
    await report(step, await shown(page));
  };
  await tabs.playing.bringToFront();
  const link = await shown(tabs.playing);
  await report("linked", { ...link, frame: numberIn(await told(tabs.playing)) });
  await tabs.events.goto("about:blank");
  await tabs.events.goto(address + link.hash);
  await same(tabs.events, "opened");
  await tabs.events.reload();
  await same(tabs.events, "reloaded");
  await tabs.events.evaluate(() => void (location.hash = "#maps"));
  await tabs.events.locator(".map-item").first().waitFor({ timeout: 20_000 });
  await tabs.events.goBack();
  await same(tabs.events, "back");
  await tabs.events.goForward();
  await tabs.events.locator(".map-item").first().waitFor({ timeout: 20_000 });
  await report("forward");
});
