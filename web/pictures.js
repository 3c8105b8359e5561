// Small pictures of items: what images show, scaled down by the web browser itself, and the icons of
// applications. Made for what is in sight, two at a time; some hundred are kept.

import { bytesOf } from "./api.js";
import { h, icon } from "./dom.js";
import { kindOf } from "./format.js";
import { pictureSize } from "./picture-size.js";

const IMAGES = /^image\/(png|jpeg|gif|webp|avif|bmp)$/;
const LARGEST_FILE = 20_000_000;
const MOST_PIXELS = 50_000_000;
const AT_ONCE = 2;
const KEPT = 300;

const kept = new Map();  // bitmaps by what they show, the one used last at the end; null: none
const waiting = [];
let running = 0;

function hasPicture(item) {
  return item.isContainer || IMAGES.test(item.typeIdentifier ?? "") &&
    item.documentSize > 0 && item.documentSize <= LARGEST_FILE;
}

function keyOf(item, width, height) {
  return `${item.itemIdentifier} ${item.versionIdentifier ?? ""} ${width}x${height}`;
}

function keep(key, bitmap) {
  kept.delete(key);
  kept.set(key, bitmap);
  if (kept.size > KEPT) {
    const [oldest, old] = kept.entries().next().value;
    kept.delete(oldest);
    old?.close();
  }
}

// A picture that fits into that many pixels; a small one stays as small as it is.
async function bitmapOf(item, width, height) {
  const bytes = await bytesOf(item.itemIdentifier, item.isContainer ? "/thumbnail" : "/content");
  const size = pictureSize(bytes);
  if (!size || size.width * size.height > MOST_PIXELS) {
    return null;
  }
  const whole = await createImageBitmap(
    new Blob([bytes], { type: item.isContainer ? "image/png" : item.typeIdentifier }));
  const scale = Math.min(1, width / whole.width, height / whole.height);
  const [wide, high] = [whole.width, whole.height].map((side) => Math.max(1, Math.round(side * scale)));
  try {
    return await createImageBitmap(whole, { resizeWidth: wide, resizeHeight: high,
                                            resizeQuality: "medium" });
  } finally {
    whole.close();
  }
}

function draw(element, bitmap, density) {
  const canvas = h("canvas", { width: bitmap.width, height: bitmap.height, "aria-hidden": "true",
                               class: "picture-content" });
  canvas.style.width = `${bitmap.width / density}px`;
  canvas.style.height = `${bitmap.height / density}px`;
  canvas.getContext("2d").drawImage(bitmap, 0, 0);
  element.replaceChildren(canvas);
}

async function go() {
  // What came last is in sight, where one scrolls.
  while (running < AT_ONCE && waiting.length > 0) {
    const { item, element, key, width, height, density } = waiting.pop();
    if (!element.isConnected) {
      continue;
    }
    running += 1;
    try {
      if (!kept.has(key)) {
        keep(key, await bitmapOf(item, width, height));
      }
      if (kept.get(key)) {
        draw(element, kept.get(key), density);
      }
    } catch {
      keep(key, null);  // no picture, or gone meanwhile: the icon says enough
    } finally {
      running -= 1;
    }
  }
}

// An element of at most that size for an item: its icon, and its picture as soon as there is one.
export function pictureOf(item, width, height) {
  const element = h("span", { class: "picture" }, icon(kindOf(item).icon));
  if (!hasPicture(item)) {
    return element;
  }
  const density = Math.min(2, Math.max(1, devicePixelRatio));
  const size = { width: Math.round(width * density), height: Math.round(height * density) };
  const key = keyOf(item, size.width, size.height);
  if (kept.has(key)) {
    const bitmap = kept.get(key);
    keep(key, bitmap);
    if (bitmap) {
      draw(element, bitmap, density);
    }
    return element;
  }
  waiting.push({ item, element, key, density, ...size });
  // The element is not in the page yet.
  requestAnimationFrame(go);
  return element;
}
