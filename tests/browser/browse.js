import assert from "node:assert/strict";
import { mkdir, readFile, rm, stat } from "node:fs/promises";
import { join } from "node:path";

import { run, runWith, Service } from "./service.js";
import { test, until, untilNames } from "./suite.js";

// What a desktop opens is written down in place of being opened.
const OPENER = "#!/bin/sh\nprintf '%s' \"$*\" > \"$HOME/opened.new\"\nmv \"$HOME/opened.new\" \"$HOME/opened\"\n";
const DISPLAY = { DISPLAY: ":99" };

async function opened(home) {
  const place = join(home.path, "opened");
  const target = await until(() => readFile(place, "utf8"), "something opened");
  await rm(place);
  return target;
}

function failure(...args) {
  return runWith(...args).then(() => "", (error) => JSON.parse(error.message).error.message);
}

test("Browse.asksTheServiceThatRunsAndOpensItsPage", async (stage) => {
  await stage.home.installProgram("xdg-open", OPENER);
  await stage.home.write("a.txt", "a");
  const service = await stage.serve();
  const [told] = await runWith(stage.home, DISPLAY, "browse");
  assert.equal(told.serving, stage.home.root);
  assert.equal(new URL(told.browser).origin, service.origin);
  assert.notEqual(told.browser, service.address);
  // What others may see of it says nothing.
  const target = await opened(stage.home);
  assert.match(target, /^file:\/\/\/[^#]*\/browse\.html$/);
  const page = await stage.open({}, target);
  await untilNames(page, ["a.txt"]);
  const file = await stat(new URL(target));
  assert.equal(file.mode & 0o777, 0o600);
  // The printed address was the same, and is used up.
  const other = await stage.open({}, told.browser);
  await other.waitForSelector("text=Open a new address");
});

test("Browse.withoutADisplayItOnlyPrints", async (stage) => {
  await stage.home.installProgram("xdg-open", OPENER);
  await stage.home.write("a.txt", "a");
  await stage.serve();
  const [told] = await runWith(stage.home, { DISPLAY: "" }, "browse");
  const [again] = await runWith(stage.home, DISPLAY, "browse", "--no-open");
  assert.notEqual(told.browser, again.browser);
  for (const address of [told.browser, again.browser]) {
    await untilNames(await stage.open({}, address), ["a.txt"]);
  }
  await assert.rejects(stat(join(stage.home.path, "opened")));
});

test("Browse.servesWhereNothingDoes", async (stage) => {
  await stage.home.installProgram("xdg-open", OPENER);
  await stage.home.write("a.txt", "a");
  stage.service = await Service.start(stage.home, [], "browse", DISPLAY);
  const page = await stage.open({}, await opened(stage.home));
  await untilNames(page, ["a.txt"]);
  await stage.home.write("b.txt", "b");
  await untilNames(page, ["a.txt", "b.txt"]);
  // A second one is shown the same service, and leaves it running.
  const [told] = await runWith(stage.home, DISPLAY, "browse");
  assert.equal(new URL(told.browser).origin, stage.service.origin);
});

test("Browse.severalAtOnceFindOneService", async (stage) => {
  await stage.home.write("a.txt", "a");
  const all = await Promise.all([1, 2, 3].map(() => Service.start(stage.home, ["--no-open"], "browse")));
  assert.equal(new Set(all.map(({ origin }) => origin)).size, 1);
  const left = await until(() => {
    const running = all.filter(({ child }) => child.exitCode === null);
    return running.length === 1 && running[0];
  });
  stage.service = left;
  await untilNames(await stage.open({}, all[0].address), ["a.txt"]);
});

test("Browse.saysWhatItCannotShow", async (stage) => {
  await mkdir(join(stage.home.path, "Other"));
  const service = await stage.serve();
  assert.match(await failure(stage.home, {}, "--root", join(stage.home.path, "Other"), "browse"),
               new RegExp(`process ${service.child.pid} serves ${stage.home.root}`));
  assert.equal((await run(stage.home, "--root", stage.home.root, "browse")).length, 1);
});

test("Browse.aServiceThatPrintsNoAddressIsAskedForOne", async (stage) => {
  const { spawn } = await import("node:child_process");
  const { program } = await import("./service.js");
  for (const [option, isThere] of [["--no-address", true], ["--no-browser", false]]) {
    const child = spawn(program, ["--json", "serve", option], { env: stage.home.environment });
    const ended = new Promise((resolve) => child.on("exit", resolve));
    const line = await new Promise((resolve) => child.stdout.once("data", (text) => resolve(String(text))));
    assert.deepEqual(Object.keys(JSON.parse(line)), ["serving"]);
    if (isThere) {
      const [told] = await run(stage.home, "browse");
      assert.equal((await fetch(new URL(told.browser).origin + "/")).status, 200);
    } else {
      assert.match(await failure(stage.home, {}, "browse"), /without the document browser/);
    }
    child.kill();
    assert.equal(await ended, 0);
  }
});
