// The distribution's Chromium, driven by Playwright.

import { existsSync } from "node:fs";

import { chromium } from "playwright-core";

const places = ["/usr/bin/chromium", "/usr/bin/chromium-browser"];
export const executable = process.env.MARROWDALE_CHROMIUM ?? places.find((place) => existsSync(place));

export function launch() {
  return chromium.launch({ executablePath: executable,
                           args: ["--no-sandbox", "--disable-dev-shm-usage"] });
}
