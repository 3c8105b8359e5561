// The one stream of signals of a web browser: tells what it hears and whether it hears, and begins
// again when the connection was lost.

const SHORTEST_WAIT = 300;
const LONGEST_WAIT = 5000;

function wait(milliseconds) {
  return new Promise((resolve) => setTimeout(resolve, milliseconds));
}

// Calls `tell` with {state: "connected" | "lost" | "ended"} and {signal: CONTAINER}, until the
// session ends.
export async function follow(token, tell) {
  let pause = SHORTEST_WAIT;
  while (true) {
    try {
      const answer = await fetch("/v1/signals", { headers: { "Marrowdale-Session": token } });
      if (answer.status === 401) {
        tell({ state: "ended" });
        return;
      }
      if (answer.ok) {
        pause = SHORTEST_WAIT;
        await read(answer.body, tell);
      }
    } catch {
      // Told below, and tried again.
    }
    tell({ state: "lost" });
    await wait(pause);
    pause = Math.min(pause * 2, LONGEST_WAIT);
  }
}

async function read(body, tell) {
  const reader = body.pipeThrough(new TextDecoderStream()).getReader();
  let text = "";
  while (true) {
    const { done, value } = await reader.read();
    if (done) {
      return;
    }
    text += value;
    const pieces = text.split("\n\n");
    text = pieces.pop();
    for (const piece of pieces) {
      if (piece.startsWith("event: ready")) {
        tell({ state: "connected" });
      } else if (piece.startsWith("event: signal")) {
        tell(JSON.parse(piece.slice(piece.indexOf("data: ") + "data: ".length)));
      }
    }
  }
}
