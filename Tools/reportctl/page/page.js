// Fills the page of `reportctl page` from the data that the program has put into it. Every text of the data
// was written by another program: it goes into the page as text (textContent), never as markup.
"use strict";

const data = JSON.parse(document.getElementById("data").textContent);
const status = data.status;
const zone = Intl.DateTimeFormat().resolvedOptions().timeZone;
const number = new Intl.NumberFormat();
const QUARTER_HOUR_MS = 15 * 60 * 1000;

const byId = (id) => document.getElementById(id);
const size = (bytes) => {
    const units = ["bytes", "KiB", "MiB", "GiB"];
    let unit = 0;
    for (; bytes >= 1024 && unit < units.length - 1; ++unit)
        bytes /= 1024;
    return `${number.format(Math.round(bytes * 10) / 10)} ${units[unit]}`;
};
const orDash = (value) => (value === null || value === undefined ? "–" : String(value));
const colour = (name) => getComputedStyle(document.documentElement).getPropertyValue(name).trim();

function time(value) {
    if (value === null || value === undefined)
        return "–";
    return new Date(value).toLocaleString(undefined, { dateStyle: "medium", timeStyle: "medium" });
}

function element(name, text, className) {
    const made = document.createElement(name);
    if (text !== undefined)
        made.textContent = text;
    if (className)
        made.className = className;
    return made;
}

/** Makes a table with a caption. A column is styled as numbers when all of its cells are numbers. */
function table(caption, headings, rows) {
    const made = element("table");
    made.append(element("caption", caption));
    const head = element("tr");
    const isNumber = headings.map((_, column) =>
        rows.length > 0 && rows.every((row) => typeof row[column] === "number"));
    headings.forEach((heading, column) => {
        const cell = element("th", heading, isNumber[column] ? "number" : "");
        cell.scope = "col";
        head.append(cell);
    });
    made.append(element("thead"), element("tbody"));
    made.tHead.append(head);
    for (const row of rows) {
        const line = element("tr");
        row.forEach((cell, column) =>
            line.append(element("td", typeof cell === "number" ? number.format(cell) : orDash(cell),
                isNumber[column] ? "number" : "")));
        made.tBodies[0].append(line);
    }
    return made;
}

/** Makes a table of a few facts: each row has a name, which is its header, and what there is to say. */
function facts(caption, rows) {
    const made = element("table");
    made.append(element("caption", caption), element("tbody"));
    for (const [name, fact] of rows) {
        const line = element("tr");
        const head = element("th", name);
        head.scope = "row";
        line.append(head, element("td", orDash(fact)));
        made.tBodies[0].append(line);
    }
    return made;
}

// The sections whose numbers are open are kept in the address, so that they are open again after a reload. A
// page from a disk may store nothing.
const OPEN = "#open=";
const opened = location.hash.startsWith(OPEN) ? location.hash.slice(OPEN.length).split(",") : [];

function keepOpened() {
    const sections = [...document.querySelectorAll("section:has(details[open])")];
    location.replace(OPEN + sections.map((section) => section.id).join(","));
}

/** Adds the numbers of a chart as a table, for readers who cannot see the chart or want the exact numbers. */
function numbers(section, caption, headings, rows) {
    const details = element("details");
    details.append(element("summary", "The numbers"));
    const scroll = element("div", undefined, "scroll");
    scroll.append(table(caption, headings, rows));
    details.append(scroll);
    details.open = opened.includes(section);
    details.addEventListener("toggle", keepOpened);
    byId(section).append(details);
}

const charts = [];
const MOST_LETTERS = 24;
const short = (text) => (text.length > MOST_LETTERS ? text.slice(0, MOST_LETTERS - 1) + "…" : text);

/** Draws a chart into the section's canvas. When there is nothing to draw, the section says so. */
function chart(section, type, labels, datasets, options) {
    const holder = byId(section).querySelector(".chart");
    if (labels.length === 0) {
        holder.replaceWith(element("p", "Nothing yet.", "quiet"));
        return;
    }
    charts.push(new Chart(holder.querySelector("canvas"), {
        type,
        data: { labels, datasets },
        options: Object.assign({ responsive: true, maintainAspectRatio: false, animation: false }, options),
    }));
}

function applyColours() {
    Chart.defaults.color = colour("--ink");
    Chart.defaults.borderColor = colour("--line");
}

function bars(label, values, name) {
    return { label, data: values, backgroundColor: colour(name || "--accent"), maxBarThickness: 36 };
}

const WHOLE_NUMBERS = { ticks: { precision: 0 }, beginAtZero: true };

