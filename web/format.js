// Values as people read them.

import { language, t } from "./text.js";

const CONTROL_PICTURES = 0x2400;

// A name as text in one line: control characters as their pictures, marks that turn the direction
// of text by their numbers, bytes that are no text as \xHH.
export function shownName(name) {
  let shown = "";
  for (const character of name) {
    const code = character.codePointAt(0);
    if (code < 0x20) {
      shown += String.fromCodePoint(CONTROL_PICTURES + code);
    } else if (code >= 0xdc80 && code <= 0xdcff) {
      shown += "\\x" + (code - 0xdc00).toString(16).toUpperCase();
    } else if (code === 0x7f || (code >= 0x80 && code < 0xa0) || code === 0x61c ||
               (code >= 0x200e && code <= 0x200f) || (code >= 0x2028 && code <= 0x202e) ||
               (code >= 0x2066 && code <= 0x2069)) {
      shown += `⟨U+${code.toString(16).toUpperCase().padStart(4, "0")}⟩`;
    } else {
      shown += character;
    }
  }
  return shown;
}

// Compares as people count: "file 9" before "file 10", without regard to case and accents.
export function naturalKey(name) {
  return name.normalize("NFKD").replace(/[\u0300-\u036f]/g, "").toLowerCase()
    .replace(/\d+/g, (digits) => {
      const number = digits.replace(/^0+(?=\d)/, "");
      return String.fromCharCode(0x30 + Math.min(number.length, 0x2000)) + number;
    });
}

const UNITS = ["kB", "MB", "GB", "TB", "PB"];
const plain = new Intl.NumberFormat(language);
const oneDigit = new Intl.NumberFormat(language, { maximumFractionDigits: 1 });

export function shownCount(count) {
  return plain.format(count);
}

export function shownSize(bytes) {
  if (bytes === undefined) {
    return "";
  }
  if (bytes < 1000) {
    return bytes === 1 ? t("oneByte") : t("bytes", { n: bytes });
  }
  let value = bytes / 1000;
  let unit = 0;
  while (value >= 999.95 && unit < UNITS.length - 1) {
    value /= 1000;
    unit += 1;
  }
  return `${oneDigit.format(value)} ${UNITS[unit]}`;
}

const sameYear = new Intl.DateTimeFormat(language, { day: "numeric", month: "short",
                                                     hour: "2-digit", minute: "2-digit" });
const otherYear = new Intl.DateTimeFormat(language, { day: "numeric", month: "short",
                                                      year: "numeric" });
const full = new Intl.DateTimeFormat(language, { dateStyle: "long", timeStyle: "medium" });

export function shownDate(text) {
  if (!text) {
    return "";
  }
  const date = new Date(text);
  return (date.getFullYear() === new Date().getFullYear() ? sameYear : otherYear).format(date);
}

export function fullDate(text) {
  return text ? full.format(new Date(text)) : "";
}

const BROWSERS = [["Edg", "Edge"], ["OPR", "Opera"], ["Firefox", "Firefox"], ["Chrome", "Chrome"],
                  ["HeadlessChrome", "Chrome"], ["Version", "Safari"]];
const SYSTEMS = [["Android", "Android"], ["Windows", "Windows"], ["Mac OS X", "macOS"], ["Linux", "Linux"]];

// "Firefox 140, Linux", from what a web browser calls itself.
export function shownClient(client) {
  for (const [mark, name] of BROWSERS) {
    const version = new RegExp(`\\b${mark}/(\\d+)`).exec(client)?.[1];
    if (version) {
      const system = SYSTEMS.find(([words]) => client.includes(words))?.[1];
      return `${name} ${version}${system ? `, ${system}` : ""}`;
    }
  }
  return shownName(client);
}

const ARCHIVES = /zip|tar|gzip|bzip|xz|zstd|7z|rar|compressed/;
const PRESENTATIONS = /presentation|powerpoint/;
const TABLES = /spreadsheet|excel|csv/;
const CODE = /^text\/(x-|html|css|javascript|xml)|json|xml|javascript|shellscript|python/;

// What an item is, in a word: a picture and a name.
export function kindOf(item) {
  const type = item.typeIdentifier ?? "";
  if (item.isContainer) {
    return { icon: "app", name: t("kindApp") };
  }
  if (item.isFolder) {
    return { icon: "folder", name: t("kindFolder") };
  }
  if (type === "inode/directory" || item.documentSize === undefined) {
    return { icon: "package", name: t("kindPackage") };
  }
  if (type.startsWith("image/")) {
    return { icon: "image", name: t("kindImage") };
  }
  if (type.startsWith("audio/")) {
    return { icon: "audio", name: t("kindAudio") };
  }
  if (type.startsWith("video/")) {
    return { icon: "video", name: t("kindVideo") };
  }
  if (type === "application/pdf") {
    return { icon: "pdf", name: "PDF" };
  }
  if (TABLES.test(type)) {
    return { icon: "table", name: t("kindTable") };
  }
  if (PRESENTATIONS.test(type)) {
    return { icon: "screens", name: t("kindPresentation") };
  }
  if (ARCHIVES.test(type)) {
    return { icon: "archive", name: t("kindArchive") };
  }
  if (CODE.test(type)) {
    return { icon: "code", name: t("kindCode") };
  }
  if (type.startsWith("text/") || /document|word|rtf/.test(type)) {
    return { icon: "text", name: t("kindText") };
  }
  return { icon: "file", name: t("kindFile") };
}
