// Making elements. Everything that comes from outside is set as text or as an attribute, never as
// markup.

export function h(tag, attributes = {}, ...children) {
  const element = document.createElement(tag);
  for (const [name, value] of Object.entries(attributes)) {
    if (name.startsWith("on")) {
      element.addEventListener(name.slice(2), value);
    } else if (value === true) {
      element.setAttribute(name, "");
    } else if (value !== false && value !== null && value !== undefined) {
      element.setAttribute(name, value);
    }
  }
  element.append(...children.flat(Infinity).filter((child) => child !== null && child !== undefined));
  return element;
}

const SVG = "http://www.w3.org/2000/svg";

// Outlines on a field of 24 by 24.
const OUTLINES = {
  folder: "M3 7a2 2 0 0 1 2-2h4l2 2.5h8a2 2 0 0 1 2 2V17a2 2 0 0 1-2 2H5a2 2 0 0 1-2-2z",
  file: "M6 3h8l4 4v14H6zM14 3v4h4",
  text: "M6 3h8l4 4v14H6zM14 3v4h4M9 12h6M9 15h6M9 18h3",
  image: "M4 5h16v14H4zM4 16l4.5-4.5 4 4 3-3L20 17M15.5 9.5h.01",
  audio: "M9 18V6l10-2v12M9 18a2.5 2.5 0 1 1-5 0 2.5 2.5 0 0 1 5 0zM19 16a2.5 2.5 0 1 1-5 0 2.5 2.5 0 0 1 5 0z",
  video: "M3 6h12v12H3zM15 10.5l6-3.5v10l-6-3.5",
  pdf: "M6 3h8l4 4v14H6zM14 3v4h4M10 18v-6h2.2a1.8 1.8 0 0 1 0 3.6H10",
  archive: "M4 4h16v4H4zM5.5 8v12h13V8M10 12h4",
  table: "M4 5h16v14H4zM4 10h16M4 14.5h16M10 5v14",
  code: "M6 3h8l4 4v14H6zM14 3v4h4M10.5 12L8.5 14.5l2 2.5M13.5 12l2 2.5-2 2.5",
  package: "M12 3l8 4v10l-8 4-8-4V7zM4 7l8 4 8-4M12 11v10",
  app: "M5 5h6v6H5zM13 5h6v6h-6zM5 13h6v6H5zM13 13h6v6h-6z",
  documents: "M3 7a2 2 0 0 1 2-2h4l2 2.5h8a2 2 0 0 1 2 2V17a2 2 0 0 1-2 2H5a2 2 0 0 1-2-2zM8 13h8M8 16h5",
  star: "M12 3.5l2.6 5.4 5.9.8-4.3 4.1 1 5.9-5.2-2.8-5.2 2.8 1-5.9-4.3-4.1 5.9-.8z",
  clock: "M12 3.5a8.5 8.5 0 1 1 0 17 8.5 8.5 0 0 1 0-17zM12 7.5V12l3 2",
  tag: "M4 4h7l9 9-7 7-9-9zM8 8h.01",
  trash: "M5 7h14M10 4h4M6.5 7l1 13h9l1-13M10 11v5.5M14 11v5.5",
  search: "M11 4.5a6.5 6.5 0 1 1 0 13 6.5 6.5 0 0 1 0-13zM16 16l4 4",
  list: "M8 6h12M8 12h12M8 18h12M4 6h.01M4 12h.01M4 18h.01",
  grid: "M4.5 4.5h6v6h-6zM13.5 4.5h6v6h-6zM4.5 13.5h6v6h-6zM13.5 13.5h6v6h-6z",
  upload: "M12 16V5M7.5 9L12 4.5 16.5 9M4.5 16v3.5h15V16",
  download: "M12 4.5v11M7.5 11L12 15.5l4.5-4.5M4.5 16v3.5h15V16",
  newFolder: "M3 7a2 2 0 0 1 2-2h4l2 2.5h8a2 2 0 0 1 2 2V17a2 2 0 0 1-2 2H5a2 2 0 0 1-2-2zM12 10.5v6M9 13.5h6",
  more: "M5 12h.01M12 12h.01M19 12h.01",
  info: "M12 3.5a8.5 8.5 0 1 1 0 17 8.5 8.5 0 0 1 0-17zM12 11v5M12 8h.01",
  chevron: "M9.5 6l6 6-6 6",
  up: "M7 14l5-5 5 5",
  down: "M7 10l5 5 5-5",
  close: "M6.5 6.5l11 11M17.5 6.5l-11 11",
  check: "M5 12.5l4.5 4.5L19 7.5",
  undo: "M8.5 8.5H15a4.5 4.5 0 0 1 0 9h-4M8.5 8.5L12 5M8.5 8.5L12 12",
  menu: "M4 7h16M4 12h16M4 17h16",
  screens: "M4 5h16v11H4zM9 20h6M12 16v4",
  filter: "M4 5.5h16l-6.2 7.2v5.8l-3.6-2v-3.8z",
  pencil: "M5 19l.8-3.6L16 5.2l2.8 2.8L8.6 18.2zM14 7.2l2.8 2.8",
  link: "M10.5 13.5l3-3M9 11l-2.6 2.6a2.9 2.9 0 0 0 4.1 4.1L13 15M11 9l2.5-2.6a2.9 2.9 0 0 1 4.1 4.1L15 13",
  left: "M14.5 6l-6 6 6 6",
  alert: "M12 4l9 16H3zM12 10v4.5M12 17.5h.01",
};

export function icon(name) {
  const image = document.createElementNS(SVG, "svg");
  image.setAttribute("viewBox", "0 0 24 24");
  image.setAttribute("class", `icon icon-${name}`);
  image.setAttribute("aria-hidden", "true");
  const path = document.createElementNS(SVG, "path");
  path.setAttribute("d", OUTLINES[name] ?? OUTLINES.file);
  image.append(path);
  return image;
}

// A button with a picture; `label` is its name, shown when `text` is true.
export function button(label, picture, onclick, { text = false, kind = "", ...more } = {}) {
  return h("button", { type: "button", class: `button ${kind} ${text ? "" : "only-icon"}`,
                       "aria-label": text ? null : label, title: text ? null : label, onclick,
                       ...more },
           picture ? icon(picture) : null, text ? h("span", {}, label) : null);
}
