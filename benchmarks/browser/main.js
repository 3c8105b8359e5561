// node main.js FILES [ROUNDS]: what the document browser costs, beside a bare page over the same folder.

import { mkdir, writeFile } from "node:fs/promises";

import { Home, run, Service } from "../../tests/browser/service.js";
import { launch } from "../../tests/browser/web-browser.js";
import { serveBarePage } from "./bare-page.js";

const count = Number(process.argv[2]);
const ROUNDS = Number(process.argv[3] ?? 3);
const CHANGES = 40;
const PATIENCE = 300_000;  // the index of names is made anew first

const OURS = { rows: ".sizer > .row", scroller: ".items" };
const BARE = { rows: "#rows > .row", scroller: "#rows" };

function at(sorted, part) {
  return sorted[Math.min(sorted.length - 1, Math.floor(sorted.length * part))];
}

function sorted(numbers) {
  return [...numbers].sort((a, b) => a - b);
}

// Milliseconds from `begin` in the page to the frame in which the first rows are there.
function untilRows(page, begin, isThere) {
  return page.evaluate(async ([start, look]) => {
    const begun = performance.now();
    (0, eval)(start);
    const there = (0, eval)(look);
    while (!there()) {
      await new Promise(requestAnimationFrame);
    }
    return performance.now() - begun;
  }, [begin, isThere]);
}

// The longest frame, in milliseconds, while the whole list goes by.
function worstFrame(page, scroller) {
  return page.evaluate(async (selector) => {
    const element = document.querySelector(selector);
    const step = element.scrollHeight / 240;
    let worst = 0;
    let last = await new Promise(requestAnimationFrame);
    for (let i = 0; i < 240; ++i) {
      element.scrollTop = i * step;
      const now = await new Promise(requestAnimationFrame);
      worst = Math.max(worst, now - last);
      last = now;
    }
    element.scrollTop = 0;
    return worst;
  }, scroller);
}

function tell(what, ours, bare, unit = "ms") {
  console.log(`| ${what} | ${ours.toFixed(0)} ${unit} | ${bare.toFixed(0)} ${unit} | ` +
    `${(ours / Math.max(bare, 0.1)).toFixed(2)} |`);
}

const home = await Home.make();
const folder = home.document("Many");
await mkdir(folder);
for (let i = 0; i < count; ++i) {
  await writeFile(`${folder}/file ${String(i).padStart(6, "0")}.txt`, "");
}
const service = await Service.start(home);
process.on("exit", () => service.child.kill());  // where something failed on the way
const [{ itemIdentifier }] = await run(home, "id", folder);
const bare = await serveBarePage(folder);
// Each in a web browser of its own: a window behind another one gets no frames.
const browsers = [await launch(), await launch()];
const [page, other] = await Promise.all(browsers.map((browser) =>
  browser.newPage({ viewport: { width: 1100, height: 700 } })));
page.setDefaultTimeout(PATIENCE);
await page.goto(service.address);
await page.waitForSelector(OURS.rows);

const first = { ours: [], bare: [] };
const whole = { ours: [], bare: [] };
const hash = `#/item/${encodeURIComponent(itemIdentifier)}`;
for (let round = 0; round < ROUNDS; ++round) {
  await page.evaluate(() => { location.hash = "#/recents"; });
  await page.waitForSelector("text=Nothing opened yet");
  first.ours.push(await untilRows(page, `location.hash = ${JSON.stringify(hash)}`,
    "() => Number(document.querySelector('.items').getAttribute('aria-rowcount')) > 200"));
  const rest = await untilRows(page, "0",
    "() => document.querySelector('.main').getAttribute('aria-busy') === 'false'");
  whole.ours.push(first.ours.at(-1) + rest);
  await other.goto(bare.address);
  first.bare.push(await untilRows(other, "begin()",
    "() => document.querySelectorAll('.row').length >= 200"));
  whole.bare.push(first.bare.at(-1) + await untilRows(other, "0", "() => window.isWhole"));
}

const frames = { ours: [], bare: [] };
for (let round = 0; round < ROUNDS; ++round) {
  frames.ours.push(await worstFrame(page, OURS.scroller));
  frames.bare.push(await worstFrame(other, BARE.scroller));
}

// Milliseconds from a write to the frame that shows it, of several writes. Sizes go in steps of a
// hundred bytes, so that each shows another text.
async function changes(target, rows) {
  const times = [];
  for (let i = 1; i <= CHANGES; ++i) {
    const size = (i + 10) * 100;
    const wanted = [`${size / 1000} kB`, `Z${size}`];
    const shown = target.evaluate(async ([selector, texts]) => {
      const isShown = () => {
        const text = document.querySelector(selector).textContent;
        return texts.some((each) => text.includes(each));
      };
      while (!isShown()) {
        await new Promise(requestAnimationFrame);
      }
      return Date.now();
    }, [`${rows}`, wanted]);
    await writeFile(`${folder}/file 000000.txt`, "x".repeat(size));
    const begun = Date.now();
    times.push(Math.max(0, await shown - begun));
  }
  return sorted(times);
}
const ourChanges = await changes(page, '.row[aria-rowindex="2"]');
const bareChanges = await changes(other, '.row[data-name="file 000000.txt"]');

console.log(`A folder of ${count} files, headless Chromium; the middle of ${ROUNDS} rounds.\n`);
console.log("| what | the document browser | a bare page | ratio |\n|---|---|---|---|");
tell("the first 200 rows are there", at(sorted(first.ours), 0.5), at(sorted(first.bare), 0.5));
tell("all rows are there", at(sorted(whole.ours), 0.5), at(sorted(whole.bare), 0.5));
tell("the worst frame while all of it goes by", at(sorted(frames.ours), 0.5), at(sorted(frames.bare), 0.5));
tell("a change on disk is shown, median", at(ourChanges, 0.5), at(bareChanges, 0.5));
tell("the same, 95th percentile", at(ourChanges, 0.95), at(bareChanges, 0.95));
await Promise.all(browsers.map((browser) => browser.close()));
bare.stop();
await service.stop();
await home.remove();
