import assert from "node:assert/strict";
import { readFile, stat } from "node:fs/promises";

import { installApplication, print, sunset } from "./sample.js";
import { run } from "./service.js";
import { choose, command, names, row, test, until, untilNames } from "./suite.js";

async function exists(path) {
  return stat(path).then(() => true, () => false);
}

test("Actions.aNameIsChangedInPlaceAndBack", async (stage) => {
  await stage.home.write("In/old.txt", "content");
  await stage.home.write("In/taken.txt", "");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await choose(page, "old.txt");
  await page.keyboard.press("F2");
  await page.keyboard.type("new");
  await page.keyboard.press("Enter");
  await untilNames(page, ["new.txt", "taken.txt"]);
  assert.equal(await readFile(stage.home.document("In/new.txt"), "utf8"), "content");
  await page.getByRole("button", { name: "Undo" }).click();
  await untilNames(page, ["old.txt", "taken.txt"]);
  await command(page, "old.txt", "Rename");
  await page.keyboard.press("Control+a");
  await page.keyboard.type("taken.txt");
  await page.keyboard.press("Enter");
  await page.waitForSelector("text=There is a “taken.txt” already");
  await untilNames(page, ["old.txt", "taken.txt"]);
  await command(page, "old.txt", "Rename");
  await page.keyboard.type("never");
  await page.keyboard.press("Escape");
  await untilNames(page, ["old.txt", "taken.txt"]);
});

test("Actions.aNewFolderIsMadeAndNamed", async (stage) => {
  await stage.home.write("In/New folder/x", "");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["New folder"]);
  await page.getByRole("button", { name: "New folder" }).click();
  await page.waitForSelector("input.rename");
  await page.keyboard.type("Mine");
  await page.keyboard.press("Enter");
  await untilNames(page, ["Mine", "New folder"]);
  assert.ok(await exists(stage.home.document("In/Mine")));
});

test("Actions.theTopLevelSaysThatItTakesNothingAndWhatToDo", async (stage) => {
  await stage.home.write("In/x", "");
  await stage.home.write("top.txt", "");
  await stage.serve();
  const page = await stage.person();
  await page.waitForSelector("text=takes no new items");
  for (const name of ["New folder", "Upload"]) {
    const button = page.getByRole("button", { name });
    assert.equal(await button.getAttribute("aria-disabled"), "true");
    await button.click({ force: true });
    const told = page.getByRole("dialog", { name: "Not available here" });
    await told.waitFor();
    await page.keyboard.press("Escape");
    await told.waitFor({ state: "detached" });
  }
  await page.getByRole("button", { name: "Upload" }).click({ force: true });
  await page.getByRole("button", { name: "Choose a folder…" }).click();
  await page.getByRole("option", { name: "In" }).click();
  await page.getByRole("button", { name: "Choose this folder" }).click();
  await untilNames(page, ["x"]);
  assert.notEqual(await page.getByRole("button", { name: "Upload" }).getAttribute("aria-disabled"),
                  "true");
  // A move into it is refused with the reason, too.
  await row(page, "x").dragTo(page.getByRole("navigation", { name: "Places" })
    .getByRole("link", { name: "Documents" }));
  await page.getByRole("dialog", { name: "Not available here" }).waitFor();
  assert.ok(await exists(stage.home.document("In/x")));
});

test("Actions.itemsAreMovedByMenuAndByDrag", async (stage) => {
  await stage.home.write("In/a", "");
  await stage.home.write("In/b", "");
  await stage.home.write("In/Deep/x", "");
  await stage.home.write("Other/y", "");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["Deep", "a", "b"]);
  await row(page, "a").dragTo(row(page, "Deep"));
  await untilNames(page, ["Deep", "b"]);
  assert.ok(await exists(stage.home.document("In/Deep/a")));
  await page.getByRole("button", { name: "Undo" }).click();
  await untilNames(page, ["Deep", "a", "b"]);
  await command(page, "b", "Move to…");
  await page.getByRole("option", { name: "Other" }).click();
  await page.locator(".chooser-path", { hasText: "Other" }).waitFor();
  await page.getByRole("button", { name: "Move here" }).click();
  await untilNames(page, ["Deep", "a"]);
  assert.ok(await exists(stage.home.document("Other/b")));
});

