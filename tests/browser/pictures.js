import assert from "node:assert/strict";

import { hills, installApplication, picture, pond } from "./sample.js";
import { row, test, until } from "./suite.js";

async function asGrid(page, name) {
  await page.getByRole("button", { name: "Show as grid" }).click();
  await row(page, name).dblclick();
  await page.locator(".tile").first().waitFor();
}

// Width and height of what is shown for an item, and the colour in its middle.
function shown(page, name) {
  return row(page, name).locator("canvas").evaluate((canvas) => {
    const { width, height } = canvas;
    const [red, green, blue] = canvas.getContext("2d").getImageData(width / 2, height / 2, 1, 1).data;
    return { width, height, red, green, blue };
  });
}

test("Pictures.imagesAreShownSmallInTheGrid", async (stage) => {
  await stage.home.write("In/wide.png", hills());
  await stage.home.write("In/high.png", pond());
  await stage.home.write("In/tiny.png", picture(10, 10, () => [255, 0, 0]));
  await stage.serve();
  const page = await stage.person();
  await asGrid(page, "In");
  const wide = await shown(page, "wide.png");
  assert.deepEqual([wide.width, wide.height], [128, 85]);
  const high = await shown(page, "high.png");
  assert.deepEqual([high.width, high.height], [63, 88]);
  const tiny = await shown(page, "tiny.png");
  assert.deepEqual(tiny, { width: 10, height: 10, red: 255, green: 0, blue: 0 });
  // A new content has a new picture.
  await stage.home.write("In/tiny.png", picture(10, 10, () => [0, 0, 255]));
  await until(async () => (await shown(page, "tiny.png")).blue === 255);
});

test("Pictures.whatCouldDoHarmIsNotDecoded", async (stage) => {
  const bomb = picture(10, 10, () => [255, 0, 0]);
  bomb.writeUInt32BE(60_000, 16);
  bomb.writeUInt32BE(60_000, 20);
  await stage.home.write("In/a good one.png", picture(10, 10, () => [0, 255, 0]));
  await stage.home.write("In/bomb.png", bomb);
  await stage.home.write("In/broken.jpg", Buffer.alloc(1000, 1));
  await stage.home.write("In/cut.png", hills().subarray(0, 40));
  await stage.home.write("In/drawing.svg", "<svg xmlns='http://www.w3.org/2000/svg' width='9' height='9'/>");
  await stage.home.write("In/empty.png", "");
  await stage.home.write("In/liar.png", "<svg xmlns='http://www.w3.org/2000/svg' width='9' height='9'/>");
  await stage.serve();
  const page = await stage.person();
  const asked = [];
  page.on("requestfinished", (request) => asked.push(request.url()));
  await asGrid(page, "In");
  await row(page, "a good one.png").locator("canvas").waitFor();
  await until(() => asked.filter((url) => url.endsWith("/content")).length === 5, "all were looked at");
  for (const name of ["bomb.png", "broken.jpg", "cut.png", "drawing.svg", "empty.png", "liar.png"]) {
    await row(page, name).locator(".picture .icon").waitFor();
    assert.equal(await row(page, name).locator("canvas").count(), 0, name);
  }
  assert.deepEqual(await page.evaluate(async () => {
    const { pictureSize } = await import("/assets/picture-size.js");
    const bytes = (...parts) => Uint8Array.from(parts.flatMap((part) => typeof part === "string"
      ? [...part].map((character) => character.charCodeAt(0)) : part).concat(Array(30).fill(0)));
    return [
      bytes("GIF89a", [0x10, 0x27, 0x20, 0x4e]),
      bytes([0xff, 0xd8, 0xff, 0xe0, 0, 4, 1, 2, 0xff, 0xff, 0xc2, 0, 17, 8, 0x01, 0x00, 0x02, 0x00]),
      bytes([0xff, 0xd8, 0xff, 0xc4, 0xff, 0xff, 0]),
      bytes("BM", Array(16).fill(0), [100, 0, 0, 0, 0x9c, 0xff, 0xff, 0xff]),
      bytes("RIFF....WEBPVP8X", Array(8).fill(0), [99, 0, 0, 49, 0, 0]),
      bytes("RIFF....WEBPVP8L", Array(5).fill(0), [0x63, 0x40, 0x0c, 0]),
      bytes("RIFF....WEBPVP8 ", Array(10).fill(0), [0x40, 0x01, 0xf0, 0x00]),
      bytes("....ftypavif....ispe", [0, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 128]),
      bytes("something else")].map(pictureSize);
  }), [{ width: 10_000, height: 20_000 }, { width: 512, height: 256 }, null,
       { width: 100, height: 100 }, { width: 100, height: 50 }, { width: 100, height: 50 },
       { width: 320, height: 240 }, { width: 256, height: 128 }, null]);
});

test("Pictures.applicationsHaveTheirIconsInSidebarAndList", async (stage) => {
  await installApplication(stage.home);
  await stage.serve();
  const page = await stage.person();
  const place = page.getByRole("navigation", { name: "Places" }).getByRole("link", { name: "Notes" });
  await place.locator("canvas").waitFor();
  await page.getByRole("searchbox").fill("notes");
  await row(page, "Notes").locator("canvas").waitFor();
  assert.deepEqual(await shown(page, "Notes").then(({ width, height }) => [width, height]), [18, 18]);
  await place.click();
  await row(page, "Ideas").waitFor();
  // It goes and comes with the application.
  const { rm } = await import("node:fs/promises");
  await rm(stage.home.path + "/.local/share/applications/org.example.Notes.desktop");
  await place.waitFor({ state: "detached" });
});
