#!/usr/bin/python3
"""pySerial peers of the receive benchmark, Debian's python3-serial.

    pyserial_reader.py loop DEVICE COUNT     a loop reading `in_waiting or 1`
                                             bytes and splitting on 0x03
    pyserial_reader.py framed DEVICE COUNT   serial.threaded.ReaderThread with
                                             a FramedPacket (START 0x02, STOP 0x03)

Prints "ready" once the port is open, then one JSON line with the result, in
the form of bench/token_check.h.
"""
import json
import resource
import sys
import threading
import time

import serial
import serial.threaded

MASK = (1 << 48) - 1
IDLE_S = 1.0


def cpu_seconds():
    usage = resource.getrusage(resource.RUSAGE_SELF)
    return usage.ru_utime + usage.ru_stime


class Check:
    """What the application does with each token; as bench/token_check.h."""

    def __init__(self, count):
        self.count = count
        self.expected = 0
        self.received = 0
        self.lost = 0
        self.malformed = 0
        self.latencies = []
        self.started = False
        self.done = threading.Event()
        self.start_ns = self.end_ns = self.last_ns = 0
        self.start_cpu = self.end_cpu = 0.0

    def first_data(self):
        if not self.started:
            self.started = True
            self.start_ns = time.monotonic_ns()
            self.start_cpu = cpu_seconds()

    def token(self, payload, now):
        if len(payload) != 20:
            self.malformed += 1
            return
        try:
            sequence = int(payload[:8], 16)
            stamp = int(payload[8:], 16)
        except ValueError:
            self.malformed += 1
            return
        if sequence < self.expected:
            self.malformed += 1
            return
        self.lost += sequence - self.expected
        self.expected = sequence + 1
        self.received += 1
        self.last_ns = now
        self.latencies.append(((now & MASK) - stamp) & MASK)
        if self.expected >= self.count:
            self.finish()

    def finish(self):
        if self.done.is_set():
            return
        self.end_ns = time.monotonic_ns()
        self.end_cpu = cpu_seconds()
        if self.expected < self.count:
            self.lost += self.count - self.expected
        self.done.set()

    def gave_up(self):
        if not self.done.is_set():
            self.finish()
            self.end_ns = self.last_ns or self.end_ns

    def json(self, reader):
        lat = sorted(self.latencies)

        def pct(p):
            if not lat:
                return 0
            return lat[min(int(p * (len(lat) - 1) + 0.5), len(lat) - 1)]

        return json.dumps({
            "reader": reader, "tokens": self.received, "lost": self.lost,
            "malformed": self.malformed, "bytes": self.received * 22,
            "seconds": (self.end_ns - self.start_ns) / 1e9,
            "cpu": self.end_cpu - self.start_cpu,
            "lat_p50_ns": pct(0.50), "lat_p99_ns": pct(0.99),
            "lat_max_ns": lat[-1] if lat else 0})


def run_loop(device, check):
    port = serial.Serial(device, 115200, timeout=IDLE_S)
    print("ready", flush=True)
    rest = b""
    while not check.done.is_set():
        data = port.read(port.in_waiting or 1)
        if not data:
            if check.started:
                check.gave_up()
            continue
        now = time.monotonic_ns()
        check.first_data()
        pieces = (rest + data).split(b"\x03")
        rest = pieces.pop()
        for piece in pieces:
            start = piece.rfind(b"\x02")
            if start < 0:
                check.malformed += 1
                continue
            check.token(piece[start + 1:], now)
            if check.done.is_set():
                break
    port.close()
    return "pyserial-loop"


def run_framed(device, check):
    class Framed(serial.threaded.FramedPacket):
        START = b"\x02"
        STOP = b"\x03"

        def data_received(self, data):
            self.now = time.monotonic_ns()
            check.first_data()
            super().data_received(data)

        def handle_packet(self, packet):
            check.token(packet, self.now)

    port = serial.Serial(device, 115200, timeout=IDLE_S)
    last = [0, 0]  # tokens seen at the last look, and when
    with serial.threaded.ReaderThread(port, Framed):
        print("ready", flush=True)
        while not check.done.wait(0.1):
            if check.started and check.received == last[0]:
                if time.monotonic() - last[1] > IDLE_S:
                    check.gave_up()
            else:
                last = [check.received, time.monotonic()]
    return "pyserial-framed"


def main():
    mode, device, count = sys.argv[1], sys.argv[2], int(sys.argv[3])
    check = Check(count)
    name = {"loop": run_loop, "framed": run_framed}[mode](device, check)
    print(check.json(name), flush=True)


if __name__ == "__main__":
    main()
