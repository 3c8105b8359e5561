// A person's home folder in a temporary folder, and the program serving it.

import { spawn } from "node:child_process";
import { mkdir, mkdtemp, rm, utimes, writeFile } from "node:fs/promises";
import { tmpdir } from "node:os";
import { dirname, join } from "node:path";
import { createInterface } from "node:readline";

export const program = process.env.MARROWDALE_PROGRAM ??
  new URL("../../build/dev/bin/marrowdale", import.meta.url).pathname;

export class Home {
  static async make() {
    const home = new Home();
    home.path = await mkdtemp(join(tmpdir(), "marrowdale-browser-"));
    home.root = join(home.path, "Documents");
    await mkdir(home.root);
    return home;
  }

  document(name) {
    return join(this.root, name);
  }

  async write(name, content = "", date = null) {
    await mkdir(dirname(this.document(name)), { recursive: true });
    await writeFile(this.document(name), content);
    if (date) {
      await utimes(this.document(name), date, date);
    }
  }

  get environment() {
    return { HOME: this.path, PATH: `${join(this.path, "bin")}:${process.env.PATH}`,
             XDG_DATA_DIRS: "/usr/local/share:/usr/share" };
  }

  // A program of that name is found before those of the system.
  async installProgram(name, script) {
    await mkdir(join(this.path, "bin"), { recursive: true });
    await writeFile(join(this.path, "bin", name), script, { mode: 0o755 });
  }

  remove() {
    return rm(this.path, { recursive: true, force: true });
  }
}

// `marrowdale serve`, ready when `start` answers.
export class Service {
  static async start(home, options = ["--port", "0"], command = "serve", more = {}) {
    const service = new Service();
    service.home = home;
    service.child = spawn(program, ["--json", command, ...options], {
      env: { ...home.environment, ...more }, stdio: ["ignore", "pipe", "pipe"] });
    service.errors = "";
    service.child.stderr.on("data", (text) => { service.errors += text; });
    service.ended = new Promise((resolve) => service.child.on("exit", resolve));
    const lines = createInterface({ input: service.child.stdout });
    const [line] = await Promise.race([
      new Promise((resolve) => lines.once("line", (text) => resolve([text]))),
      service.ended.then((code) => { throw new Error(`ended with ${code}: ${service.errors}`); })]);
    service.address = JSON.parse(line).browser;
    service.origin = new URL(service.address).origin;
    return service;
  }

  pause() {
    this.child.kill("SIGSTOP");
  }

  goOn() {
    this.child.kill("SIGCONT");
  }

  async stop(signal = "SIGTERM") {
    this.child.kill(signal);
    return this.ended;
  }
}

// The program's answers to one command, in the home of a service.
export function run(home, ...args) {
  return runWith(home, {}, ...args);
}

// The same with more variables.
export function runWith(home, more, ...args) {
  return new Promise((resolve, reject) => {
    const child = spawn(program, ["--json", ...args],
                        { env: { ...home.environment, ...more }, cwd: home.root });
    let output = "";
    let errors = "";
    child.stdout.on("data", (text) => { output += text; });
    child.stderr.on("data", (text) => { errors += text; });
    child.on("exit", (code) => code === 0
      ? resolve(output.split("\n").filter(Boolean).map((line) => JSON.parse(line)))
      : reject(new Error(errors)));
  });
}
