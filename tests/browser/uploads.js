import assert from "node:assert/strict";
import { mkdir, readdir, readFile, writeFile } from "node:fs/promises";
import { join } from "node:path";

import { row, test, until, untilNames } from "./suite.js";

async function inFolder(stage) {
  await stage.home.write("In/x.txt", "old");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["x.txt"]);
  return page;
}

function file(name, content) {
  return { name, mimeType: "text/plain", buffer: Buffer.from(content) };
}

const FILES = "input[type=file]:not([webkitdirectory])";

test("Uploads.filesAreTakenByTheButton", async (stage) => {
  const page = await inFolder(stage);
  await page.getByRole("button", { name: "Upload" }).click();
  await page.getByRole("menuitem", { name: "Upload files…" }).waitFor();
  const chooses = page.waitForEvent("filechooser");
  await page.getByRole("menuitem", { name: "Upload files…" }).click();
  await (await chooses).setFiles([file("a.txt", "aaa"), file("empty", ""), file("ü b.txt", "bbb")]);
  await untilNames(page, ["a.txt", "empty", "ü b.txt", "x.txt"]);
  assert.equal(await readFile(stage.home.document("In/ü b.txt"), "utf8"), "bbb");
});

test("Uploads.foldersKeepTheirShape", async (stage) => {
  const page = await inFolder(stage);
  const source = join(stage.home.path, "Source");
  await mkdir(join(source, "deep"), { recursive: true });
  await writeFile(join(source, "one"), "1");
  await writeFile(join(source, "deep/two"), "2");
  await page.setInputFiles("input[webkitdirectory]", source);
  await untilNames(page, ["Source", "x.txt"]);
  await until(async () => await readFile(stage.home.document("In/Source/deep/two"), "utf8") === "2");
  assert.equal(await readFile(stage.home.document("In/Source/one"), "utf8"), "1");
});

test("Uploads.filesAreTakenByDragging", async (stage) => {
  const page = await inFolder(stage);
  const transfer = await page.evaluateHandle(() => {
    const data = new DataTransfer();
    data.items.add(new File(["dropped"], "dropped.txt"));
    return data;
  });
  await page.dispatchEvent(".main", "dragover", { dataTransfer: transfer });
  await page.dispatchEvent(".main", "drop", { dataTransfer: transfer });
  await untilNames(page, ["dropped.txt", "x.txt"]);
});

test("Uploads.aTakenNameIsAskedAbout", async (stage) => {
  const page = await inFolder(stage);
  const asked = page.getByRole("dialog", { name: "“x.txt” is there already" });
  await page.setInputFiles(FILES, [file("x.txt", "second")]);
  await asked.waitFor();
  await page.getByRole("button", { name: "Keep both" }).click();
  await untilNames(page, ["x 2.txt", "x.txt"]);
  assert.equal(await readFile(stage.home.document("In/x.txt"), "utf8"), "old");
  await page.setInputFiles(FILES, [file("x.txt", "third")]);
  await asked.waitFor();
  await page.getByRole("button", { name: "Skip" }).click();
  await page.waitForSelector("text=Skipped");
  await page.setInputFiles(FILES, [file("x.txt", "fourth")]);
  await asked.waitFor();
  await page.getByRole("button", { name: "Trash the old one" }).click();
  await until(async () => await readFile(stage.home.document("In/x.txt"), "utf8") === "fourth");
  await page.getByRole("link", { name: "Trash" }).click();
  await untilNames(page, ["x.txt"]);
});

test("Uploads.oneAnswerServesForAll", async (stage) => {
  await stage.home.write("In/y.txt", "old");
  const page = await inFolder2(stage);
  await page.setInputFiles(FILES, [file("x.txt", "new"), file("y.txt", "new")]);
  await page.getByLabel("Do the same for all others").check();
  await page.getByRole("button", { name: "Keep both" }).click();
  await untilNames(page, ["x 2.txt", "x.txt", "y 2.txt", "y.txt"]);
});

async function inFolder2(stage) {
  await stage.home.write("In/x.txt", "old");
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await untilNames(page, ["x.txt", "y.txt"]);
  return page;
}

test("Uploads.aCancelledOneLeavesNothing", async (stage) => {
  const page = await inFolder(stage);
  // Slow enough to be stopped on its way.
  const session = await page.context().newCDPSession(page);
  await session.send("Network.enable");
  await session.send("Network.emulateNetworkConditions",
                     { offline: false, latency: 0, downloadThroughput: -1, uploadThroughput: 200_000 });
  const big = join(stage.home.path, "big.bin");
  await writeFile(big, Buffer.alloc(20_000_000));
  await page.setInputFiles(FILES, big);
  const uploads = page.getByRole("region", { name: "Uploads" });
  await uploads.getByRole("button", { name: "Cancel", exact: true }).click();
  await uploads.getByText("Cancelled").waitFor();
  const staged = join(stage.home.path, ".local/state/marrowdale/uploads");
  await until(async () => (await readdir(staged).catch(() => [])).length === 0);
  assert.deepEqual(await readdir(stage.home.document("In")), ["x.txt"]);
});
