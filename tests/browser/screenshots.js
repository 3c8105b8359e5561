// node screenshots.js FOLDER: a picture of each view, in light and dark.

import { spawnSync } from "node:child_process";
import { join } from "node:path";

import { fillWithSamples } from "./sample.js";
import { Home, run, Service } from "./service.js";
import { choose, command, row } from "./suite.js";
import { launch } from "./web-browser.js";

const SIZE = { width: 1120, height: 660 };

const VIEWS = {
  list: async () => {},
  grid: async (page, origin) => {
    await page.getByRole("button", { name: "Show as grid" }).click();
    await page.goto(origin + "/#/");
    await row(page, "Garden").dblclick();
    await row(page, "Evening light.png").click();
    await page.getByRole("button", { name: "Details" }).click();
  },
  preview: async (page) => {
    await row(page, "Garden").dblclick();
    await choose(page, "Evening light.png");
    await page.keyboard.press(" ");
    await page.locator(".preview-image").waitFor();
  },
  print: async (page) => {
    await row(page, "Garden").dblclick();
    await choose(page, "Planting.pdf");
    await page.keyboard.press(" ");
    await page.locator(".preview-frame").waitFor();
    await page.waitForTimeout(1500);  // the viewer of PDF tells nobody when it is done
  },
  filter: async (page) => {
    await row(page, "Garden").dblclick();
    await row(page, "Hills.png").waitFor();
    await page.keyboard.press("Control+i");
    await page.keyboard.type("see");
    await row(page, "Hills.png").waitFor({ state: "detached" });
  },
  library: async (page) => {
    await page.getByRole("link", { name: "Notes" }).click();
    await row(page, "Ideas").waitFor();
  },
  search: async (page) => {
    await page.getByRole("searchbox", { name: "Search" }).fill("e");
    await row(page, "Seeds 2.csv").waitFor();
  },
  menu: async (page) => {
    await row(page, "Garden").dblclick();
    await row(page, "Plan for spring.md").click({ button: "right" });
  },
  move: (page) => command(page, "Lease.pdf", "Move to…"),
  conflict: async (page) => {
    await row(page, "Recipes").dblclick();
    await row(page, "Plum cake.txt").waitFor();
    await page.setInputFiles("input[type=file]:not([webkitdirectory])",
      [{ name: "Plum cake.txt", mimeType: "text/plain", buffer: Buffer.from("x") }]);
    await page.getByRole("dialog").waitFor();
  },
  trash: async (page) => {
    await page.getByRole("link", { name: "Trash" }).click();
    await row(page, "Slides.odp").click();
    await page.getByRole("button", { name: "Details" }).click();
    await page.locator(".details dt", { hasText: "Was in" }).waitFor();
  },
  empty: async (page) => {
    await page.getByRole("link", { name: "Recents" }).click();
    await page.waitForSelector("text=Nothing opened yet");
  },
  lost: async (page, origin, service) => {
    service.pause();
    await page.getByRole("link", { name: "Recents" }).click();
    await page.waitForSelector("text=Waiting for the service");
  },
  ended: async (page) => {
    await page.evaluate(() => localStorage.clear());
    await page.reload();
    await page.waitForSelector("text=Open a new address");
  },
};

async function take(browser, folder, view, show, colorScheme) {
  const home = await Home.make();
  await fillWithSamples(home);
  const service = await Service.start(home);
  await run(home, "tag", home.document("Lease.pdf"), "home", "important");
  await run(home, "tag", home.document("Work/Budget.xlsx"), "important");
  await run(home, "favorite", home.document("Garden"), "3");
  await run(home, "trash", home.document("Work/Talk/Slides.odp"));
  const context = await browser.newContext({ viewport: SIZE, colorScheme });
  const page = await context.newPage();
  await page.goto(service.address);
  await row(page, "Lease.pdf").waitFor();
  await page.locator(".place", { hasText: "important" }).waitFor();
  await show(page, service.origin, service);
  await page.mouse.move(0, 0);
  await page.evaluate(() => document.fonts.ready);
  await page.locator(".space").evaluateAll(([line]) => { if (line) { line.textContent = "73 GB free"; } });
  const path = join(folder, `browser-${view}-${colorScheme}.png`);
  await page.screenshot({ path, animations: "disabled", caret: "hide" });
  await context.close();
  service.goOn();
  await service.stop();
  await home.remove();
  return path;
}

const [folder, only = ""] = process.argv.slice(2);
const browser = await launch();
const paths = [];
for (const [view, show] of Object.entries(VIEWS).filter(([name]) => name.includes(only))) {
  for (const colorScheme of ["light", "dark"]) {
    paths.push(await take(browser, folder, view, show, colorScheme));
  }
}
await browser.close();
// Fewer colours make small files; without the program they are only larger.
spawnSync("pngquant", ["--force", "--ext", ".png", "--skip-if-larger", "64", ...paths]);
console.log(paths.join("\n"));
