import assert from "node:assert/strict";
import { rename } from "node:fs/promises";

import { installApplication } from "./sample.js";
import { run } from "./service.js";
import { choose, names, row, test, until, untilNames } from "./suite.js";

test("Places.thePrintedAddressBeginsOneSessionThatAReloadKeeps", async (stage) => {
  await stage.home.write("a.txt", "a");
  await stage.serve();
  const page = await stage.person();
  await untilNames(page, ["a.txt"]);
  assert.equal(new URL(page.url()).hash, "#/");
  await page.reload();
  await untilNames(page, ["a.txt"]);
  const other = await stage.open();
  await other.waitForSelector("text=Open a new address");
  assert.equal(await other.locator(".item-name").count(), 0);
});

test("Places.foldersAndItemsHaveAddresses", async (stage) => {
  await stage.home.write("Folder/Inner/deep.txt", "");
  await stage.home.write("Folder/other.txt", "");
  await stage.serve();
  const page = await stage.person();
  await row(page, "Folder").dblclick();
  await untilNames(page, ["Inner", "other.txt"]);
  await row(page, "Inner").dblclick();
  await untilNames(page, ["deep.txt"]);
  const trail = () => page.locator(".crumbs li").allTextContents();
  await until(async () => (await trail()).join("/") === "Documents/Folder/Inner");
  const address = page.url();
  await page.goBack();
  await untilNames(page, ["Inner", "other.txt"]);
  await page.goto(address);
  await untilNames(page, ["deep.txt"]);
  await page.locator(".crumbs").getByRole("link", { name: "Documents" }).click();
  await untilNames(page, ["Folder"]);

  const [item] = await run(stage.home, "info", stage.home.document("Folder/other.txt"));
  await page.goto(`${stage.service.origin}/#/item/${encodeURIComponent(item.itemIdentifier)}`);
  await untilNames(page, ["Inner", "other.txt"]);
  await until(() => row(page, "other.txt").getAttribute("aria-selected").then((v) => v === "true"));
  // The address is the item's, wherever it goes.
  await page.goto(`${stage.service.origin}/#/`);
  await untilNames(page, ["Folder"]);
  await rename(stage.home.document("Folder/other.txt"), stage.home.document("Folder/Inner/moved.txt"));
  await page.goto(`${stage.service.origin}/#/item/${encodeURIComponent(item.itemIdentifier)}`);
  await untilNames(page, ["deep.txt", "moved.txt"]);
  await page.goto(`${stage.service.origin}/#/item/did%3D999999999`);
  await page.waitForSelector("text=This is not here any more");
});

test("Places.whatIsListedIsSorted", async (stage) => {
  await stage.home.write("file 10.txt", "x", new Date(2020, 1, 3));
  await stage.home.write("file 9.txt", "xxx", new Date(2020, 1, 1));
  await stage.home.write("Ärger.png", "xx", new Date(2020, 1, 2));
  await stage.home.write("b folder/x", "");
  await stage.serve();
  const page = await stage.person();
  await untilNames(page, ["b folder", "Ärger.png", "file 9.txt", "file 10.txt"]);
  const by = (name) => page.getByRole("columnheader", { name }).getByRole("button").click();
  await by("Size");
  await untilNames(page, ["b folder", "file 10.txt", "Ärger.png", "file 9.txt"]);
  assert.equal(await page.getByRole("columnheader", { name: "Size" }).getAttribute("aria-sort"),
               "ascending");
  await by("Size");
  await untilNames(page, ["b folder", "file 9.txt", "Ärger.png", "file 10.txt"]);
  await by("Changed");
  await untilNames(page, ["b folder", "file 10.txt", "Ärger.png", "file 9.txt"]);
  await by("Kind");
  await untilNames(page, ["b folder", "Ärger.png", "file 9.txt", "file 10.txt"]);
});

test("Places.favouritesTagsRecentsAndTrashAreInTheSidebar", async (stage) => {
  for (const name of ["a", "b", "c", "d"]) {
    await stage.home.write(`In/${name}.txt`, name);
  }
  const at = (name) => stage.home.document(`In/${name}.txt`);
  await stage.serve();
  await run(stage.home, "favorite", at("a"), "20");
  await run(stage.home, "favorite", at("b"), "10");
  await run(stage.home, "tag", at("c"), "red & <b>round</b>");
  await run(stage.home, "used", at("b"), "2026-01-01T00:00:00Z");
  await run(stage.home, "used", at("c"), "2026-02-01T00:00:00Z");
  await run(stage.home, "trash", at("d"));
  const page = await stage.person();
  const places = page.getByRole("navigation", { name: "Places" });
  await places.getByRole("link", { name: "Favourites" }).click();
  await untilNames(page, ["b.txt", "a.txt"]);
  await places.getByRole("link", { name: "Recents" }).click();
  await untilNames(page, ["c.txt", "b.txt"]);
  await places.getByRole("link", { name: "red & <b>round</b>" }).click();
  await untilNames(page, ["c.txt"]);
  await places.getByRole("link", { name: "Trash" }).click();
  await untilNames(page, ["d.txt"]);
  // And they stay right.
  await run(stage.home, "trash", at("a"));
  await untilNames(page, ["a.txt", "d.txt"]);
  await places.getByRole("link", { name: "Favourites" }).click();
  await untilNames(page, ["b.txt"]);
  await run(stage.home, "favorite", at("c"), "5");
  await untilNames(page, ["c.txt", "b.txt"]);
});

