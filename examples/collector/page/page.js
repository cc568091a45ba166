'use strict';
// Everything that comes from a document is hostile: it reaches the page through textContent alone.
const mostKept = 500;        // arrivals, as many as the collector keeps
const page = 50;             // arrivals, and events of one, that are drawn at a time
const byId = id => document.getElementById(id);
const arrivals = [];         // the latest first
const counts = { events: 0, documents: 0, duplicates: 0, refused: 0 };
const seconds = new Map();   // events by the second of their arrival
const sessions = new Map();
let drawn = page, drawing = false, announced = 0, run = null, lastID = null;

function element(name, text, className) {
  const made = document.createElement(name);
  if (text !== undefined) made.textContent = text;
  if (className) made.className = className;
  return made;
}
function svgElement(name, attributes) {
  const made = document.createElementNS('http://www.w3.org/2000/svg', name);
  for (const [key, value] of Object.entries(attributes)) made.setAttribute(key, value);
  return made;
}
const plain = value => value !== null && typeof value === 'object';
// Characters that turn or hide text are shown as what they are.
const visible = text => text.replace(/[\u200b-\u200f\u202a-\u202e\u2060-\u2069\ufeff]/g,
  c => '\\u' + c.charCodeAt(0).toString(16));

// Numbers stand as they came, where the browser can tell: 9007199254740993, 3.0.
const parse = text => JSON.parse(text, !JSON.rawJSON ? undefined : (key, value, context) =>
  typeof value === 'number' && context.source !== String(value) ? JSON.rawJSON(context.source) : value);

function identityOf(event) {
  return Object.values(event.data).find(value => plain(value) && 'eventPath' in value) || {};
}
function eventsOf(message) { return message.document ? message.document.data.events : []; }

function take(message) {
  if (message.kind === 'refusal') ++counts.refused;
  else {
    if (message.isDuplicate) ++counts.duplicates; else ++counts.documents;
    counts.events += message.newEvents;
    const second = Math.floor(message.time / 1000);
    seconds.set(second, (seconds.get(second) || 0) + message.newEvents);
    if (seconds.size > 600) seconds.delete(seconds.keys().next().value);
    if (!message.isDuplicate) takeIntoSession(message);
  }
  arrivals.unshift(message);
  if (arrivals.length > mostKept) arrivals.pop();
  schedule();
}
function takeIntoSession(message) {
  if (!message.document) return;
  const id = message.document.data.session.sessionID;
  const session = sessions.get(id) || { lanes: new Map(), events: 0 };
  sessions.set(id, session);
  if (sessions.size > mostKept) sessions.delete(sessions.keys().next().value);
  for (const event of eventsOf(message)) {
    const identity = identityOf(event);
    const path = String(identity.eventPath || 'no path');
    ++session.events;
    if (!session.lanes.has(path) && session.lanes.size >= 20) continue;
    const times = session.lanes.get(path) || [];
    session.lanes.set(path, times);
    times.push(Number(identity.eventTimestamp) || message.time);
    if (times.length > 500) times.shift();
  }
}

function schedule() {
  if (drawing) return;
  drawing = true;
  setTimeout(() => { drawing = false; draw(); }, 250);
}
const matches = (message, words) => !words || (message.text ||= JSON.stringify(message).toLowerCase()).includes(words);

function describeEvent(event) {
  const details = element('details');
  details.append(element('summary', visible(String(event.metadata.name)).slice(0, 200)));
  details.addEventListener('toggle', () => {
    if (details.open && details.childElementCount === 1)
      details.append(element('pre', visible(JSON.stringify(event, null, 2))));
  });
  return details;
}
function describe(message, words) {
  const item = element('li');
  const time = new Date(message.time).toLocaleTimeString();
  if (message.kind === 'refusal') {
    item.append(element('h3', `${time} refused with ${message.status}`, 'bad'),
      element('p', visible(message.reason)));
    return item;
  }
  item.append(element('h3', `${time} ${message.isDuplicate ? 'duplicate document' : 'document'} ${message.identifier}`));
  item.append(element('p', `${message.newEvents} new events, ${message.duplicateEvents} duplicate; gzip, ` +
    `${message.bytes} bytes of ${message.unpackedBytes}`, 'facts'));
  item.append(element('p', message.signature === 'verified' ? 'Signature verified' : 'Signature not checked: no key',
    message.signature === 'verified' ? 'good' : 'facts'));
  if (!message.document) item.append(element('p', `${message.events} events, too large to show here`));
  const found = eventsOf(message).filter(e => !words || JSON.stringify(e).toLowerCase().includes(words));
  let shown = 0;
  const more = element('button', 'Show more events');
  more.type = 'button';
  const add = () => {
    for (const event of found.slice(shown, shown + page)) more.before(describeEvent(event));
    shown += page;
    more.hidden = shown >= found.length;
  };
  item.append(more);
  add();
  more.addEventListener('click', add);
  return item;
}