test("Actions.trashIsUndonePutBackAndEmptied", async (stage) => {
  for (const name of ["a", "b", "c"]) {
    await stage.home.write(`In/${name}.txt`, name);
  }
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["a.txt", "b.txt", "c.txt"]);
  await choose(page, "a.txt");
  await page.keyboard.press("Delete");
  await untilNames(page, ["b.txt", "c.txt"]);
  await page.getByRole("button", { name: "Undo" }).click();
  await untilNames(page, ["a.txt", "b.txt", "c.txt"]);
  await choose(page, "a.txt");
  await page.keyboard.press("Shift+End");
  await page.keyboard.press("Delete");
  await untilNames(page, []);
  await page.getByRole("link", { name: "Trash" }).click();
  await untilNames(page, ["a.txt", "b.txt", "c.txt"]);
  await page.getByRole("button", { name: "Details" }).click();
  await choose(page, "a.txt");
  await page.locator(".details dd", { hasText: /^Documents\/In$/ }).first().waitFor();
  await command(page, "a.txt", "Put back");
  await untilNames(page, ["b.txt", "c.txt"]);
  assert.equal(await readFile(stage.home.document("In/a.txt"), "utf8"), "a");
  await choose(page, "b.txt");
  await page.keyboard.press("Delete");
  await page.getByRole("dialog", { name: "Delete “b.txt” for good?" }).waitFor();
  await page.getByRole("button", { name: "Cancel" }).click();
  await untilNames(page, ["b.txt", "c.txt"]);
  await choose(page, "b.txt");
  await page.keyboard.press("Delete");
  await page.getByRole("dialog").getByRole("button", { name: "Delete" }).click();
  await untilNames(page, ["c.txt"]);
  await command(page, "c.txt", "Empty the trash…");
  await page.getByRole("dialog").getByRole("button", { name: "Delete" }).click();
  await page.waitForSelector("text=The trash is empty");
});

test("Actions.whatAnApplicationKeptGoesBackToIt", async (stage) => {
  const library = await installApplication(stage.home);
  await stage.serve();
  const page = await stage.person();
  await page.getByRole("link", { name: "Notes" }).click();
  await row(page, "Ideas").dblclick();
  await untilNames(page, ["First.txt"]);
  await page.getByRole("button", { name: "Details" }).click();
  await choose(page, "First.txt");
  await page.locator(".details dd", { hasText: /^Notes\/Ideas\/First.txt$/ }).waitFor();
  await page.keyboard.press("Delete");
  await untilNames(page, []);
  await page.getByRole("link", { name: "Trash" }).click();
  await choose(page, "First.txt");
  await page.locator(".details dt", { hasText: "Was in" }).waitFor();
  await page.locator(".details dd", { hasText: /^Notes\/Ideas$/ }).waitFor();
  await command(page, "First.txt", "Put back");
  await untilNames(page, []);
  assert.equal(await readFile(library + "/Ideas/First.txt", "utf8"), "An idea.\n");
});

test("Actions.onlyWhatIsOlderThanTheDateIsEmptied", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.serve();
  await run(stage.home, "trash", stage.home.document("In/a.txt"));
  const page = await stage.person({}, "#/trash");
  await command(page, "a.txt", "Empty the trash…");
  await page.getByLabel("What was trashed before").fill("2020-01-01");
  await page.getByRole("dialog").getByRole("button", { name: "Delete" }).click();
  await page.waitForSelector("text=The trash was emptied");
  await untilNames(page, ["a.txt"]);
});

test("Actions.tagsAndFavouritesAreSet", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await command(page, "a.txt", "Tags…");
  await page.keyboard.type("green");
  await page.keyboard.press("Enter");
  await page.keyboard.type("<i>odd</i>");
  await page.getByRole("button", { name: "Save" }).click();
  await row(page, "a.txt").locator(".tag", { hasText: "green" }).waitFor();
  await page.getByRole("link", { name: "<i>odd</i>" }).waitFor();
  await command(page, "a.txt", "Add to favourites");
  await row(page, "a.txt").getByRole("img", { name: "favourite" }).waitFor();
  const [item] = await run(stage.home, "info", stage.home.document("In/a.txt"));
  assert.deepEqual(item.tags, ["green", "<i>odd</i>"]);
  assert.ok(item.favoriteRank > 0);
  await command(page, "a.txt", "Remove from favourites");
  await command(page, "a.txt", "Tags…");
  await page.getByRole("button", { name: "Remove the tag “green”" }).click();
  await page.getByRole("button", { name: "Save" }).click();
  await until(async () => (await run(stage.home, "info", stage.home.document("In/a.txt")))[0].tags
    ?.join() === "<i>odd</i>");
});