function showVerdict() {
    const verdict = byId("verdict");
    verdict.classList.add(status.verdict);
    verdict.querySelector("strong").textContent = status.verdict;
    const reasons = verdict.querySelector("ul");
    for (const reason of status.reasons)
        reasons.append(element("li", reason));
    if (status.reasons.length === 0)
        reasons.append(element("li", "Nothing to do."));
    const service = status.service;
    byId("service").append(facts("What it says of itself", [
        ["running", service.running ? `yes, process ${service.pid}` : "no"],
        ["since", time(service.startedAt)],
        ["version", orDash(service.version)],
        ["listening", service.listening ? "yes" : "no"],
        ["log plug-in", service.plugins.logger ? "there" : "missing"],
        ["store plug-in", service.plugins.store ? "there" : "missing"],
        ["analytics plug-in", service.plugins.sdk ? "there" : "missing"],
        ["last report", time(status.ledger && status.ledger.lastReceivedAt)],
        ["free disk", status.disk.freeBytes === null ? "–" : size(status.disk.freeBytes)],
    ]));
}

const OUTCOMES = [
    ["stored", "in the store"],
    ["toAnalytics", "to analytics"],
    ["control", "control messages"],
    ["otherControl", "other control messages"],
    ["empty", "empty datagrams"],
    ["waiting", "waiting now"],
    ["lostAtEnds", "lost when a process ended"],
    ["droppedByKernel", "dropped by the system before the service saw them"],
];

const REASONS = {
    notJson: "refused: no JSON",
    store: "refused: by the store",
    noStore: "refused: no store",
    moduleNotInit: "refused: module did not announce itself",
    eventIdWithoutBar: "refused: event id without a bar",
    valueNotJson: "refused: value is no JSON",
    analytics: "refused: by analytics",
    exception: "refused: an exception",
};

function showFlow() {
    if (!status.ledger) {
        byId("flow").append(element("p", "There is no ledger: the service has not counted yet.", "quiet"));
        return;
    }
    const total = status.ledger.total;
    const steps = [["received", total.received]];
    for (const [key, text] of OUTCOMES)
        steps.push([text, total[key]]);
    for (const [key, text] of Object.entries(REASONS))
        steps.push([text, total.refused[key]]);
    const most = Math.max(1, ...steps.map((step) => step[1]));
    const list = element("ol", undefined, "flow");
    steps.forEach(([text, count], index) => {
        if (index > 0 && count === 0)
            return;
        const item = element("li");
        const meter = element("meter");
        meter.max = most;
        meter.value = count;
        meter.setAttribute("aria-label", `${text}: ${count}`);
        item.append(element("span", index === 0 ? text : `→ ${text}`), meter,
            element("span", number.format(count), "number"));
        list.append(item);
    });
    byId("flow").append(list);
    byId("flow").append(element("p", status.ledger.balanced ? "Every report is accounted for."
        : "The numbers do not add up: see `reportctl status`.", "quiet"));
    numbers("flow", "The ledger since it was begun", ["what", "reports"], steps);
}

/** Sums the counts of quarter-hours by whole hours or days of the viewer's time zone. From the first one
 *  until now, no hour or day is left out, so that a time without reports can be seen. */
function collect(quarterHours, keyOf) {
    const key = (quarterHour) => keyOf(new Date(quarterHour * QUARTER_HOUR_MS));
    const sums = new Map();
    if (quarterHours.length > 0)
        for (let at = quarterHours[0][0]; at * QUARTER_HOUR_MS <= data.generatedAt; ++at)
            sums.set(key(at), 0);
    for (const [quarterHour, count] of quarterHours)
        sums.set(key(quarterHour), (sums.get(key(quarterHour)) || 0) + count);
    return [...sums.entries()];
}

/** The name of an hour. When summer time ends, two hours have one name; they are told apart by `offset`. */
const hourName = (date) => `${date.toLocaleDateString()} ${String(date.getHours()).padStart(2, "0")}:00`;
const offset = (date) => new Intl.DateTimeFormat("en", { timeZoneName: "shortOffset" })
    .formatToParts(date).find((part) => part.type === "timeZoneName").value;

/** Gives hours their names in place of the times at which they begin. */
function named(hours) {
    const names = hours.map(([at]) => hourName(new Date(at)));
    const isTwice = (name) => names.indexOf(name) !== names.lastIndexOf(name);
    return hours.map(([at, count], place) =>
        [isTwice(names[place]) ? `${names[place]} ${offset(new Date(at))}` : names[place], count]);
}

