// Questions, menus and messages.

import { button, h, icon } from "./dom.js";
import { t } from "./text.js";

// Shows a dialog; answers what its content closes it with, null when it is left. `make` is given
// the function that closes it and answers the content.
export function dialog(title, make, { wide = false, className = "" } = {}) {
  return new Promise((resolve) => {
    const before = document.activeElement;
    let answer = null;
    const close = (value = null) => {
      answer = value;
      element.close();
    };
    const heading = h("h2", { id: "dialog-title" }, title);
    const element = h("dialog", { class: `dialog ${wide ? "wide" : ""} ${className}`,
                                  "aria-labelledby": "dialog-title",
                                  onclick: (event) => event.target === element && close(),
                                  onclose: () => {
                                    element.remove();
                                    before?.focus?.();
                                    resolve(answer);
                                  } },
      h("div", { class: "dialog-head" }, heading,
        button(t("close"), "close", () => close(), { kind: "quiet" })),
      h("div", { class: "dialog-body" }, make(close)));
    document.body.append(element);
    element.showModal();
    (element.querySelector("[autofocus]") ?? element.querySelector(".dialog-body button, input"))
      ?.focus();
  });
}

export function buttons(...all) {
  return h("div", { class: "dialog-buttons" }, all);
}

// True when the person agrees.
export function confirm(title, text, agree, { danger = false } = {}) {
  return dialog(title, (close) => [
    h("p", {}, text),
    buttons(button(t("cancel"), null, () => close(false), { text: true, autofocus: true }),
            button(agree, null, () => close(true),
                   { text: true, kind: danger ? "danger" : "primary" }))]);
}

export function explain(title, text, ...more) {
  return dialog(title, (close) => [
    h("p", {}, text),
    buttons(more.map(([label, value]) =>
              button(label, null, () => close(value), { text: true })),
            button(t("ok"), null, () => close(null),
                   { text: true, kind: "primary", autofocus: true }))]);
}

// A menu at a place. Entries: {label, icon, act, reason} (with a reason it can't be chosen, and
// tells why) or null for a line.
export function menu(entries, x, y) {
  document.querySelector(".menu")?.remove();
  const before = document.activeElement;
  const close = (backToBefore = true) => {
    element.remove();
    removeEventListener("pointerdown", outside, true);
    if (backToBefore) {
      before?.focus?.();
    }
  };
  const outside = (event) => !element.contains(event.target) && close(false);
  const items = [];
  const element = h("div", { class: "menu", role: "menu", "aria-label": t("actions"),
                             oncontextmenu: (event) => event.preventDefault(),
                             onkeydown: (event) => {
    const at = items.indexOf(document.activeElement);
    const steps = { ArrowDown: at + 1, ArrowUp: at - 1, Home: 0, End: items.length - 1 };
    if (event.key in steps) {
      items[(steps[event.key] + items.length) % items.length].focus();
    } else if (event.key === "Escape" || event.key === "Tab") {
      close();
    } else if (event.key.length === 1 && event.key !== " ") {
      const key = event.key.toLowerCase();
      const order = [...items.slice(at + 1), ...items.slice(0, at + 1)];
      order.find((item) => item.textContent.trim().toLowerCase().startsWith(key))?.focus();
    } else {
      return;
    }
    event.preventDefault();
    event.stopPropagation();
  } }, entries.map((entry) => {
    if (entry === null) {
      return h("div", { class: "menu-line", role: "separator" });
    }
    const item = h("button", { type: "button", role: "menuitem", class: "menu-item",
                               tabindex: "-1", title: entry.reason,
                               "aria-disabled": entry.reason ? "true" : null,
                               onclick: () => {
                                 close();
                                 if (entry.reason) {
                                   explain(t("refusedTitle"), entry.reason);
                                 } else {
                                   entry.act();
                                 }
                               } },
      entry.icon ? icon(entry.icon) : h("span", { class: "icon" }), h("span", {}, entry.label),
      entry.keys ? h("kbd", {}, entry.keys) : null);
    items.push(item);
    return item;
  }));
  (document.querySelector("main") ?? document.body).append(element);
  const box = element.getBoundingClientRect();
  element.style.left = `${Math.max(4, Math.min(x, innerWidth - box.width - 4))}px`;
  element.style.top = `${Math.max(4, Math.min(y, innerHeight - box.height - 4))}px`;
  addEventListener("pointerdown", outside, true);
  items[0]?.focus();
}

export function menuBelow(element, entries) {
  const box = element.getBoundingClientRect();
  menu(entries, box.left, box.bottom + 4);
}

const LIFETIME = 8000;
let lines = null;

export function messages() {
  lines = h("div", { class: "messages", role: "status", "aria-live": "polite" });
  return lines;
}

// A line that stays for a while, or for as long as it is pointed at; with something to do about it.
export function tell(text, { act, label, isError = false } = {}) {
  const line = h("div", { class: `message ${isError ? "error" : ""}` },
    isError ? icon("alert") : null, h("span", {}, text),
    act ? button(label, "undo", () => { line.remove(); act(); }, { text: true, kind: "link" }) : null,
    button(t("close"), "close", () => line.remove(), { kind: "quiet" }));
  lines.append(line);
  while (lines.children.length > 3) {
    lines.firstElementChild.remove();
  }
  const leave = () => {
    if (line.matches(":hover, :focus-within")) {
      setTimeout(leave, LIFETIME);
    } else {
      line.remove();
    }
  };
  setTimeout(leave, LIFETIME);
  return line;
}

export function tellError(error) {
  if (error.name !== "AbortError") {
    tell(error.message, { isError: true });
  }
}