let nodes = new Map(), drawnFor = '';
function draw() {
  const words = byId('search').value.trim().toLowerCase();
  if (words !== drawnFor) nodes = new Map();
  drawnFor = words;
  const found = arrivals.filter(message => matches(message, words));
  const next = new Map();
  // What is drawn already stays where it is, with its folds and the focus.
  let place = byId('arrivals').firstChild;
  for (const message of found.slice(0, drawn)) {
    const node = nodes.get(message) || describe(message, words);
    next.set(message, node);
    if (node === place) place = place.nextSibling; else byId('arrivals').insertBefore(node, place);
  }
  const kept = new Set(next.values());
  for (const node of [...byId('arrivals').children]) if (!kept.has(node)) node.remove();
  nodes = next;
  byId('more').hidden = found.length <= drawn;
  byId('empty').hidden = arrivals.length > 0;
  for (const [name, count] of Object.entries(counts)) byId('count-' + name).textContent = count;
  drawSessions();
  drawRate();
  announce();
}
function drawSessions() {
  const items = [...sessions].slice(-20).reverse().map(([id, session]) => {
    const item = element('li');
    item.append(element('h3', `Session ${visible(id).slice(0, 100)}: ${session.events} events`));
    for (const [path, times] of session.lanes) {
      const first = times.reduce((a, b) => Math.min(a, b)), last = times.reduce((a, b) => Math.max(a, b));
      item.append(element('p', `${visible(path).slice(0, 200)}: ${times.length} events in ${last - first} ms`, 'facts'));
      const lane = svgElement('svg', { class: 'lane', viewBox: '0 0 1000 10', preserveAspectRatio: 'none', 'aria-hidden': 'true' });
      for (const x of new Set(times.map(t => Math.round((t - first) / Math.max(1, last - first) * 199) * 5)))
        lane.append(svgElement('rect', { x, y: 1, width: 3, height: 8 }));
      item.append(lane);
    }
    return item;
  });
  byId('sessions').replaceChildren(...items);
}
function drawRate() {
  const now = Math.floor(Date.now() / 1000);
  const bars = Array.from({ length: 60 }, (_, i) => seconds.get(now - 59 + i) || 0);
  const most = Math.max(1, ...bars);
  byId('rate').replaceChildren(...bars.map((n, i) =>
    svgElement('rect', { x: i * 2, width: 1.6, y: 30 - 30 * n / most, height: 30 * n / most })));
  byId('rate-text').textContent = `${bars.reduce((a, b) => a + b)} events in the last minute, at most ${Math.max(...bars)} in a second`;
}
function announce() {
  if (Date.now() - announced < 10000) return;
  announced = Date.now();
  byId('announcement').textContent = `${counts.events} events, ${counts.refused} uploads refused`;
}

function connect() {
  const source = new EventSource('/events');
  source.addEventListener('open', () => { byId('connection').textContent = 'Connected'; });
  source.addEventListener('hello', event => {
    const hello = JSON.parse(event.data);
    const before = run === hello.run ? lastID : 0;
    const missed = hello.behind - before;
    byId('bound').textContent = `Kept here: the latest ${hello.most}.` +
      (missed > 0 ? ` ${missed} earlier ones are not shown.` : '');
    run = hello.run;
    lastID = hello.behind;
  });
  source.addEventListener('message', event => {
    const number = Number(event.lastEventId.split('-')[1]);
    if (number <= lastID) return;
    lastID = number;
    take(parse(event.data));
  });
  source.addEventListener('error', () => {
    byId('connection').textContent = 'The collector is away; trying again';
    if (source.readyState === EventSource.CLOSED) setTimeout(connect, 2000);
  });
}

function setTheme(theme) {
  document.documentElement.dataset.theme = theme;
  byId('theme').textContent = theme === 'dark' ? 'Switch to light' : 'Switch to dark';
}
setTheme(matchMedia('(prefers-color-scheme: dark)').matches ? 'dark' : 'light');
byId('theme').addEventListener('click', () =>
  setTheme(document.documentElement.dataset.theme === 'dark' ? 'light' : 'dark'));
byId('search').addEventListener('input', () => { drawn = page; schedule(); });
byId('more').addEventListener('click', () => { drawn += page; draw(); });
byId('address').textContent = location.origin + '/events';
setInterval(drawRate, 1000);
connect();
