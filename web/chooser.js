// Choosing a folder, by keyboard or mouse.

import { CAN, item as itemOf, ROOT } from "./api.js";
import { button, h, icon } from "./dom.js";
import { buttons, dialog } from "./dialogs.js";
import { kindOf, naturalKey, shownName } from "./format.js";
import { t } from "./text.js";
import { foldersIn } from "./uploads.js";

// Answers the chosen folder, or null. Folders in `without` (identifiers) can't be gone into.
export function chooseFolder(title, agree, { without = new Set(), start = ROOT } = {}) {
  return dialog(title, (close) => {
    const path = h("div", { class: "chooser-path" });
    const list = h("div", { class: "chooser", role: "listbox", "aria-label": title, tabindex: "0" });
    const why = h("p", { class: "hint", role: "status" });
    let here = null;
    let at = 0;
    const choose = button(agree, null, () => {
      if (here && (here.capabilities & CAN.write)) {
        close(here);
      }
    }, { text: true, kind: "primary" });

    async function go(identifier) {
      here = await itemOf(identifier);
      const folders = (await foldersIn(identifier))
        .filter((folder) => !without.has(folder.itemIdentifier))
        .sort((a, b) => (naturalKey(a.filename) < naturalKey(b.filename) ? -1 : 1));
      const isTop = identifier === ROOT || here.isContainer;
      path.replaceChildren(
        button(t("previous"), "up", () => go(here.parentItemIdentifier),
               { kind: "quiet", disabled: identifier === ROOT }),
        h("strong", {}, h("bdi", {}, isTop && identifier === ROOT ? t("documents")
          : shownName(here.filename))));
      list.replaceChildren(...folders.map((folder, index) => {
        const line = h("div", { role: "option", id: `chooser-${index}`, class: "chooser-item",
                                "aria-selected": "false",
                                onclick: () => go(folder.itemIdentifier) },
          icon(kindOf(folder).icon), h("bdi", {}, shownName(folder.filename)), icon("chevron"));
        line.identifier = folder.itemIdentifier;
        return line;
      }));
      if (folders.length === 0) {
        list.append(h("div", { role: "option", class: "hint", "aria-disabled": "true",
                               "aria-selected": "false" }, t("noFolders")));
      }
      mark(0);
      const isRefused = (here.capabilities & CAN.write) === 0;
      choose.setAttribute("aria-disabled", isRefused);
      why.textContent = isRefused ? t(identifier === ROOT ? "refusedTop" : "refusedHere") : "";
    }
    function mark(index) {
      const lines = [...list.querySelectorAll(".chooser-item")];
      at = Math.max(0, Math.min(index, lines.length - 1));
      lines.forEach((line, i) => line.setAttribute("aria-selected", i === at));
      if (lines[at]) {
        list.setAttribute("aria-activedescendant", lines[at].id);
        lines[at].scrollIntoView({ block: "nearest" });
      } else {
        list.removeAttribute("aria-activedescendant");
      }
    }
    list.addEventListener("keydown", (event) => {
      const lines = [...list.querySelectorAll(".chooser-item")];
      if (event.key === "ArrowDown" || event.key === "ArrowUp") {
        mark(at + (event.key === "ArrowDown" ? 1 : -1));
      } else if ((event.key === "Enter" || event.key === "ArrowRight") && lines[at]) {
        go(lines[at].identifier);
      } else if ((event.key === "Backspace" || event.key === "ArrowLeft") &&
                 here?.itemIdentifier !== ROOT) {
        go(here.parentItemIdentifier);
      } else {
        return;
      }
      event.preventDefault();
    });
    go(start).then(() => list.focus());
    return [path, list, why,
            buttons(button(t("cancel"), null, () => close(null), { text: true }), choose)];
  }, { wide: true });
}
