import assert from "node:assert/strict";
import { rename, rm, writeFile } from "node:fs/promises";

import { run, Service } from "./service.js";
import { choose, names, row, test, until, untilNames } from "./suite.js";

test("Live.whatHappensOutsideIsSeen", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["a.txt"]);
  await stage.home.write("In/b.txt", "b");
  await untilNames(page, ["a.txt", "b.txt"]);
  await rename(stage.home.document("In/a.txt"), stage.home.document("In/z.txt"));
  await untilNames(page, ["b.txt", "z.txt"]);
  await writeFile(stage.home.document("In/b.txt"), "x".repeat(2000));
  await row(page, "b.txt").getByText("2 kB").waitFor();
  await rm(stage.home.document("In/b.txt"));
  await untilNames(page, ["z.txt"]);
  await rename(stage.home.document("In"), stage.home.document("Out"));
  await page.locator(".crumbs [aria-current]", { hasText: "Out" }).waitFor();
  await stage.home.write("Out/c.txt", "c");
  await untilNames(page, ["c.txt", "z.txt"]);
  await rm(stage.home.document("Out"), { recursive: true });
  await page.waitForSelector("text=This is not here any more");
});

test("Live.focusSelectionAndScrollPositionStay", async (stage) => {
  for (let i = 100; i < 400; ++i) {
    await stage.home.write(`In/item ${i}`, "");
  }
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await until(async () => await page.locator(".status").textContent() === "300 items");
  await page.locator(".items").focus();
  await page.keyboard.press("End");
  for (let i = 0; i < 100; ++i) {
    await page.keyboard.press("ArrowUp");
  }
  const item = page.locator('.row[aria-selected="true"]');
  assert.equal(await item.locator(".item-name").textContent(), "item 299");
  const before = (await item.boundingBox()).y;
  for (let i = 0; i < 20; ++i) {
    await stage.home.write(`In/before ${i}`, "");
  }
  await rm(stage.home.document("In/item 150"));
  await until(async () => (await page.locator(".status").textContent()).endsWith("of 319 selected"));
  assert.equal(await item.locator(".item-name").textContent(), "item 299");
  assert.ok(Math.abs((await item.boundingBox()).y - before) <= 1);
  assert.ok(await page.locator(".items").evaluate((grid) => document.activeElement === grid));
  await page.keyboard.press("ArrowDown");
  assert.equal(await item.locator(".item-name").textContent(), "item 300");
});

test("Live.aNameThatIsBeingTypedStays", async (stage) => {
  await stage.home.write("In/b.txt", "b");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await choose(page, "b.txt");
  await page.keyboard.press("F2");
  await page.keyboard.type("half typ");
  await stage.home.write("In/a.txt", "");
  await stage.home.write("In/b.txt", "changed");
  await until(async () => (await names(page)).includes("a.txt"));
  await page.keyboard.type("ed");
  await page.keyboard.press("Enter");
  await untilNames(page, ["a.txt", "half typed.txt"]);
});

test("Live.twoBrowsersSeeTheSame", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.serve();
  const one = await stage.person();
  await one.getByRole("button", { name: "More" }).click();
  await one.getByRole("menuitem", { name: "Open in another web browser…" }).click();
  const address = await one.locator("input.address").inputValue();
  await one.keyboard.press("Escape");
  const other = await stage.open({}, address);
  await row(one, "In").dblclick();
  await row(other, "In").dblclick();
  await choose(one, "a.txt");
  await one.keyboard.press("F2");
  await one.keyboard.type("b");
  await one.keyboard.press("Enter");
  await untilNames(other, ["b.txt"]);
  await choose(other, "b.txt");
  await other.keyboard.press("Delete");
  await untilNames(one, []);
});

test("Live.severalWindowsShareOneStream", async (stage) => {
  await stage.home.write("a.txt", "a");
  await stage.serve();
  const page = await stage.person();
  const windows = [page];
  for (let i = 0; i < 7; ++i) {
    const another = await page.context().newPage();
    await another.goto(stage.service.origin + "/");
    windows.push(another);
  }
  await stage.home.write("b.txt", "b");
  for (const window of windows) {
    await untilNames(window, ["a.txt", "b.txt"]);
  }
});

