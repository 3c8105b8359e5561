import assert from "node:assert/strict";
import { readFile, stat } from "node:fs/promises";

import { run } from "./service.js";
import { names, test, until, untilNames } from "./suite.js";

// Everyday tasks with the keyboard alone: nothing in here points or clicks.

async function exists(path) {
  return stat(path).then(() => true, () => false);
}

async function atTheKeyboard(stage) {
  await stage.home.write("Garden/Letter.txt", "a letter");
  await stage.home.write("Garden/Plan.txt", "a plan");
  await stage.home.write("Garden/Tools/spade", "");
  await stage.home.write("Work/Budget.txt", "");
  await stage.serve();
  const page = await stage.person();
  await untilNames(page, ["Garden", "Work"]);
  // Tab until the list has the focus.
  await until(async () => {
    const isThere = await page.evaluate(() => document.activeElement?.classList.contains("items"));
    if (!isThere) {
      await page.keyboard.press("Tab");
    }
    return isThere;
  });
  return page;
}

async function press(page, ...keys) {
  for (const key of keys) {
    await page.keyboard.press(key);
  }
}

async function intoGarden(page) {
  await press(page, "Home", "Enter");
  await untilNames(page, ["Tools", "Letter.txt", "Plan.txt"]);
}

test("Keyboard.goIntoAFolderAndBack", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "Alt+ArrowUp");
  await untilNames(page, ["Garden", "Work"]);
});

test("Keyboard.lookAtADocument", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "End", " ");
  await page.locator(".preview-text", { hasText: "a plan" }).waitFor();
  await press(page, "ArrowUp");
  await press(page, "Escape");
  assert.ok(await page.evaluate(() => document.activeElement.classList.contains("items")));
});

test("Keyboard.openADocument", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "l", "Enter");
  await page.locator(".preview-text", { hasText: "a letter" }).waitFor();
  await until(async () => (await run(stage.home, "info", stage.home.document("Garden/Letter.txt")))[0]
    .lastUsedDate);
});

test("Keyboard.renameADocument", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "End", "F2");
  await page.keyboard.type("Idea");
  await press(page, "Enter");
  await untilNames(page, ["Tools", "Idea.txt", "Letter.txt"]);
});

test("Keyboard.makeAFolder", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "Alt+n");
  await page.waitForSelector("input.rename");
  await page.keyboard.type("Seeds");
  await press(page, "Enter");
  await untilNames(page, ["Seeds", "Tools", "Letter.txt", "Plan.txt"]);
});

test("Keyboard.moveDocuments", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "End", "Shift+ArrowUp", "Shift+F10");
  await page.getByRole("menu").waitFor();
  await press(page, "m");
  await until(() => page.evaluate(() => document.activeElement.textContent.startsWith("Move to…")));
  await press(page, "Enter");
  await page.getByRole("option", { name: "Work" }).waitFor();
  await until(() => page.evaluate(() => document.activeElement.getAttribute("role") === "listbox"));
  await press(page, "ArrowDown", "Enter");
  await page.locator(".chooser-path", { hasText: "Work" }).waitFor();
  await press(page, "Tab", "Tab", "Enter");
  await untilNames(page, ["Tools"]);
  assert.ok(await exists(stage.home.document("Work/Plan.txt")));
});

test("Keyboard.trashAndUndo", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "End", "Delete");
  await untilNames(page, ["Tools", "Letter.txt"]);
  await press(page, "Control+z");
  await untilNames(page, ["Tools", "Letter.txt", "Plan.txt"]);
});

test("Keyboard.putSomethingBack", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "End", "Delete");
  await untilNames(page, ["Tools", "Letter.txt"]);
  await tabTo(page, "Trash");
  await press(page, "Enter");
  await untilNames(page, ["Plan.txt"]);
  await tabTo(page, null);
  await press(page, "Home", "Shift+F10", "Enter");
  await untilNames(page, []);
  assert.equal(await readFile(stage.home.document("Garden/Plan.txt"), "utf8"), "a plan");
});

// Goes on with Tab until a link of that name, or the list, has the focus.
async function tabTo(page, name) {
  await until(async () => {
    const isThere = await page.evaluate((wanted) => wanted === null
      ? document.activeElement?.classList.contains("items")
      : document.activeElement?.textContent === wanted, name);
    if (!isThere) {
      await page.keyboard.press("Tab");
    }
    return isThere;
  });
}

test("Keyboard.deleteForGood", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "End", "Delete");
  await untilNames(page, ["Tools", "Letter.txt"]);
  await tabTo(page, "Trash");
  await press(page, "Enter");
  await untilNames(page, ["Plan.txt"]);
  await tabTo(page, null);
  await press(page, "Home", "Delete");
  await page.getByRole("dialog").waitFor();
  await press(page, "Tab", "Enter");
  await page.waitForSelector("text=The trash is empty");
});

test("Keyboard.tagADocument", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "End", "Shift+F10");
  await page.getByRole("menu").waitFor();
  await press(page, "t");
  await press(page, "Enter");
  await page.getByRole("dialog", { name: "Tags of “Plan.txt”" }).waitFor();
  await page.keyboard.type("spring");
  await press(page, "Enter", "Enter");
  await page.locator(".row .tag", { hasText: "spring" }).waitFor();
});

test("Keyboard.findADocument", async (stage) => {
  const page = await atTheKeyboard(stage);
  await press(page, "/");
  await page.keyboard.type("letter");
  await untilNames(page, ["Letter.txt"]);
  await press(page, "ArrowDown", " ");
  await page.locator(".preview-text", { hasText: "a letter" }).waitFor();
});

test("Keyboard.sortAndChooseAViewAndSelectAll", async (stage) => {
  const page = await atTheKeyboard(stage);
  await intoGarden(page);
  await press(page, "Control+a");
  assert.equal(await page.locator('.row[aria-selected="true"]').count(), 3);
  await press(page, "Shift+Tab");
  await until(async () => {
    const label = await page.evaluate(() => document.activeElement.getAttribute("aria-label"));
    if (label !== "More") {
      await page.keyboard.press("Shift+Tab");
    }
    return label === "More";
  });
  await press(page, "Enter");
  await page.getByRole("menu").waitFor();
  await press(page, "s");
  await press(page, "Enter");
  await untilNames(page, ["Tools", "Plan.txt", "Letter.txt"]);
  assert.deepEqual((await names(page)).length, 3);
});