test("Places.searchFindsPartsOfNamesAndTagsWhileOneTypes", async (stage) => {
  await stage.home.write("Papers/annual report.txt", "");
  await stage.home.write("Papers/letter.txt", "");
  await stage.serve();
  await run(stage.home, "tag", stage.home.document("Papers/letter.txt"), "reporter");
  const page = await stage.person();
  await untilNames(page, ["Papers"]);
  const search = page.getByRole("searchbox");
  await search.pressSequentially("repor", { delay: 10 });
  await untilNames(page, ["annual report.txt", "letter.txt"]);
  await search.pressSequentially("t ann", { delay: 10 });
  await untilNames(page, ["annual report.txt"]);
  await stage.home.write("Papers/anna's report.txt", "");
  await untilNames(page, ["anna's report.txt", "annual report.txt"]);
  await search.fill("nothing like it");
  await page.waitForSelector("text=Nothing found");
  await search.press("Escape");
  await untilNames(page, ["Papers"]);
});

test("Places.emptyPlacesSayWhatBelongsThere", async (stage) => {
  await stage.home.write("Empty/x", "");
  await stage.serve();
  const page = await stage.person();
  await run(stage.home, "delete", stage.home.document("Empty/x"));
  await row(page, "Empty").dblclick();
  await page.waitForSelector("text=Nothing in here");
  for (const [place, text] of [["favorites", "No favourites yet"], ["recents", "Nothing opened yet"],
                               ["trash", "The trash is empty"], ["tags/x", "Nothing has this tag"]]) {
    await page.goto(`${stage.service.origin}/#/${place}`);
    await page.waitForSelector(`text=${text}`);
  }
});

test("Places.listAndGridShowTheSame", async (stage) => {
  for (let i = 1; i <= 20; ++i) {
    await stage.home.write(`item ${i}`, "");
  }
  await stage.serve();
  const page = await stage.person();
  await until(async () => (await names(page)).length === 20);
  await choose(page, "item 3");
  await page.getByRole("button", { name: "Show as grid" }).click();
  await until(async () => (await names(page)).length === 20);
  assert.equal(await row(page, "item 3").getAttribute("aria-selected"), "true");
  await page.reload();
  await page.waitForSelector(".tile");
  await page.getByRole("button", { name: "Show as list" }).click();
  await page.waitForSelector(".sizer > .row");
});

test("Places.aFolderIsFilteredByPartsOfNames", async (stage) => {
  for (const name of ["Öl.txt", "argument.txt", "bread.txt", "Target.txt"]) {
    await stage.home.write(`In/${name}`, "");
  }
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["argument.txt", "bread.txt", "Öl.txt", "Target.txt"]);
  await choose(page, "bread.txt");
  await page.getByRole("button", { name: "Filter" }).click();
  await page.keyboard.type("ARG");
  await untilNames(page, ["argument.txt", "Target.txt"]);
  // What is not shown is not selected either.
  await page.locator(".status", { hasText: "2 of 4 items" }).waitFor();
  // News is filtered, too.
  await stage.home.write("In/bargain.txt", "");
  await stage.home.write("In/milk.txt", "");
  await untilNames(page, ["argument.txt", "bargain.txt", "Target.txt"]);
  await page.keyboard.press("ArrowDown");
  await page.keyboard.press("Control+a");
  await page.locator(".status", { hasText: "3 of 3 selected" }).waitFor();
  await page.getByRole("textbox", { name: "Filter" }).fill("nothing like it");
  await page.waitForSelector("text=Nothing fits the filter");
  await page.getByRole("button", { name: "Show all" }).click();
  await until(async () => (await names(page)).length === 6);
  // Another place begins without one.
  await page.keyboard.press("Control+i");
  await page.keyboard.type("milk");
  await untilNames(page, ["milk.txt"]);
  await page.locator(".crumbs").getByRole("link", { name: "Documents" }).click();
  await untilNames(page, ["In"]);
  assert.ok(await page.getByRole("textbox", { name: "Filter" }).isHidden());
});

test("Places.whatIsFoundSaysWhereItLies", async (stage) => {
  await installApplication(stage.home);
  await stage.home.write("Papers/Old/first letter.txt", "");
  await stage.serve();
  const page = await stage.person();
  await page.getByRole("link", { name: "Notes" }).waitFor();
  await page.getByRole("searchbox").fill("first");
  await untilNames(page, ["first letter.txt", "First.txt"]);
  assert.deepEqual(await page.locator(".item-folder").allTextContents(),
                   ["Documents/Papers/Old", "Notes/Ideas"]);
});

test("Places.theSidebarSaysHowMuchIsFree", async (stage) => {
  await stage.serve();
  const page = await stage.person();
  await page.locator(".space", { hasText: /^[\d.,]+ [kMGTP]B free$/ }).waitFor();
});

test("Places.thePageSpeaksGermanToGermans", async (stage) => {
  await stage.home.write("In/a.txt", "");
  await stage.serve();
  const page = await stage.person({ locale: "de-AT" });
  assert.equal(await page.locator("html").getAttribute("lang"), "de");
  await page.getByRole("button", { name: "Hochladen" }).click({ force: true });
  await page.getByRole("dialog", { name: "Hier nicht möglich" }).waitFor();
  const source = await (await fetch(stage.service.origin + "/assets/text.js")).text();
  const keys = (name) => Object.keys(new Function(
    `return ${new RegExp(`const ${name} = ({[^]*?\n});`).exec(source)[1]}`)()).sort();
  assert.deepEqual(keys("GERMAN"), keys("ENGLISH"));
});
