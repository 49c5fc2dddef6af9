// SPDX-License-Identifier: Apache-2.0
//
// One visit to an installation without an account: on a phone by a one-time address to an account, a first camera and
// storage; then at a desk another camera with its plan, an account with few rights, a mount and a map; and what that
// account sees. TOKEN is valid, OLD is not; RTSP and MJPEG are the cameras' addresses, DISK is an empty folder. At each
// step on the phone, what axe-core finds.
import { address, folder, report, violations, visit } from "./visit.mjs";

const kWord = "a long night";

await visit(async (page, complaints) => {
  await page.setViewportSize({ width: 390, height: 844 });
  const look = async (step) => {
    await page.screenshot({ path: `${folder}/${step.replace(" ", "-")}.png` });
    await report(step, { violations: await violations(page), complaints });
  };
  const go = (hash) => page.evaluate((to) => void (location.hash = to), hash);
  const button = (name) => page.getByRole("button", { name }).click();

  await page.goto(address);
  await page.getByText("lookhaven setup-address").waitFor();
  await look("no account");

  await go(`#setup=${process.env.OLD}`);
  await page.getByLabel("Account").fill("ada");
  await page.getByLabel("Password (").fill("correct horse");
  await page.getByLabel("Repeat").fill("correct horse");
  await button("Create the account");
  await page.getByRole("alert").filter({ hasText: "replaced by a newer one" }).waitFor();
  await look("replaced");

  await go(`#setup=${process.env.TOKEN}`);
  await button("Create the account");
  await page.locator(".setup-steps [aria-current=step]", { hasText: "First camera" }).waitFor();
  await page.getByLabel("Address", { exact: true }).fill(process.env.RTSP);
  await look("account");

  await button("Test connection");
  await page.locator(".probe-picture").waitFor({ timeout: 30_000 });
  await page.getByLabel("Name").fill("Gate");
  await button("Add the camera");
  await page.locator(".camera-row", { hasText: "Gate" }).waitFor();
  await look("camera");

  await page.getByRole("link", { name: "Next: storage" }).click();
  await page.locator(".record-card", { hasText: "default" }).waitFor();
  await look("storage");

  await page.getByRole("link", { name: "Finish" }).click();
  await page.locator('.tile[data-state="live"]', { hasText: "Gate" }).waitFor({ timeout: 20_000 });
  await look("wall");

  await page.setViewportSize({ width: 1280, height: 800 });
  await go("#settings=cameras&open=new");
  await page.getByLabel("Address", { exact: true }).fill(process.env.MJPEG);
  await button("Test connection");
  await page.locator(".probe-picture").waitFor({ timeout: 30_000 });
  await page.getByLabel("Name").fill("Yard");
  await page.getByText("On alert only").click();
  await button("Add the camera");
  await page.locator(".camera-row", { hasText: "Yard" }).getByText("recorded on alert only").waitFor();

  /** Whether another picture follows the one that is drawn. */
  const moves = async (name) => {
    const tile = page.locator('.tile[data-state="live"]', { hasText: name });
    await tile.waitFor({ timeout: 20_000 });
    const drawn = () => tile.locator("canvas").evaluate((canvas) => canvas.toDataURL());
    const first = await drawn();
    for (const end = Date.now() + 10_000; Date.now() < end; ) if ((await drawn()) !== first) return true;
    return false;
  };
  await go("#");
  await report("two cameras", { moving: [await moves("Gate"), await moves("Yard")] });

  await go("#settings=accounts&open=new");
  await page.getByLabel("Name").fill("night");
  await page.getByLabel("Password", { exact: true }).fill(kWord);
  await page.getByLabel("Repeat password").fill(kWord);
  for (const right of ["Live", "Sound", "Playback", "Export"]) await page.getByLabel(`All cameras: ${right}`).click();
  for (const right of ["Live", "Playback"]) await page.getByLabel(`Gate: ${right}`).check();
  await button("Add the account");
  await page.getByLabel("Your own password").fill("correct horse");
  await page.getByRole("button", { name: "Add", exact: true }).click();
  const row = page.locator(".record-row", { hasText: "night" });
  await row.waitFor();
  await report("second account", { word: kWord, row: await row.innerText() });

  await go("#settings=storage&open=new");
  await page.getByLabel("Name").fill("Second disk");
  await page.getByLabel("Folder").fill(process.env.DISK);
  await button("Add the mount");
  await page.locator(".record-card", { hasText: "Second disk" }).waitFor();

  const dialog = page.getByRole("dialog", { name: "Add a map" });
  const chosen = (name, mimeType, text) => ({ name, mimeType, buffer: Buffer.from(text) });
  const plan = '<svg xmlns="http://www.w3.org/2000/svg" width="400" height="200"><rect width="400" height="200" fill="red"/></svg>';
  await go("#settings=maps");
  await button("Add the first map…");
  await dialog.getByLabel("Picture").setInputFiles(chosen("Loading dock.png", "image/png", "no picture"));
  await dialog.getByRole("button", { name: "Add", exact: true }).click();
  const refusal = dialog.getByRole("alert").filter({ hasText: "PNG" });
  await refusal.waitFor();
  const refused = await refusal.textContent();
  await dialog.getByLabel("Picture").setInputFiles(chosen("plan.svg", "image/svg+xml", plan));
  await dialog.getByRole("button", { name: "Add", exact: true }).click();
  const picture = page.locator(".emap-row", { hasText: "Loading dock" }).locator("img");
  await picture.waitFor({ timeout: 20_000 });
  await page.waitForFunction(() => [...document.querySelectorAll(".emap-row img")].every((image) => image.naturalWidth > 0));
  const size = await picture.evaluate((image) => [image.naturalWidth, image.naturalHeight]);
  await page.screenshot({ path: `${folder}/maps.png` });
  await page.getByRole("link", { name: "Place cameras on Loading dock" }).click();
  await page.locator(".map-editor").waitFor();
  await report("mount and map", { refused, size, hash: new URL(page.url()).hash });

  await button("Account ada");
  await button("Log out");
  await page.getByLabel("Account", { exact: true }).fill("night");
  await page.getByLabel("Password").fill(kWord);
  await button("Log in");
  await go("#");
  await report("night", {
    moving: await moves("Gate"),
    tiles: await page.locator(".tile").count(),
    links: await page.locator(".nav-link").allInnerTexts(),
    complaints,
  });
});
