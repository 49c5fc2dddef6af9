// SPDX-License-Identifier: Apache-2.0
//
// The browsers that tests look through: Chromium, or Firefox where LOOKHAVEN_TEST_BROWSER says so.
//
// Why so        Firefox is the one that its users have, spoken to by WebDriver BiDi. Of a download that a link starts, that
//               tells nothing that playwright understands; so the file itself is waited for.
import { createHash } from "node:crypto";
import { existsSync, readdirSync, statSync } from "node:fs";
import { join } from "node:path";
import { setTimeout as wait } from "node:timers/promises";
import { chromium, firefox } from "playwright-core";
import { startSilentSpeaker } from "./silent_speaker.mjs";

/** A name for this machine that a browser does not trust as it does 127.0.0.1. */
const kUntrustedName = "lan.test";

const kDownloadMs = 30_000;

class Chromium {
  executablePath = "/usr/bin/chromium";
  isOfDriver = () => false;

  launch(_downloads) {
    const args = ["--disable-gpu", "--disable-quic", `--host-resolver-rules=MAP ${kUntrustedName} 127.0.0.1`];
    return chromium.launch({ executablePath: this.executablePath, args });
  }

  async download(page, start, downloads) {
    const [download] = await Promise.all([page.waitForEvent("download", { timeout: kDownloadMs }), start()]);
    const name = download.suggestedFilename();
    await download.saveAs(join(downloads, name));
    return name;
  }
}

class Firefox {
  executablePath = "/usr/bin/firefox-esr";
  /** Before a screenshot playwright adds a style for a moment, which the page's content policy refuses. */
  isOfDriver = (complaint) => complaint.includes(createHash("sha256").update("body {}").digest("base64"));

  async launch(downloads) {
    const firefoxUserPrefs = {
      "network.dns.localDomains": kUntrustedName,
      "browser.download.folderList": 2,
      "browser.download.dir": downloads,
    };
    const speaker = await startSilentSpeaker();
    const env = { ...process.env, ...speaker.variables };
    const started = await firefox.launch({ channel: "moz-firefox", executablePath: this.executablePath, firefoxUserPrefs, env });
    started.on("disconnected", speaker.stop);
    return started;
  }

  async download(_page, start, downloads) {
    const before = new Set(readdirSync(downloads));
    await start();
    // An empty file keeps the name while what has come is in another one beside it.
    const isWhole = (name) => !before.has(name) && !name.endsWith(".part") && statSync(join(downloads, name)).size > 0;
    for (const end = Date.now() + kDownloadMs; Date.now() < end; await wait(50)) {
      const name = readdirSync(downloads).find(isWhole);
      if (name) return name;
    }
    throw new Error(`no download within ${kDownloadMs} ms`);
  }
}

const kBrowsers = { chromium: Chromium, firefox: Firefox };
const chosen = process.env.LOOKHAVEN_TEST_BROWSER ?? "chromium";
if (!Object.hasOwn(kBrowsers, chosen)) {
  throw new Error(`LOOKHAVEN_TEST_BROWSER is one of ${Object.keys(kBrowsers).join(", ")}, not ${chosen}`);
}
const browser = new kBrowsers[chosen]();

export const hasBrowser = existsSync(browser.executablePath);
export const isFirefox = browser instanceof Firefox;

/** `downloads` is a folder for the files that pages save. */
export const launchBrowser = (downloads) => browser.launch(downloads);

/** A list that fills with what scripts and the content policy of the page complain of. */
export function complaintsOf(page) {
  const complaints = [];
  const note = (text) => void (browser.isOfDriver(text) || complaints.push(text));
  page.on("pageerror", (error) => note(String(error)));
  page.on("console", (message) => {
    // Answers of the server are judged by what the page makes of them.
    if (message.type() === "error" && !message.text().startsWith("Failed to load resource")) note(message.text());
  });
  return complaints;
}

/** The name of the file in the folder of downloads that the page saves once `start` has clicked. */
export const download = (page, start, downloads) => browser.download(page, start, downloads);
