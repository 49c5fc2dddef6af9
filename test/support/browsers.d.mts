// SPDX-License-Identifier: Apache-2.0
//
// browsers.mjs for the client's tests.
import type { Browser, Page } from "playwright-core";

export declare const hasBrowser: boolean;
export declare const isFirefox: boolean;
export declare function launchBrowser(downloads: string): Promise<Browser>;
export declare function complaintsOf(page: Page): string[];
export declare function download(page: Page, start: () => Promise<void>, downloads: string): Promise<string>;
