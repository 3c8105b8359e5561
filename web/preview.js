// Shows documents without leaving the page: pictures, text, PDF, sound and film. Content that could
// do something (HTML, SVG) is shown as the text that it is.

import { addressOf, beginning } from "./api.js";
import { button, h, icon } from "./dom.js";
import { kindOf, shownDate, shownName, shownSize } from "./format.js";
import { t } from "./text.js";

const LONGEST_TEXT = 256 * 1024;
const TEXT = /^text\/|json|xml|javascript|shellscript|yaml|toml|sql|x-perl|x-ruby|x-php|x-desktop/;
const PICTURES = /^image\/(png|jpeg|gif|webp|avif|bmp|vnd\.microsoft\.icon|x-icon)$/;

export function isPreviewed(item) {
  const type = item.typeIdentifier ?? "";
  return !item.isFolder && item.documentSize !== undefined && (PICTURES.test(type) ||
    TEXT.test(type) || type === "application/pdf" || /^(audio|video)\//.test(type));
}

async function content(item, signal) {
  const type = item.typeIdentifier ?? "";
  const name = shownName(item.filename);
  if (PICTURES.test(type)) {
    return h("img", { class: "preview-image", alt: name,
                      src: await addressOf(item.itemIdentifier, "content") });
  }
  if (type.startsWith("audio/")) {
    return h("audio", { controls: true, src: await addressOf(item.itemIdentifier, "content") });
  }
  if (type.startsWith("video/")) {
    return h("video", { controls: true, src: await addressOf(item.itemIdentifier, "content") });
  }
  if (type === "application/pdf") {
    return h("iframe", { class: "preview-frame", title: name,
                         src: await addressOf(item.itemIdentifier, "content") + "#navpanes=0" });
  }
  if (TEXT.test(type)) {
    return text(item, signal);
  }
  return nothing(item);
}

async function text(item, signal) {
  const bytes = await beginning(item.itemIdentifier, LONGEST_TEXT, signal);
  const shown = new TextDecoder().decode(bytes);
  return [h("pre", { class: "preview-text", tabindex: "0" }, shown),
          item.documentSize > bytes.length ? h("p", { class: "hint" }, t("textCut")) : null];
}

function nothing(item) {
  return h("div", { class: "preview-nothing" }, icon(kindOf(item).icon),
    h("p", {}, item.isFolder || item.documentSize === undefined ? kindOf(item).name
      : t("noPreview")));
}

// Shows the items one at a time, beginning with the one at `index`. `moved` is told of each.
export function preview(items, index, { moved, open, download }) {
  const before = document.activeElement;
  let at = index;
  let loading = new AbortController();
  const title = h("bdi", {});
  const facts = h("span", { class: "hint" });
  const place = h("div", { class: "preview-content", tabindex: "-1" });
  const element = h("dialog", {
    class: "preview", "aria-labelledby": "preview-title",
    onclose: () => {
      loading.abort();
      element.remove();
      before?.focus?.();
    },
    onkeydown: (event) => {
      if (event.target.closest("audio, video, .preview-text") && event.key !== " ") {
        return;
      }
      const step = { ArrowLeft: -1, ArrowUp: -1, ArrowRight: 1, ArrowDown: 1 }[event.key];
      if (step) {
        event.preventDefault();
        go(step);
      } else if (event.key === " " && !event.target.closest("button, audio, video")) {
        event.preventDefault();
        element.close();
      }
    } },
    h("div", { class: "dialog-head" }, h("h2", { id: "preview-title" }, title), facts,
      button(t("previous"), "left", () => go(-1), { kind: "quiet" }),
      button(t("next"), "chevron", () => go(1), { kind: "quiet" }),
      button(t("download"), "download", () => download(items[at]), { kind: "quiet" }),
      button(t("close"), "close", () => element.close(), { kind: "quiet" })),
    place);

  async function show() {
    loading.abort();
    loading = new AbortController();
    const { signal } = loading;
    const item = items[at];
    title.textContent = shownName(item.filename);
    facts.textContent = [item.isFolder ? "" : shownSize(item.documentSize),
                         shownDate(item.contentModificationDate)].filter(Boolean).join(" · ");
    place.replaceChildren();
    let shown;
    try {
      shown = isPreviewed(item) ? await content(item, signal) : nothing(item);
    } catch (error) {
      shown = h("p", { class: "preview-nothing", role: "alert" }, error.message);
    }
    if (!signal.aborted) {
      place.replaceChildren(...[shown].flat().filter(Boolean));
    }
  }
  function go(step) {
    const next = at + step;
    if (next >= 0 && next < items.length) {
      at = next;
      moved(items[at]);
      show();
    }
  }
  document.body.append(element);
  element.showModal();
  place.focus();
  show();
}
