// Node.js peer of the receive benchmark: serialport 13 with
// @serialport/parser-delimiter splitting on 0x03.
//
//   node node_reader.js DEVICE COUNT
//
// Prints "ready" once the port is open, then one JSON line with the result,
// in the form of bench/token_check.h.
'use strict';

const path = require('path');
const modules = path.join(__dirname, '..', 'node', 'node_modules');
const { SerialPort } = require(path.join(modules, 'serialport'));
const { DelimiterParser } = require(path.join(modules, '@serialport', 'parser-delimiter'));

const MASK = (1n << 48n) - 1n;
const IDLE_MS = 1000;

const device = process.argv[2];
const count = Number(process.argv[3]);

function cpuSeconds() {
  const u = process.cpuUsage();
  return (u.user + u.system) / 1e6;
}

function nowNs() {
  return process.hrtime.bigint();
}

const check = {
  expected: 0, received: 0, lost: 0, malformed: 0,
  latencies: new Float64Array(count), started: false, done: false,
  startNs: 0n, endNs: 0n, lastNs: 0n, startCpu: 0, endCpu: 0,
};

function firstData() {
  if (!check.started) {
    check.started = true;
    check.startNs = nowNs();
    check.startCpu = cpuSeconds();
  }
}

function finish(gaveUp) {
  if (check.done) return;
  check.done = true;
  // Given up: the time window ends at the last token, the CPU window now.
  check.endNs = gaveUp && check.lastNs ? check.lastNs : nowNs();
  check.endCpu = cpuSeconds();
  if (check.expected < count) check.lost += count - check.expected;
  report();
}

function report() {
  const lat = check.latencies.subarray(0, check.received).sort();
  const pct = (p) => (lat.length ? lat[Math.min(Math.round(p * (lat.length - 1)), lat.length - 1)] : 0);
  console.log(JSON.stringify({
    reader: 'node-serialport', tokens: check.received, lost: check.lost,
    malformed: check.malformed, bytes: check.received * 22,
    seconds: Number(check.endNs - check.startNs) / 1e9, cpu: check.endCpu - check.startCpu,
    lat_p50_ns: pct(0.5), lat_p99_ns: pct(0.99), lat_max_ns: lat.length ? lat[lat.length - 1] : 0,
  }));
  port.close(() => process.exit(0));
  setTimeout(() => process.exit(0), 500);
}

let now = 0n;
let now48 = 0;

function token(frame) {
  // The parser hands over everything before the 0x03: STX and the payload.
  const start = frame.lastIndexOf(2);
  if (start < 0) { check.malformed++; return; }
  const payload = frame.toString('latin1', start + 1);
  if (!/^[0-9a-fA-F]{20}$/.test(payload)) { check.malformed++; return; }
  const sequence = parseInt(payload.slice(0, 8), 16);
  const stamp = parseInt(payload.slice(8), 16);
  if (sequence < check.expected) { check.malformed++; return; }
  check.lost += sequence - check.expected;
  check.expected = sequence + 1;
  check.latencies[check.received++] = (now48 - stamp + 2 ** 48) % 2 ** 48;
  check.lastNs = now;
  if (check.expected >= count) finish(false);
}

const port = new SerialPort({ path: device, baudRate: 115200 });
// Before the parser's pipe, so that the time is taken before its tokens.
port.on('data', () => {
  now = nowNs();
  now48 = Number(now & MASK);
  firstData();
});
const parser = port.pipe(new DelimiterParser({ delimiter: Buffer.from([3]) }));
parser.on('data', (frame) => { if (!check.done) token(frame); });
port.on('open', () => console.log('ready'));
port.on('error', (e) => { console.error('node_reader:', e.message); process.exit(1); });

let lastSeen = -1;
let lastChange = Date.now();
setInterval(() => {
  if (check.done || !check.started) return;
  if (check.received !== lastSeen) {
    lastSeen = check.received;
    lastChange = Date.now();
  } else if (Date.now() - lastChange > IDLE_MS) {
    finish(true);
  }
}, 100);
