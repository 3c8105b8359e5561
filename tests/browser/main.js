// node main.js [PART-OF-A-NAME]: passes the tests of the document browser.

import { runAll } from "./suite.js";

import "./browse.js";
import "./security.js";
import "./places.js";
import "./actions.js";
import "./archives.js";
import "./pictures.js";
import "./uploads.js";
import "./live.js";
import "./keyboard.js";
import "./looks.js";

process.exitCode = await runAll(process.argv[2] ?? "") ? 0 : 1;
