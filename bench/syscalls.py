#!/usr/bin/python3
"""System calls of the xtokline reader at saturation, counted by strace:
how many bytes one read(2) of the terminal brings, and how often the
threads meet in the kernel (futex) per token. strace slows the reader, so
the run's other figures are not used.

    syscalls.py --build DIR --out FILE [--tokens 500000]
"""
import argparse
import json
import os
import re
import tempfile

import driver


def main():
    ap = argparse.ArgumentParser()
    ap.add_argument("--build", required=True)
    ap.add_argument("--out", required=True)
    ap.add_argument("--tokens", type=int, default=500000)
    args = ap.parse_args()

    with tempfile.TemporaryDirectory() as tmp:
        summary = os.path.join(tmp, "strace.txt")
        command = ["strace", "-f", "-c", "--seccomp-bpf", "-e", "trace=read,poll,futex",
                   "-o", summary] + driver.readers(args.build)["xtokline"]
        driver.WORKLOADS["strace"] = (["saturation", str(args.tokens)], 120)
        result = driver.one_run("xtokline", command, "strace", args.build)
        calls = {}
        with open(summary) as f:
            for line in f:
                m = re.match(r"\s*[\d.]+\s+[\d.]+\s+\d+\s+(\d+)\s+(?:\d+\s+)?(\w+)\s*$", line)
                if m:
                    calls[m.group(2)] = int(m.group(1))
    figures = {"tokens": result["tokens"], "bytes": result["bytes"],
               "read": calls.get("read", 0), "poll": calls.get("poll", 0),
               "futex": calls.get("futex", 0)}
    with open(args.out, "w") as f:
        json.dump(figures, f)
    print(json.dumps(figures))


if __name__ == "__main__":
    main()