test("Actions.documentsAreDownloadedUnderTheirNames", async (stage) => {
  await stage.home.write("sub/naïve \"name\".bin", Buffer.from([0, 1, 2, 255]));
  await stage.serve();
  const page = await stage.person();
  await row(page, "sub").dblclick();
  const arrives = page.waitForEvent("download");
  await row(page, "naïve \"name\".bin").dblclick();
  const download = await arrives;
  assert.equal(download.suggestedFilename().replaceAll("_", "\""), "naïve \"name\".bin");
  assert.deepEqual(await readFile(await download.path()), Buffer.from([0, 1, 2, 255]));
  await until(async () => (await run(stage.home, "info",
    stage.home.document("sub/naïve \"name\".bin")))[0].lastUsedDate);
});

test("Actions.picturesTextSoundAndFilmAreShownActiveContentIsNot", async (stage) => {
  await stage.home.write("1 picture.png", sunset());
  await stage.home.write("2 text.txt", "first line\nsecond <b>line</b>");
  await stage.home.write("3 page.html", "<script>document.title = 'ran'</script>shown as text");
  await stage.home.write("4 drawing.svg",
    "<svg xmlns='http://www.w3.org/2000/svg'><script>document.title = 'ran'</script></svg>");
  await stage.home.write("5 sound.wav", Buffer.concat([Buffer.from("RIFF"), Buffer.alloc(100)]));
  await stage.home.write("6 print.pdf", print("What is printed"));
  await stage.home.write("7 film.webm", Buffer.alloc(100));
  await stage.serve();
  const page = await stage.person();
  await until(async () => (await names(page)).length === 7);
  await choose(page, "1 picture.png");
  await page.keyboard.press(" ");
  await until(() => page.locator(".preview-image").evaluate((image) => image.naturalWidth === 480));
  await page.keyboard.press("ArrowDown");
  await page.locator(".preview-text", { hasText: "second <b>line</b>" }).waitFor();
  await page.keyboard.press("Escape");
  for (const [name, text] of [["3 page.html", "<script>document.title"],
                              ["4 drawing.svg", "<script>document.title"]]) {
    await choose(page, name);
    await page.keyboard.press(" ");
    await page.locator(".preview-text", { hasText: text }).waitFor();
    await page.keyboard.press("Escape");
  }
  await choose(page, "5 sound.wav");
  await page.keyboard.press(" ");
  await page.locator("audio").waitFor();
  await page.keyboard.press("Escape");
  await choose(page, "6 print.pdf");
  await page.keyboard.press(" ");
  // The web browser's own viewer has taken it, and shows it by its name.
  await page.locator("iframe.preview-frame").waitFor();
  const frame = await until(() => page.frames().find((each) => each.url().includes("/files/content/")));
  assert.match(frame.url(), /\/6%20print\.pdf\?/);
  await until(() => frame.evaluate(() => document.contentType === "application/pdf"));
  await page.keyboard.press("Escape");
  await choose(page, "7 film.webm");
  await page.keyboard.press(" ");
  await page.locator("video").waitFor();
  await page.keyboard.press("Escape");
  assert.notEqual(await page.title(), "ran");
});

test("Actions.namesShowAsTextWhateverTheyHold", async (stage) => {
  await stage.home.write("<img src=x onerror=alert(1)>.txt", "");
  await stage.home.write("line\nbreak\u0007.txt", "");
  await stage.home.write("turned \u202Egnp.exe", "");
  await stage.serve();
  const page = await stage.person();
  page.on("dialog", () => stage.problems.push("a name ran"));
  await untilNames(page, ["<img src=x onerror=alert(1)>.txt", "line␊break␇.txt",
                          "turned ⟨U+202E⟩gnp.exe"]);
  await command(page, "line␊break␇.txt", "Move to trash");
  await page.waitForSelector("text=“line␊break␇.txt” is in the trash");
});