test("Live.aLostConnectionIsToldAndTheWindowGoesOnWithTheNextSession", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.home.write("In/b.txt", "b");
  const first = await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["a.txt", "b.txt"]);
  await choose(page, "b.txt");
  await page.evaluate(() => { window.isTheSame = true; });
  assert.equal(await first.stop("SIGKILL"), null);
  await page.waitForSelector("text=Connection lost, trying again…");
  await untilNames(page, ["a.txt", "b.txt"]);
  await stage.home.write("In/c.txt", "c");
  await rm(stage.home.document("In/a.txt"));
  // Another process may listen there by now: it is told nothing that is good for more than itself.
  stage.service = await Service.start(stage.home, ["--port", new URL(first.origin).port]);
  await page.waitForSelector("text=Open a new address");
  const [{ browser }] = await run(stage.home, "browse");
  const other = await page.context().newPage();
  await other.goto(browser);
  await untilNames(other, ["In"]);
  await untilNames(page, ["b.txt", "c.txt"]);
  assert.ok(await page.evaluate(() => window.isTheSame));
  assert.equal(await row(page, "b.txt").getAttribute("aria-selected"), "true");
  assert.ok(await page.locator(".banner").isHidden());
  await stage.home.write("In/d.txt", "d");
  await untilNames(page, ["b.txt", "c.txt", "d.txt"]);
});

test("Live.aServiceThatDoesNotAnswerIsWaitedFor", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.serve();
  const page = await stage.person();
  await untilNames(page, ["In"]);
  stage.service.pause();
  await row(page, "In").dblclick();
  await page.waitForSelector("text=Waiting for the service…");
  stage.service.goOn();
  await untilNames(page, ["a.txt"]);
});

test("Live.thatTheHistoryIsBeingCheckedIsToldWhileTheDocumentsTakeLong", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.serve();
  const page = await stage.person();
  await untilNames(page, ["In"]);
  // The documents wait; the service itself answers.
  let goOn;
  const isOver = new Promise((resolve) => { goOn = resolve; });
  await page.route("**/v1/items/**", async (route) => {
    await isOver;
    await route.continue();
  });
  await row(page, "In").dblclick();
  await page.waitForSelector("text=The history is being checked…");
  goOn();
  await untilNames(page, ["a.txt"]);
  await page.unroute("**/v1/items/**");
  // While something is shown, it stays, and the line below tells.
  let goOnAgain;
  const isOverAgain = new Promise((resolve) => { goOnAgain = resolve; });
  await page.route("**/v1/items/**", async (route) => {
    await isOverAgain;
    await route.continue();
  });
  await stage.home.write("In/b.txt", "b");
  await page.locator(".status", { hasText: "The history is being checked…" }).waitFor();
  await untilNames(page, ["a.txt"]);
  goOnAgain();
  await untilNames(page, ["a.txt", "b.txt"]);
  await page.locator(".status", { hasText: "2 items" }).waitFor();
});

test("Live.anEndedSessionEndsAtOnce", async (stage) => {
  await stage.home.write("a.txt", "a");
  await stage.serve();
  const page = await stage.person();
  await page.getByRole("button", { name: "More" }).click();
  await page.getByRole("menuitem", { name: "Sessions…" }).click();
  const sessions = page.getByRole("dialog", { name: "Sessions" });
  await sessions.getByText(/^Chrome \d+, Linux$/).waitFor();
  await sessions.getByRole("button", { name: "End" }).click();
  await page.waitForSelector("text=Open a new address");
});

test("Live.ofManyRowsOnlyThoseInSightAreThere", async (stage) => {
  for (let i = 0; i < 3000; ++i) {
    await stage.home.write(`In/${i}`, "");
  }
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await until(async () => await page.locator(".items").getAttribute("aria-rowcount") === "3001");
  assert.ok(await page.locator(".sizer > .row").count() < 60);
  await page.locator(".items").focus();
  await page.keyboard.press("End");
  await row(page, "2999").waitFor();
  assert.equal(await row(page, "2999").getAttribute("aria-rowindex"), "3001");
  await page.keyboard.press("1");
  await page.keyboard.press("5");
  await page.keyboard.press("0");
  await page.keyboard.press("0");
  await until(async () => await row(page, "1500").getAttribute("aria-selected") === "true");
});
