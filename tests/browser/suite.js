// Tests with a home, a service and a web browser each. What is written is what the other suites
// write, so that one summary reads all of them.

import { Home, Service } from "./service.js";
import { launch } from "./web-browser.js";

const tests = [];

// `work` is given a Stage.
export function test(name, work, options = {}) {
  tests.push({ name, work, options });
}

export const PATIENCE = 15_000;

// What a test works with; all of it goes with the test.
export class Stage {
  constructor(browser) {
    this.browser = browser;
    this.contexts = [];
    this.problems = [];
  }

  async begin() {
    this.home = await Home.make();
  }

  async serve(options) {
    this.service = await Service.start(this.home, options);
    return this.service;
  }

  // A web browser of its own, at the page; `more` are options of its context.
  async open(more = {}, address = this.service.address) {
    const context = await this.browser.newContext({ viewport: { width: 1100, height: 700 }, ...more });
    this.contexts.push(context);
    const page = await context.newPage();
    page.setDefaultTimeout(PATIENCE);
    page.on("pageerror", (error) => this.problems.push(`error in the page: ${error.stack}`));
    page.on("console", (message) => {
      if (message.type() === "error" && !message.text().includes("Failed to load resource")) {
        this.problems.push(`console: ${message.text()}`);
      }
    });
    await page.goto(address);
    return page;
  }

  // The page with a session, at a place ("#/trash").
  async person(more = {}, place = "#/") {
    const page = await this.open(more);
    await page.waitForSelector(".sidebar");
    if (place !== "#/") {
      await page.goto(this.service.origin + "/" + place);
    }
    await page.waitForSelector(".main[aria-busy=false]");
    return page;
  }

  async end() {
    await Promise.all(this.contexts.map((context) => context.close()));
    if (this.service) {
      this.service.goOn();
      const code = await this.service.stop();
      if (code !== 0 || this.service.errors !== "") {
        this.problems.push(`the service ended with ${code}: ${this.service.errors}`);
      }
    }
    await this.home.remove();
  }
}

// Calls `look` until it answers something true; a look that throws is one that did not.
export async function until(look, what = "what was waited for") {
  const deadline = Date.now() + PATIENCE;
  let last;
  do {
    try {
      last = await look();
      if (last) {
        return last;
      }
    } catch (error) {
      last = error;
    }
    await new Promise((resolve) => setTimeout(resolve, 20));
  } while (Date.now() < deadline);
  throw new Error(`${what} did not happen; last: ${last?.stack ?? JSON.stringify(last)}`);
}

// The names that are shown, in their order.
export function names(page) {
  return page.$$eval(".sizer > *", (rows) => rows
    .sort((a, b) => a.getAttribute("aria-rowindex") - b.getAttribute("aria-rowindex"))
    .flatMap((row) => [...row.querySelectorAll(".item-name")].map((name) => name.textContent)));
}

export async function untilNames(page, wanted) {
  let last = null;
  await until(async () => {
    last = JSON.stringify(await names(page));
    return last === JSON.stringify(wanted);
  }, `the names ${JSON.stringify(wanted)}`).catch((error) => {
    throw new Error(`${error.message}; the names were ${last}`);
  });
}

export function row(page, name) {
  return page.locator(".row, .tile").filter({ has: page.locator(`.item-name`, { hasText: new RegExp(
    `^${name.replace(/[.*+?^${}()|[\]\\]/g, "\\$&")}$`) }) });
}

export async function choose(page, name) {
  await row(page, name).click();
}

export async function command(page, name, label) {
  await row(page, name).click({ button: "right" });
  await page.getByRole("menuitem", { name: label }).click();
}

async function runOne(browser, { name, work }) {
  const stage = new Stage(browser);
  const begun = Date.now();
  console.log(`[ RUN      ] ${name}`);
  let failure = null;
  try {
    await stage.begin();
    await work(stage);
  } catch (error) {
    failure = error;
  }
  try {
    await stage.end();
  } catch (error) {
    failure ??= error;
  }
  if (!failure && stage.problems.length > 0) {
    failure = new Error(stage.problems.join("\n"));
  }
  if (failure) {
    console.log(failure.stack);
    stage.problems.forEach((problem) => console.log(problem));
  }
  console.log(`[  ${failure ? "FAILED  " : "     OK "}] ${name} (${Date.now() - begun} ms)`);
  return failure === null;
}

export async function runAll(filter) {
  const browser = await launch();
  let isFine = true;
  for (const each of tests.filter(({ name }) => name.includes(filter))) {
    isFine = await runOne(browser, each) && isFine;
  }
  await browser.close();
  return isFine;
}
