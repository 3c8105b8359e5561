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
  grid_of_pictures: async (page) => {
    await page.getByRole("button", { name: "Show as grid" }).click();
    await row(page, "Garden").dblclick();
    await row(page, "Hills.png").locator("canvas").waitFor();
    await choose(page, "Hills.png");
  },
  filter: async (page) => {
    await page.getByRole("button", { name: "Filter" }).click();
    await page.keyboard.type("le");
    await row(page, "Shopping list.txt").waitFor({ state: "detached" });
  },
  filtered_out: async (page) => {
    await page.keyboard.press("Control+i");
    await page.keyboard.type("nothing like it");
    await page.waitForSelector("text=Nothing fits the filter");
  },
  library: async (page) => {
    await page.getByRole("link", { name: "Notes" }).click();
    await row(page, "Ideas").waitFor();
  },
  search: async (page) => {
    await page.getByRole("searchbox").fill("e");
    await row(page, "Seeds 2.csv").waitFor();
  },
  tagged: async (page) => {
    await page.getByRole("link", { name: "important" }).click();
    await page.locator(".crumbs", { hasText: "Tagged" }).waitFor();
  },
  favourites: async (page) => {
    await page.getByRole("link", { name: "Favourites" }).click();
    await row(page, "Shopping list.txt").waitFor({ state: "detached" });
  },
  print: async (page) => {
    await choose(page, "Lease.pdf");
    await page.keyboard.press(" ");
    await page.locator(".preview-frame").waitFor();
  },
  picture: async (page) => {
    await choose(page, "Lake.png");
    await page.keyboard.press(" ");
    await page.locator(".preview-image").waitFor();
  },
  more: (page) => page.getByRole("button", { name: "More" }).click(),
  sessions: async (page) => {
    await page.getByRole("button", { name: "More" }).click();
    await page.getByRole("menuitem", { name: "Sessions…" }).click();
    await page.getByRole("dialog", { name: "Sessions" }).waitFor();
  },
  address: async (page) => {
    await page.getByRole("button", { name: "More" }).click();
    await page.getByRole("menuitem", { name: "Open in another web browser…" }).click();
    await page.locator("input.address").waitFor();
  },
  conflict: async (page) => {
    await row(page, "Recipes").dblclick();
    await row(page, "Plum cake.txt").waitFor();
    await page.setInputFiles("input[type=file]:not([webkitdirectory])",
      [{ name: "Plum cake.txt", mimeType: "text/plain", buffer: Buffer.from("x") }]);
    await page.getByRole("dialog").waitFor();
  },
  undo: async (page) => {
    await row(page, "Recipes").dblclick();
    await command(page, "Plum cake.txt", "Rename");
    await page.keyboard.press("Control+a");
    await page.keyboard.type("Cake.txt");
    await page.keyboard.press("Enter");
    const undo = page.getByRole("button", { name: "Undo" });
    await undo.waitFor();
    return () => undo.click();
  },
  empty_the_trash: async (page) => {
    await page.getByRole("link", { name: "Trash" }).click();
    await command(page, "2024.zip", "Empty the trash…");
    await page.getByRole("dialog").waitFor();
  },
  delete_for_good: async (page) => {
    await page.getByRole("link", { name: "Trash" }).click();
    await command(page, "2024.zip", "Delete for good…");
    await page.getByRole("dialog").waitFor();
  },
  waiting: async (page, stage) => {
    stage.service.pause();
    await page.getByRole("link", { name: "Recents" }).click();
    await page.waitForSelector("text=Waiting for the service");
    return () => stage.service.goOn();
  },
  lost: async (page) => {
    // What is told when the stream of signals breaks off.
    await page.evaluate(() => {
      const banner = document.querySelector(".banner");
      banner.hidden = false;
      banner.replaceChildren("Connection lost, trying again…");
    });
  },
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

// What can be pressed and is smaller than it may be.
function tooSmall(page) {
  return page.evaluate(() => [...document.querySelectorAll(
    "button, a[href], input, [role=menuitem], [role=option]")].flatMap((element) => {
    const { width, height } = element.getBoundingClientRect();
    const isShown = width > 0 && height > 0 && element.checkVisibility({ visibilityProperty: true });
    const target = element.matches("input[type=checkbox]") ? element.closest("label") : element;
    const box = target.getBoundingClientRect();
    return isShown && (box.width < 24 || box.height < 24)
      ? [`${element.outerHTML.slice(0, 80)}: ${box.width} x ${box.height}`] : [];
  }));
}

const COLOURS = { light: { colorScheme: "light" }, dark: { colorScheme: "dark" },
                  forced: { forcedColors: "active" }, contrast: { contrast: "more" } };

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
      const undo = await show(page, stage);
      // While the service stands still, nothing can be loaded.
      await page.evaluate(axe);
      const found = await findings(page);
      assert.deepEqual(found, [], view);
      assert.deepEqual(await tooSmall(page), [], view);
      await undo?.();
    }
  });
}

test("Looks.withoutASessionNothingIsFoundWanting", async (stage) => {
  await stage.serve();
  for (const options of Object.values(COLOURS)) {
    const page = await stage.open({ ...options, bypassCSP: true }, stage.service.origin + "/");
    await page.waitForSelector("text=Open a new address");
    await page.evaluate(axe);
    assert.deepEqual(await findings(page), []);
  }
});
