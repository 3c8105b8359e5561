// How many pixels a picture has, from the bytes that it begins with. A file of some kilobytes can
// claim to be gigabytes of pixels, so the size is looked at before anything is decoded.

function text(bytes, at, length) {
  return String.fromCharCode(...bytes.subarray(at, at + length));
}

function ofJPEG(view) {
  for (let at = 2; at + 9 < view.byteLength;) {
    if (view.getUint8(at) !== 0xff) {
      return null;
    }
    const kind = view.getUint8(at + 1);
    if (kind === 0xff) {
      at += 1;
    } else if (kind >= 0xc0 && kind <= 0xcf && ![0xc4, 0xc8, 0xcc].includes(kind)) {
      return { width: view.getUint16(at + 7), height: view.getUint16(at + 5) };
    } else {
      at += 2 + view.getUint16(at + 2);
    }
  }
  return null;
}

function ofWebP(bytes, view) {
  switch (text(bytes, 12, 4)) {
    case "VP8 ": return { width: view.getUint16(26, true) & 0x3fff,
                          height: view.getUint16(28, true) & 0x3fff };
    case "VP8L": {
      const bits = view.getUint32(21, true);
      return { width: (bits & 0x3fff) + 1, height: ((bits >>> 14) & 0x3fff) + 1 };
    }
    case "VP8X": return { width: (view.getUint32(23, true) >>> 8) + 1,
                          height: (view.getUint32(26, true) >>> 8) + 1 };
    default: return null;
  }
}

// The largest of the images in it.
function ofAVIF(bytes, view) {
  let size = null;
  const end = Math.min(bytes.length - 20, 64 * 1024);
  for (let at = 0; at < end; ++at) {
    if (bytes[at] === 0x69 && text(bytes, at, 4) === "ispe") {
      const [width, height] = [view.getUint32(at + 8), view.getUint32(at + 12)];
      if (size === null || width * height > size.width * size.height) {
        size = { width, height };
      }
    }
  }
  return size;
}

// {width, height}, or null where that can't be told.
export function pictureSize(bytes) {
  if (bytes.length < 30) {
    return null;
  }
  const view = new DataView(bytes.buffer, bytes.byteOffset, bytes.byteLength);
  if (text(bytes, 1, 3) === "PNG") {
    return { width: view.getUint32(16), height: view.getUint32(20) };
  }
  if (text(bytes, 0, 3) === "GIF") {
    return { width: view.getUint16(6, true), height: view.getUint16(8, true) };
  }
  if (bytes[0] === 0xff && bytes[1] === 0xd8) {
    return ofJPEG(view);
  }
  if (text(bytes, 0, 2) === "BM") {
    return { width: Math.abs(view.getInt32(18, true)), height: Math.abs(view.getInt32(22, true)) };
  }
  if (text(bytes, 0, 4) === "RIFF" && text(bytes, 8, 4) === "WEBP") {
    return ofWebP(bytes, view);
  }
  return text(bytes, 4, 4) === "ftyp" ? ofAVIF(bytes, view) : null;
}
