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
  await home.write("Garden/Planting.pdf", "%PDF-1.4\n", at(14));
  await home.write("Garden/Archive/2024.zip", "PK", at(1));
  await home.write("Garden/Letters/To the council.odt", "x".repeat(18400), at(1));
  await home.write("Garden/Recording of the owl.flac", "f".repeat(420000), at(15));
  await home.write("Work/Invoice 2026-04.pdf", "x".repeat(81000), at(4));
  await home.write("Work/Budget.xlsx", "x".repeat(23500), at(6));
  await home.write("Work/Talk/Slides.odp", "x".repeat(2300000), at(6));
  await home.write("Travel/Tickets.pdf", "x".repeat(54000), at(17));
  await home.write("Recipes/Plum cake.txt", "Plums, flour, butter.\n", at(2));
  await home.write("Shopping list.txt", "milk\nbread\n", at(18));
  await home.write("House keys.jpg", sunset(), at(5));
  await home.write("Lease.pdf", "x".repeat(160000), at(7));
}
