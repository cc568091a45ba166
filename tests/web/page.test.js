// The collector's page in a browser: what arrives is read on it, and what is hostile stays text.
//
//     node page.test.js COLLECTOR REPLAY ACCESS-LOG [SCREENSHOT]

import assert from 'node:assert/strict';
import { spawn } from 'node:child_process';
import { mkdtempSync, readFileSync, rmSync } from 'node:fs';
import http from 'node:http';
import { createRequire } from 'node:module';
import { tmpdir } from 'node:os';
import { join } from 'node:path';
import { gzipSync } from 'node:zlib';
import { launch } from 'puppeteer-core';

const [collectorProgram, replayProgram, accessLog, screenshot] = process.argv.slice(2);
const axeSource = readFileSync(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');
const work = mkdtempSync(join(tmpdir(), 'corvane-page-'));
const processes = new Set();

for (const signal of ['SIGINT', 'SIGTERM']) {
  process.on(signal, () => {
    for (const child of processes) child.kill('SIGKILL');
    rmSync(work, { recursive: true, force: true });
    process.exit(1);
  });
}

function run(program, ...options) {
  const child = spawn(program, options, { stdio: ['ignore', 'pipe', 'inherit'] });
  processes.add(child);
  child.ended = new Promise(resolve => child.on('exit', code => { processes.delete(child); resolve(code); }));
  return child;
}
async function startCollector(port) {
  const child = run(collectorProgram, '--port', String(port), '--directory', join(work, 'collected'));
  const line = await new Promise(resolve => child.stdout.once('data', data => resolve(String(data))));
  child.stdout.resume();
  return { child, url: line.trim().split('\n')[0] };
}
async function stop(child) {
  child.kill('SIGTERM');
  await child.ended;
}
function put(url, body, headers = {}) {
  return new Promise((resolve, reject) => {
    const request = http.request(url, {
      method: 'PUT',
      headers: {
        'Content-Type': 'application/vnd.veskar.corvane.user_events+json; version=0.1.0', 'Content-Encoding': 'gzip',
        'User-Agent': 'com.example.web/1.1', 'Content-Length': body.length, ...headers,
      },
    }, response => { response.resume(); response.on('end', () => resolve(response.statusCode)); });
    request.on('error', reject);
    request.end(body);
  });
}
const hostile = `<script>window.broken = 1</script><img src=x onerror="window.broken = 1">"'&\u202e${'x'.repeat(20000)}`;
const documentOf = (identifier, text) => gzipSync(JSON.stringify({
  metadata: { version: '0.1.0', identifier },
  data: {
    session: { sessionID: text },
    events: [{
      metadata: { name: text.slice(0, 60), version: '0.1.0' },
      data: { event: { eventID: identifier, eventTimestamp: 1, eventPath: text, sessionID: text }, word: { text, numbers: 'NUMBERS' } },
    }],
  },
}).replace('"NUMBERS"', '[9007199254740993,3.0]'));

let page;
const text = selector => page.$eval(selector, node => node.textContent);
const until = (what, ...values) => page.waitForFunction(what, { timeout: 30000, polling: 50 }, ...values);
const untilCount = (name, count) => until((id, least) => Number(document.getElementById(id).textContent) >= least,
  `count-${name}`, count);
const search = words => page.$eval('#search', (node, words) => {
  node.value = words;
  node.dispatchEvent(new Event('input'));
}, words);
async function checkAccessibility(theme) {
  await page.evaluate(axeSource);
  const { violations } = await page.evaluate(() => window.axe.run());
  assert.deepEqual(violations.map(v => `${v.id}: ${v.nodes.map(n => n.target).join(' ')}`), [], `in the ${theme} theme`);
}

const tests = {
  async 'a first visitor is told what to do'(url) {
    assert.match(await text('#empty'), /scripts\/demo --watch/);
    assert.equal(await text('#address'), url);
  },
  async 'what a program records is read, found and unfolded'(url) {
    assert.equal(await run(replayProgram, '--endpoint', url, '--documents', join(work, 'documents'), accessLog).ended, 0);
    await untilCount('events', 340);
    assert.equal(await text('#count-documents'), '7');
    await until(() => document.querySelectorAll('#arrivals > li').length === 7);
    await search('no such thing');
    await until(() => document.querySelectorAll('#arrivals > li').length === 0);
    await search('espresso');
    await until(() => document.querySelectorAll('#arrivals details').length === 1);
    await page.click('#arrivals summary');
    await until(() => /espresso/i.test(document.querySelector('#arrivals pre')?.textContent ?? ''));
    await search('');
    await until(() => document.querySelectorAll('#arrivals > li').length === 7);
    assert.match(await text('#sessions'), /\/root\/replay: /);
    assert.match(await text('#rate-text'), /340 events in the last minute/);
  },
  async 'a duplicate and a refusal are told apart, and hostile text stays text'(url) {
    const body = documentOf('00000000-0000-4000-8000-000000000001', hostile);
    assert.equal(await put(url, body), 200);
    assert.equal(await put(url, body), 200);
    assert.equal(await put(url, Buffer.from('no gzip')), 400);
    await untilCount('duplicates', 1);
    await untilCount('refused', 1);
    await until(() => /refused with 400/.test(document.querySelector('#arrivals').textContent));
    assert.match(await text('#arrivals'), /duplicate document 00000000-0000-4000-8000-000000000001/);
    await page.click('#arrivals summary');
    await until(() => /\\u202e/.test(document.querySelector('#arrivals pre')?.textContent ?? ''));
    assert.match(await text('#arrivals pre'), /9007199254740993,\s+3\.0/);
    assert.equal(await page.evaluate(() => window.broken), undefined);
    assert.equal(await page.$('#arrivals img, #arrivals script, #sessions img'), null);
  },
  async 'it is used by keyboard, on a telephone, in both themes'() {
    await page.setViewport({ width: 360, height: 740 });
    const isWide = () => document.documentElement.scrollWidth > innerWidth;
    assert.equal(await page.evaluate(isWide), false);
    const themeOf = () => document.documentElement.dataset.theme;
    await page.evaluate(() => { document.activeElement.blur(); scrollTo(0, 0); });
    await page.focus('#theme');
    for (const theme of ['dark', 'light']) {
      if (await page.evaluate(themeOf) !== theme) await page.keyboard.press('Enter');
      assert.equal(await page.evaluate(themeOf), theme);
      await checkAccessibility(theme);
    }
    await page.keyboard.press('Tab');
    assert.equal(await page.evaluate(() => document.activeElement.id), 'search');
    await page.keyboard.press('Tab');
    assert.equal(await page.evaluate(() => document.activeElement.tagName), 'SUMMARY');
    const wasOpen = await page.evaluate(() => document.activeElement.parentElement.open);
    await page.keyboard.press('Enter');
    assert.equal(await page.evaluate(() => document.activeElement.parentElement.open), !wasOpen);
    await page.setViewport({ width: 1100, height: 900 });
  },
  async 'it comes back when the collector does, and shows what arrives then'(url) {
    await stop(collector.child);
    await until(() => /is away/.test(document.querySelector('#connection').textContent));
    collector = await startCollector(new URL(url).port);
    await until(() => document.querySelector('#connection').textContent === 'Connected');
    assert.equal(await put(url, documentOf('00000000-0000-4000-8000-000000000002', 'after the restart')), 200);
    await until(() => /after the restart/.test(document.querySelector('#arrivals').textContent));
  },
};

let collector, browser, failed = 0;
try {
  collector = await startCollector(0);
  // Its sandbox needs rights that a container does not give; it sees nothing but the page of the collector.
  browser = await launch({
    executablePath: '/usr/bin/chromium', args: ['--no-sandbox', '--disable-dev-shm-usage'], userDataDir: join(work, 'profile'),
  });
  page = await browser.newPage();
  const complaints = [];
  page.on('pageerror', error => complaints.push(String(error)));
  await page.setViewport({ width: 1100, height: 900 });
  await page.goto(new URL('/', collector.url));
  for (const [name, test] of Object.entries(tests)) {
    try {
      await test(collector.url);
      console.log(`passed: ${name}`);
    } catch (error) {
      ++failed;
      console.error(`FAILED: ${name}\n${error.stack}`);
    }
    if (screenshot && name.startsWith('what a program')) await page.screenshot({ path: screenshot });
  }
  if (complaints.length > 0) {
    ++failed;
    console.error(`FAILED: the page has thrown\n${complaints.join('\n')}`);
  }
} finally {
  await browser?.close();
  for (const child of processes) child.kill('SIGKILL');
  await Promise.all([...processes].map(child => child.ended));
  rmSync(work, { recursive: true, force: true, maxRetries: 5 });
}
process.exit(failed === 0 ? 0 : 1);
