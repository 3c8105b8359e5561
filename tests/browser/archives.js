import assert from "node:assert/strict";
import { execFileSync } from "node:child_process";
import { mkdir, symlink, writeFile } from "node:fs/promises";
import { join } from "node:path";

import { run } from "./service.js";
import { choose, command, row, test, untilNames } from "./suite.js";

// What an independent reader finds: names and contents; a wrong checksum is an error.
function contents(path) {
  const script = "import json, sys, zipfile\nwith zipfile.ZipFile(sys.argv[1]) as z:\n" +
    " print(json.dumps({e.filename: z.read(e).decode('latin-1') for e in z.infolist()}))";
  return JSON.parse(execFileSync("python3", ["-c", script, path], { encoding: "utf8" }));
}

async function download(page, work) {
  const arrives = page.waitForEvent("download");
  await work();
  const file = await arrives;
  assert.equal(await file.failure(), null);
  return { name: file.suggestedFilename(), contents: contents(await file.path()) };
}

test("Archives.aSelectionIsDownloadedAsOneFile", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.home.write("In/naïve ☃.txt", "snow");
  await stage.home.write("In/Deep/b.txt", "b");
  await stage.home.write("In/not chosen", "");
  await mkdir(stage.home.document("In/Deep/Empty"));
  await stage.serve();
  const page = await stage.person();
  await row(page, "In").dblclick();
  await choose(page, "Deep");
  for (const name of ["a.txt", "naïve ☃.txt"]) {
    await row(page, name).click({ modifiers: ["Control"] });
  }
  const found = await download(page, () => command(page, "a.txt", "Download as ZIP"));
  assert.equal(found.name, "In.zip");
  assert.deepEqual(found.contents, { "Deep/": "", "Deep/Empty/": "", "Deep/b.txt": "b", "a.txt": "a",
                                     "naïve ☃.txt": "snow" });
});

test("Archives.aFolderIsDownloadedUnderItsNameWithoutWhatLinksLeadTo", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.home.write("In/..\\up", "up");
  await writeFile(join(stage.home.path, "secret"), "secret");
  await symlink(join(stage.home.path, "secret"), stage.home.document("In/link"));
  await symlink(stage.home.path, stage.home.document("In/folder link"));
  await stage.serve();
  const page = await stage.person();
  const found = await download(page, () => command(page, "In", "Download as ZIP"));
  assert.equal(found.name, "In.zip");
  assert.deepEqual(found.contents, { "In/": "", "In/.._up": "up", "In/a.txt": "a" });
});

test("Archives.theSameNamesOfSeveralFoldersAreKeptApart", async (stage) => {
  await stage.home.write("One/report.txt", "1");
  await stage.home.write("Two/report.txt", "2");
  await stage.serve();
  const page = await stage.person();
  await page.getByRole("searchbox").fill("report");
  await untilNames(page, ["report.txt", "report.txt"]);
  await page.locator(".items").focus();
  await page.keyboard.press("Control+a");
  const found = await download(page, async () => {
    await page.keyboard.press("Shift+F10");
    await page.getByRole("menuitem", { name: "Download as ZIP" }).click();
  });
  assert.deepEqual(Object.keys(found.contents).sort(), ["report 2.txt", "report.txt"]);
  assert.deepEqual(Object.values(found.contents).sort(), ["1", "2"]);
});

test("Archives.theirAddressesEndWithTheirSession", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  const service = await stage.serve();
  const page = await stage.person();
  const [{ itemIdentifier }] = await run(stage.home, "id", stage.home.document("In"));
  const ask = (body) => page.evaluate(async (order) => {
    const answer = await fetch("/v1/archives", { method: "POST", body: order, headers: {
      "Content-Type": "application/json",
      "Marrowdale-Session": localStorage.getItem("marrowdale-session") } });
    return { status: answer.status, body: await answer.json() };
  }, JSON.stringify(body));
  for (const wrong of [{}, { items: [], name: "x" }, { items: [itemIdentifier] },
                       { items: [1], name: "x" }, { items: Array(10_001).fill("did=1"), name: "x" }]) {
    assert.equal((await ask(wrong)).status, 400);
  }
  const { status, body } = await ask({ items: [itemIdentifier], name: "x\r\ny.zip" });
  assert.equal(status, 200);
  const answer = await fetch(service.origin + body.address);
  assert.equal(answer.status, 200);
  assert.equal(answer.headers.get("content-type"), "application/zip");
  assert.match(answer.headers.get("content-disposition"), /^attachment; filename="xy.zip"/);
  await answer.arrayBuffer();
  assert.equal((await fetch(service.origin + "/files/archive/" + "0".repeat(64))).status, 403);
  await page.evaluate(async () => {
    const { get, remove } = await import("/assets/api.js");
    const { sessions } = await get("/v1/sessions");
    await remove(`/v1/sessions/${sessions[0].number}`);
  });
  assert.equal((await fetch(service.origin + body.address)).status, 403);
});