function showTimes() {
    const day = (date) => date.toLocaleDateString();
    const hour = (date) => date.getTime() - date.getMinutes() * 60 * 1000;
    const days = collect(data.quarterHours, day);
    const since = data.generatedAt - 48 * 3600 * 1000;
    const recent = data.quarterHours.filter(([quarterHour]) => quarterHour * QUARTER_HOUR_MS >= since);
    const hours = named(collect(recent, hour));
    const scales = { scales: { y: WHOLE_NUMBERS }, plugins: { legend: { display: false } } };
    chart("hours", "bar", hours.map((entry) => entry[0]),
        [bars("reports", hours.map((entry) => entry[1]))], scales);
    numbers("hours", `Reports by hour, ${zone}`, ["hour", "reports"], hours);
    chart("days", "bar", days.map((entry) => entry[0]),
        [bars("reports", days.map((entry) => entry[1]))], scales);
    numbers("days", `Reports by day, ${zone}`, ["day", "reports"], days);
    let sum = data.rowsBefore;
    const growth = days.map(([key, count]) => [key, (sum += count)]);
    chart("growth", "line", growth.map((entry) => entry[0]), [{
        label: "rows", data: growth.map((entry) => entry[1]), borderColor: colour("--accent"), pointRadius: 2,
    }], { scales: { y: { ticks: { precision: 0 } } }, plugins: { legend: { display: false } } });
    numbers("growth", "Rows of the store at the end of each day, by the time of the report", ["day", "rows"],
        growth);
}

function showTop(section, counts, noKey) {
    const rows = counts.map(({ key, count }) => [key === null ? noKey : key, count]);
    const horizontal = {
        indexAxis: "y", scales: { x: WHOLE_NUMBERS }, plugins: { legend: { display: false } },
    };
    chart(section, "bar", rows.map((row) => short(row[0])),
        [bars("reports", rows.map((row) => row[1]))], horizontal);
    numbers(section, "The most frequent first", ["which", "reports"], rows);
}

const REASON_COLOURS = [
    "#d55e00", "#0072b2", "#009e73", "#cc79a7", "#e69f00", "#56b4e9", "#999999", "#6a3d9a",
];

function showRefused() {
    const labels = data.refused.map((mark) => new Date(mark.at).toLocaleTimeString());
    const reasons = Object.keys(REASONS);
    chart("refused", "bar", labels, reasons.map((reason, index) => ({
        label: REASONS[reason].replace("refused: ", ""),
        data: data.refused.map((mark) => mark[reason]),
        backgroundColor: REASON_COLOURS[index],
        stack: "refused",
    })), { scales: { x: { stacked: true }, y: Object.assign({ stacked: true }, WHOLE_NUMBERS) } });
    numbers("refused", `Refused in the ten seconds before each time, ${zone}`, ["time", ...reasons],
        data.refused.map((mark, index) => [labels[index], ...reasons.map((reason) => mark[reason])]));
}

function showOutbox() {
    const outbox = status.outbox;
    const modules = outbox.present ? outbox.modules : [];
    chart("outbox", "bar", modules.map((module) => short(module.id)),
        [bars("waiting", modules.map((module) => module.waiting))],
        { indexAxis: "y", scales: { x: WHOLE_NUMBERS }, plugins: { legend: { display: false } } });
    byId("outbox").append(facts("The outbox as a whole", [
        ["collector", outbox.endpoint === null ? "none configured: events stay here" : outbox.endpoint],
        ["waiting", outbox.waiting], ["waiting, size", outbox.present ? size(outbox.waitingBytes) : "–"],
        ["delivered", outbox.delivered], ["refused by the collector", outbox.refused],
        ["dead letters", outbox.deadLetters], ["dropped", outbox.dropped],
        ["last failure", outbox.lastFailure],
    ].map(([what, value]) => [what, typeof value === "number" ? number.format(value) : orDash(value)])));
    numbers("outbox", "By module", ["module", "waiting", "last sequence"],
        modules.map((module) => [module.id, module.waiting, module.lastSequence]));
}

/** The newest line first. A list, because a table has no room for long texts on a phone. */
function showLog() {
    if (status.log.last.length === 0) {
        byId("log").append(element("p", "No warnings and no errors.", "quiet"));
        return;
    }
    const list = element("ol", undefined, "lines");
    for (const line of [...status.log.last].reverse()) {
        const item = element("li");
        const head = element("p");
        head.append(element("strong", line.level),
            element("span", ` ${time(line.time)}, ${line.site}`, "quiet"));
        item.append(head, element("p", line.text));
        list.append(item);
    }
    byId("log").append(list);
}

function keepFresh() {
    if (!data.reloadSeconds)
        return;
    let timer = 0;
    const button = byId("pause");
    const start = () => { timer = setTimeout(() => location.reload(), data.reloadSeconds * 1000); };
    button.hidden = false;
    button.addEventListener("click", () => {
        const isPaused = button.getAttribute("aria-pressed") === "true";
        button.setAttribute("aria-pressed", String(!isPaused));
        button.textContent = isPaused ? "Stop reloading" : "Go on reloading";
        if (isPaused)
            start();
        else
            clearTimeout(timer);
    });
    start();
}

byId("generated").textContent = `As of ${time(data.generatedAt)}. Times are those of ${zone}.`;
applyColours();
showVerdict();
showFlow();
showTimes();
showTop("events", data.events, "–");
showTop("modules", data.modules, "(no bar in the event id)");
showRefused();
showOutbox();
showLog();
keepFresh();
matchMedia("(prefers-color-scheme: dark)").addEventListener("change", () => location.reload());
document.documentElement.dataset.ready = "yes";
