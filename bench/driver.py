#!/usr/bin/python3
"""Runs the receive benchmark's line runs: every reader on both workloads,
three rounds, the readers' order rotated from round to round so that drift
of the machine falls on all of them alike. Writes every run's result as one
JSON object per line.

    driver.py --build DIR --out FILE [--rounds 3] [--readers a,b,...]
"""
import argparse
import json
import os
import queue
import subprocess
import sys
import threading
import time

HERE = os.path.dirname(os.path.abspath(__file__))
PYTHON = "/usr/bin/python3"  # Debian's, where python3-serial is
GEN_NICE = 10
# Readers that run on some workloads only.
ONLY = {}

WORKLOADS = {
    # name: (generator arguments, seconds the reader may take at most)
    "saturation": (["saturation", "2000000"], 180),
    "linerate": (["linerate", "10"], 40),
}


def readers(build):
    reader = os.path.join(build, "bench", "xtok_reader")
    plugin = os.path.join(build, "libxtok.so")
    peers = os.path.join(HERE, "peers")
    return {
        # A runtime's 1 ms scan cycle.
        "xtokline": [reader, plugin, "{device}", "{count}"],
        "pyserial-loop": [PYTHON, os.path.join(peers, "pyserial_reader.py"), "loop",
                          "{device}", "{count}"],
        "pyserial-framed": [PYTHON, os.path.join(peers, "pyserial_reader.py"), "framed",
                            "{device}", "{count}"],
        "node-serialport": ["node", os.path.join(peers, "node_reader.js"), "{device}", "{count}"],
    }


def lines_of(stream):
    """A queue that receives the stream's lines, then None at its end."""
    q = queue.Queue()

    def pump():
        for line in stream:
            q.put(line.rstrip("\n"))
        q.put(None)

    threading.Thread(target=pump, daemon=True).start()
    return q


def next_line(q, timeout, what):
    try:
        line = q.get(timeout=timeout)
    except queue.Empty:
        raise RuntimeError(f"{what}: nothing within {timeout} s")
    if line is None:
        raise RuntimeError(f"{what}: ended early")
    return line


def one_run(name, command, workload, build):
    gen_args, limit = WORKLOADS[workload]
    # The device is not under test: at a lower priority, it takes what the
    # reader leaves of the two processors rather than preempting it.
    gen = subprocess.Popen(["nice", "-n", str(GEN_NICE), os.path.join(build, "bench", "xtok_gen")]
                           + gen_args, stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True)
    reader = None
    try:
        gen_out = lines_of(gen.stdout)
        device, count = next_line(gen_out, 10, "generator").split()
        argv = [a.format(device=device, count=count) for a in command]
        reader = subprocess.Popen(argv, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                  text=True)
        reader_out = lines_of(reader.stdout)
        ready = next_line(reader_out, 20, name)
        if ready != "ready":
            raise RuntimeError(f"{name}: said {ready!r} instead of ready")
        time.sleep(0.3)  # the reader settles into its wait
        gen.stdin.write("go\n")
        gen.stdin.flush()
        written = json.loads(next_line(gen_out, limit, "generator"))
        result = json.loads(next_line(reader_out, limit, name))
        result.update(reader=name, workload=workload, written=written["tokens"],
                      gen_seconds=written["seconds"])
        return result
    finally:
        if reader and reader.poll() is None:
            try:
                reader.wait(timeout=5)
            except subprocess.TimeoutExpired:
                reader.kill()
                reader.wait()
        if reader and reader.returncode not in (0, None):
            sys.stderr.write(reader.stderr.read())
        try:
            gen.stdin.close()
        except OSError:
            pass
        try:
            gen.wait(timeout=5)
        except subprocess.TimeoutExpired:
            gen.kill()
            gen.wait()


def load_average():
    with open("/proc/loadavg") as f:
        return float(f.read().split()[0])


def main():
    ap = argparse.ArgumentParser()
    ap.add_argument("--build", required=True)
    ap.add_argument("--out", required=True)
    ap.add_argument("--rounds", type=int, default=3)
    ap.add_argument("--readers", default="")
    ap.add_argument("--workloads", default="saturation,linerate")
    args = ap.parse_args()

    all_readers = readers(args.build)
    names = [n for n in (args.readers.split(",") if args.readers else all_readers)]
    workloads = args.workloads.split(",")
    with open(args.out, "w") as out:
        for rnd in range(args.rounds):
            for workload in workloads:
                order = names[rnd % len(names):] + names[:rnd % len(names)]
                for name in order:
                    if workload not in ONLY.get(name, (workload,)):
                        continue
                    started = time.monotonic()
                    load = load_average()
                    try:
                        result = one_run(name, all_readers[name], workload, args.build)
                    except Exception as e:  # one failed run must not end the others
                        result = {"reader": name, "workload": workload, "error": str(e)}
                    result.update(round=rnd + 1, load_before=load)
                    out.write(json.dumps(result) + "\n")
                    out.flush()
                    took = time.monotonic() - started
                    status = result.get("error") or (
                        f"{result['tokens']} tokens, {result['cpu']:.3f} CPU s, "
                        f"p99 {result['lat_p99_ns'] / 1000:.0f} us")
                    print(f"round {rnd + 1} {workload:10} {name:16} {took:5.1f} s  {status}",
                          flush=True)


if __name__ == "__main__":
    main()
