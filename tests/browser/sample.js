// Documents as a person has them, for pictures and for tests of looks.

import { deflateSync, crc32 } from "node:zlib";

// A picture of colours that change from side to side, as PNG.
export function picture(width, height, paint) {
  const rows = Buffer.alloc((width * 3 + 1) * height);
  for (let y = 0; y < height; ++y) {
    for (let x = 0; x < width; ++x) {
      rows.set(paint(x / width, y / height), y * (width * 3 + 1) + 1 + x * 3);
    }
  }
  const chunk = (type, data) => {
    const body = Buffer.concat([Buffer.from(type), data]);
    const out = Buffer.alloc(body.length + 8);
    out.writeUInt32BE(data.length);
    body.copy(out, 4);
    out.writeUInt32BE(crc(body), body.length + 4);
    return out;
  };
  const head = Buffer.alloc(13);
  head.writeUInt32BE(width);
  head.writeUInt32BE(height, 4);
  head.set([8, 2, 0, 0, 0], 8);
  return Buffer.concat([Buffer.from("89504e470d0a1a0a", "hex"), chunk("IHDR", head),
                        chunk("IDAT", deflateSync(rows)), chunk("IEND", Buffer.alloc(0))]);
}

function crc(bytes) {
  if (crc32) {
    return crc32(bytes);
  }
  let value = 0xffffffff;
  for (const byte of bytes) {
    value ^= byte;
    for (let i = 0; i < 8; ++i) {
      value = (value >>> 1) ^ (0xedb88320 & -(value & 1));
    }
  }
  return (value ^ 0xffffffff) >>> 0;
}

export const sunset = () => picture(480, 320, (x, y) =>
  [250 - y * 90, 190 - y * 130 + x * 20, 120 + y * 60]);

// Hills, one behind the other, below a sky.
export const hills = () => picture(600, 400, (x, y) => {
  const line = (start, height, wave) => start + height * Math.sin(x * wave + start * 9);
  const depth = [[0.45, 0.05, 7], [0.58, 0.06, 5], [0.74, 0.05, 9]]
    .filter(([start, height, wave]) => y > line(start, height, wave)).length;
  return [[214 - y * 40, 228 - y * 30, 236], [150, 178, 168], [98, 138, 118], [52, 92, 74]][depth];
});

// A pond with rings on it, higher than wide.
export const pond = () => picture(300, 420, (x, y) => {
  const ring = Math.sin(Math.hypot((x - 0.4) * 3, (y - 0.6) * 4) * 14) * 18;
  return [40 + ring, 96 + y * 50 + ring, 120 + y * 60 + ring];
});

// A PDF of one page with a line on it.
export function print(line) {
  const content = `BT /F1 24 Tf 72 700 Td (${line}) Tj ET`;
  const objects = ["<</Type/Catalog/Pages 2 0 R>>", "<</Type/Pages/Kids[3 0 R]/Count 1>>",
    "<</Type/Page/Parent 2 0 R/MediaBox[0 0 595 842]/Contents 4 0 R" +
      "/Resources<</Font<</F1<</Type/Font/Subtype/Type1/BaseFont/Helvetica>>>>>>>>",
    `<</Length ${content.length}>>stream\n${content}\nendstream`];
  let text = "%PDF-1.4\n";
  const places = objects.map((object, index) => {
    const place = text.length;
    text += `${index + 1} 0 obj${object}endobj\n`;
    return String(place).padStart(10, "0") + " 00000 n \n";
  });
  const start = text.length;
  return text + `xref\n0 5\n0000000000 65535 f \n${places.join("")}` +
    `trailer<</Size 5/Root 1 0 R>>\nstartxref\n${start}\n%%EOF\n`;
}

const ICON = `<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 64 64">
<rect x="6" y="4" width="52" height="56" rx="8" fill="#e8a33d"/>
<path d="M18 22h28M18 32h28M18 42h18" stroke="#fff" stroke-width="5" stroke-linecap="round"/></svg>`;

// An application that shares its documents.
export async function installApplication(home, identifier = "org.example.Notes", name = "Notes") {
  const icon = `../.local/share/icons/${identifier}.svg`;
  await home.write(icon, ICON);
  await home.write(`../.local/share/applications/${identifier}.desktop`, "[Desktop Entry]\n" +
    `Type=Application\nName=${name}\nIcon=${home.document(icon)}\nX-KvSupportsDocumentBrowser=true\n`);
  const library = `../.var/app/${identifier}/Documents`;
  await home.write(`${library}/Ideas/First.txt`, "An idea.\n");
  return home.document(library);
}

const NOTES = `# Garden

Things to do before the frost:

- bring the lemon tree in
- cut the lavender back by a third
- order tulips: "Queen of Night", 40 of them
`;

export async function fillWithSamples(home) {
  const at = (day) => new Date(Date.UTC(2026, 9, day, 9, 12));
  await home.write("Garden/Plan for spring.md", NOTES, at(3));
  await home.write("Garden/Evening light.png", sunset(), at(12));
  await home.write("Garden/Seeds 2.csv", "name,count\nradish,40\n", at(8));
  await home.write("Garden/Seeds 10.csv", "name,count\nradish,40\nkale,12\n", at(9));
  await home.write("Garden/Hills.png", hills(), at(13));
  await home.write("Garden/Pond.png", pond(), at(13));
  await home.write("Garden/Planting.pdf", print("What to plant, and when"), at(14));
  await home.write("Garden/Archive/2024.zip", "PK", at(1));
  await home.write("Garden/Letters/To the council.odt", "x".repeat(18400), at(1));
  await home.write("Garden/Recording of the owl.flac", "f".repeat(420000), at(15));
  await home.write("Work/Invoice 2026-04.pdf", "x".repeat(81000), at(4));
  await home.write("Work/Budget.xlsx", "x".repeat(23500), at(6));
  await home.write("Work/Talk/Slides.odp", "x".repeat(2300000), at(6));
  await home.write("Travel/Tickets.pdf", "x".repeat(54000), at(17));
  await home.write("Recipes/Plum cake.txt", "Plums, flour, butter.\n", at(2));
  await home.write("Shopping list.txt", "milk\nbread\n", at(18));
  await home.write("Lake.png", hills(), at(5));
  await home.write("Lease.pdf", print("Lease"), at(7));
  await installApplication(home);
}
