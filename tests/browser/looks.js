import assert from "node:assert/strict";
import { readFile } from "node:fs/promises";

import { fillWithSamples } from "./sample.js";
import { run } from "./service.js";
import { choose, command, row, test } from "./suite.js";

const axe = await readFile(new URL("./node_modules/axe-core/axe.min.js", import.meta.url), "utf8");

// Everything that the checks of accessibility have to say about what is shown.
async function findings(page) {
  return page.evaluate(async () => {
    const { violations } = await globalThis.axe.run(document, { resultTypes: ["violations"] });
    return violations.flatMap(({ id, nodes }) => nodes.map((node) =>
      `${id}: ${node.target.join(" ")}: ${node.failureSummary}`));
  });
}

const VIEWS = {
  list: async () => {},
  grid: (page) => page.getByRole("button", { name: "Show as grid" }).click(),
  details: async (page) => {
    await page.getByRole("button", { name: "Details" }).click();
    await choose(page, "Lease.pdf");
  },
  menu: (page) => row(page, "Lease.pdf").click({ button: "right" }),
  chooser: (page) => command(page, "Lease.pdf", "Move to…"),
  tags: (page) => command(page, "Lease.pdf", "Tags…"),
  rename: (page) => command(page, "Lease.pdf", "Rename"),
  preview: async (page) => {
    await choose(page, "Shopping list.txt");
    await page.keyboard.press(" ");
    await page.locator(".preview-text").waitFor();
  },
  refusal: (page) => page.getByRole("button", { name: "Upload" }).click({ force: true }),
  trash: async (page) => {
    await page.getByRole("link", { name: "Trash" }).click();
    await row(page, "2024.zip").waitFor();
  },
  empty: async (page) => {
    await page.getByRole("link", { name: "Recents" }).click();
    await page.waitForSelector("text=Nothing opened yet");
  },
  gone: async (page) => {
    await page.goto(new URL(page.url()).origin + "/#/item/did%3D999999999");
    await page.waitForSelector("text=This is not here any more");
  },
};

const COLOURS = { light: { colorScheme: "light" }, dark: { colorScheme: "dark" },
                  forced: { forcedColors: "active" } };

for (const [colours, options] of Object.entries(COLOURS)) {
  test(`Looks.nothingIsFoundWantingIn_${colours}`, async (stage) => {
    await fillWithSamples(stage.home);
    await stage.serve();
    await run(stage.home, "tag", stage.home.document("Lease.pdf"), "home", "important");
    await run(stage.home, "favorite", stage.home.document("Garden"), "3");
    await run(stage.home, "trash", stage.home.document("Garden/Archive/2024.zip"));
    // What checks is a script of its own, which the page's policy would not let in.
    const page = await stage.person({ ...options, bypassCSP: true });
    for (const [view, show] of Object.entries(VIEWS)) {
      await page.goto(stage.service.origin + "/");
      await page.evaluate(() => localStorage.setItem("view", "list"));
      await page.goto(stage.service.origin + "/#/");
      await page.reload();
      await row(page, "Lease.pdf").waitFor();
      await show(page);
      await page.addScriptTag({ content: axe });
      const found = await findings(page);
      assert.deepEqual(found, [], view);
    }
  });
}
