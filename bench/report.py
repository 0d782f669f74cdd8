#!/usr/bin/python3
"""Turns the receive benchmark's results into the table, the goal check and
the chart.

    report.py --runs runs.jsonl [--micro micro.json] [--callgrind callgrind.json]
              [--syscalls syscalls.json] --out DIR [--docs docs/performance.md]

Writes DIR/table.md and DIR/performance.png; with --docs, also puts the
table between the bench markers of that file and the chart beside it.
"""
import argparse
import json
import os
import shutil
import statistics

OURS = "xtokline"
WORKLOAD_TITLES = {
    "saturation": "Saturation: 2,000,000 tokens as fast as the terminal takes them",
    "linerate": "Line rate: 10 s at 11,520 bytes/s (115200 baud 8N1), one token per write",
}


def load_runs(path):
    runs = []
    with open(path) as f:
        for line in f:
            line = line.strip()
            if line:
                runs.append(json.loads(line))
    return runs


def figures(run):
    """The figures of one run, in the table's units."""
    mb = run["bytes"] / 1e6
    seconds = run["seconds"] or float("nan")
    return {
        "tokens_s": run["tokens"] / seconds,
        "mb_s": mb / seconds,
        "cpu_mb": run["cpu"] / mb if mb else float("nan"),
        "core_pct": 100.0 * run["cpu"] / seconds,
        "lost": run["lost"],
        "malformed": run["malformed"],
        "p50_us": run["lat_p50_ns"] / 1000.0,
        "p99_us": run["lat_p99_ns"] / 1000.0,
    }


# column: (heading, better is "low" or "high", format)
COLUMNS = [
    ("tokens_s", "tokens/s", "high", "{:,.0f}"),
    ("mb_s", "MB/s", "high", "{:.1f}"),
    ("cpu_mb", "CPU s/MB", "low", "{:.4f}"),
    ("core_pct", "% of a core", "low", "{:.2f}"),
    ("lost", "lost", "low", "{:,.0f}"),
    ("malformed", "malformed", "low", "{:,.0f}"),
    ("p50_us", "latency p50 µs", "low", "{:,.0f}"),
    ("p99_us", "latency p99 µs", "low", "{:,.0f}"),
]


def summarise(runs):
    """{workload: {reader: {column: (median, min, max, n)}}}"""
    out = {}
    for run in runs:
        if "error" in run:
            continue
        f = figures(run)
        per = out.setdefault(run["workload"], {}).setdefault(run["reader"], {})
        for key, value in f.items():
            per.setdefault(key, []).append(value)
    for readers in out.values():
        for reader, cols in readers.items():
            readers[reader] = {k: (statistics.median(v), min(v), max(v), len(v))
                               for k, v in cols.items()}
    return out


def ours(reader):
    return reader.startswith(OURS)


def best_peer(readers, key, better):
    peers = {r: c[key][0] for r, c in readers.items() if not ours(r)}
    if not peers:
        return None, None
    pick = min if better == "low" else max
    name = pick(peers, key=peers.get)
    return name, peers[name]


def cell(stats, fmt):
    median, lo, hi, n = stats
    if n > 1 and lo != hi:
        return f"{fmt.format(median)} ({fmt.format(lo)}–{fmt.format(hi)})"
    return fmt.format(median)


def ratio_text(ours, peer, key):
    if peer is None:
        return "–"
    if peer == 0:
        return "=" if ours == 0 else "∞"
    return f"{ours / peer:.2f}×"


def table(summary, errors):
    lines = []
    for workload in ("saturation", "linerate"):
        readers = summary.get(workload)
        if not readers:
            continue
        lines.append(f"#### {WORKLOAD_TITLES[workload]}")
        lines.append("")
        lines.append("| reader | " + " | ".join(c[1] for c in COLUMNS) + " |")
        lines.append("|---" * (len(COLUMNS) + 1) + "|")
        order = sorted(r for r in readers if ours(r)) + sorted(r for r in readers if not ours(r))
        for reader in order:
            if reader not in readers:
                continue
            cols = readers[reader]
            name = f"**{reader}**" if ours(reader) else reader
            lines.append(f"| {name} | " +
                         " | ".join(cell(cols[k], fmt) for k, _, _, fmt in COLUMNS) + " |")
        if OURS in readers:
            ratios = []
            for key, _, better, _ in COLUMNS:
                peer, value = best_peer(readers, key, better)
                ratios.append(f"{ratio_text(readers[OURS][key][0], value, key)} ({peer})"
                              if peer else "–")
            lines.append("| ours ÷ best peer | " + " | ".join(ratios) + " |")
        lines.append("")
    lines.append("Medians of the rounds, with min–max in brackets. MB = 10⁶ bytes. "
                 "CPU is the reader's process (user + system, all threads) from its first "
                 "data to its last token. Latency: the reader's application sees the token, "
                 "less the generator's time stamp. \"Best peer\" is the best of the other "
                 "readers in that column.")
    if errors:
        lines.append("")
        lines.append("Runs that failed: " + "; ".join(
            f"{e['reader']} {e['workload']} round {e.get('round')}: {e['error']}" for e in errors))
    return "\n".join(lines)


def goals(summary, callgrind, syscalls):
    rows = []

    def add(goal, measured, met):
        rows.append(f"| {goal} | {measured} | {'met' if met else '**not met**'} |")

    sat = summary.get("saturation", {})
    if OURS in sat:
        o = sat[OURS]
        peer, cpu = best_peer(sat, "cpu_mb", "low")
        add(f"saturation: CPU s/MB ≤ half the best peer's ({peer} {cpu:.4f} → ≤ {cpu / 2:.4f})",
            f"{o['cpu_mb'][0]:.4f} ({o['cpu_mb'][0] / cpu:.2f}× the peer)", o["cpu_mb"][0] <= cpu / 2)
        peer, mbs = best_peer(sat, "mb_s", "high")
        add(f"saturation: throughput ≥ the best peer's ({peer} {mbs:.1f} MB/s)",
            f"{o['mb_s'][0]:.1f} MB/s ({o['mb_s'][0] / mbs:.2f}×)", o["mb_s"][0] >= mbs)
        add("saturation: no token lost or malformed, in any round",
            f"lost {o['lost'][2]:,.0f} at most, malformed {o['malformed'][2]:,.0f} at most",
            o["lost"][2] == 0 and o["malformed"][2] == 0)
    line = summary.get("linerate", {})
    if OURS in line:
        o = line[OURS]
        add("line rate: at most 0.5% of a core", f"{o['core_pct'][0]:.2f}%", o["core_pct"][0] <= 0.5)
        add("line rate: latency p99 ≤ 100 µs", f"{o['p99_us'][0]:.0f} µs", o["p99_us"][0] <= 100)
        add("line rate: latency p50 ≤ 50 µs", f"{o['p50_us'][0]:.0f} µs", o["p50_us"][0] <= 50)
    if callgrind:
        for mode, r in callgrind.items():
            per = r["instructions"] / r["bytes"]
            add(f"receive path ({mode}): ≤ 80 instructions per byte (callgrind)", f"{per:.1f}",
                per <= 80)
    if syscalls:
        per_kb = 1000.0 * syscalls["read"] / syscalls["bytes"]
        add("no system call per byte (reads of the terminal at saturation)",
            f"{per_kb:.2f} read(2) per 1000 bytes ({syscalls['bytes'] / max(syscalls['read'], 1):,.0f} "
            f"bytes a read)", syscalls["read"] < syscalls["bytes"] / 100)
    if not rows:
        return ""
    return "\n".join(["| goal | measured (median) | |", "|---|---|---|"] + rows)


def micro_table(micro, callgrind):
    if not micro and not callgrind:
        return ""
    lines = ["| benchmark | CPU ns per byte | instructions per byte (callgrind) | CPU ns |",
             "|---|---|---|---|"]
    rows = {}
    for b in (micro or {}).get("benchmarks", []):
        if b.get("run_type", "iteration") != "iteration":
            continue
        rows[b["name"]] = b
    names = sorted(rows) or sorted(f"ReceivePath/{m}" for m in (callgrind or {}))
    for name in names:
        b = rows.get(name, {})
        shown = "/".join(name.split("/")[:2])
        mode = name.split("/", 1)[1] if name.startswith("ReceivePath/") else None
        # Google Benchmark writes inverted rates in seconds.
        ns_byte = f"{b['ns_per_byte'] * 1e9:.2f}" if "ns_per_byte" in b else "–"
        if "ns_per_token" in b:
            ns_token = f"{b['ns_per_token'] * 1e9:.0f} per token"
        elif name.startswith("HostLock") and b:
            ns_token = f"{b['cpu_time']:.1f} per lock and unlock"
        elif name.startswith("Kernel/") and b:
            ns_token = f"{b['cpu_time']:,.0f} per token (process CPU)"
        else:
            ns_token = "–"
        ir = "–"
        if mode and callgrind and mode in callgrind:
            r = callgrind[mode]
            ir = f"{r['instructions'] / r['bytes']:.1f}"
        lines.append(f"| {shown} | {ns_byte} | {ir} | {ns_token} |")
    return "\n".join(lines)


def goal_line(summary, workload, key):
    readers = summary.get(workload, {})
    if key == "cpu_mb":
        _, best = best_peer(readers, key, "low")
        return (best / 2, "goal: half the best peer") if best else None
    if key == "mb_s":
        _, best = best_peer(readers, key, "high")
        return (best, "goal: the best peer") if best else None
    if key == "core_pct":
        return 0.5, "goal: 0.5%"
    if key == "p99_us":
        return 100, "goal: p99 100 µs (dotted: p50 50 µs)"
    return None


def chart(summary, path):
    try:
        import matplotlib
        matplotlib.use("Agg")
        import matplotlib.pyplot as plt
    except ImportError:
        return False
    panels = [
        ("saturation", "mb_s", "Saturation: throughput (MB/s, higher is better)", False),
        ("saturation", "cpu_mb", "Saturation: CPU seconds per MB (lower is better, log)", False),
        ("linerate", "core_pct", "Line rate: % of a core (lower is better, log)", False),
        ("linerate", "p99_us", "Line rate: latency p50 / p99 (µs, log)", True),
    ]
    fig, axes = plt.subplots(2, 2, figsize=(12, 8))
    for ax, (workload, key, title, latency) in zip(axes.flat, panels):
        readers = summary.get(workload, {})
        names = sorted(r for r in readers if ours(r)) + sorted(r for r in readers if not ours(r))
        xs = range(len(names))
        colours = ["#d95f02" if ours(n) else "#7570b3" for n in names]
        if latency:
            for offset, k, alpha in ((-0.2, "p50_us", 0.55), (0.2, "p99_us", 1.0)):
                med = [readers[n][k][0] for n in names]
                lo = [readers[n][k][0] - readers[n][k][1] for n in names]
                hi = [readers[n][k][2] - readers[n][k][0] for n in names]
                ax.bar([x + offset for x in xs], med, width=0.4, color=colours, alpha=alpha,
                       yerr=[lo, hi], capsize=3, label=k.split("_")[0])
            ax.set_yscale("log")
            ax.legend(["p50 (lighter)", "p99"], fontsize=8)
        else:
            med = [readers[n][key][0] for n in names]
            lo = [readers[n][key][0] - readers[n][key][1] for n in names]
            hi = [readers[n][key][2] - readers[n][key][0] for n in names]
            ax.bar(xs, med, color=colours, yerr=[lo, hi], capsize=3)
        if key in ("cpu_mb", "core_pct"):
            ax.set_yscale("log")  # the peers spread over two decades
        goal = goal_line(summary, workload, key)
        if goal:
            value, label = goal
            ax.axhline(value, color="#1b9e77", linestyle="--", linewidth=1.2)
            ax.text(-0.45, value, label, color="#1b9e77", fontsize=8, va="bottom", ha="left",
                    bbox=dict(facecolor="white", edgecolor="none", alpha=0.8, pad=1))
        if latency:
            ax.axhline(50, color="#1b9e77", linestyle=":", linewidth=1.2)
        ax.set_xticks(list(xs))
        ax.set_xticklabels(names, rotation=15, fontsize=8)
        ax.set_title(title, fontsize=10)
        ax.grid(axis="y", alpha=0.3)
    fig.suptitle("xtokline receive benchmark: medians of the rounds, bars min–max", fontsize=11)
    fig.tight_layout()
    fig.savefig(path, dpi=100)
    return True


def replace_between(text, begin, end, body):
    a = text.index(begin) + len(begin)
    b = text.index(end)
    return text[:a] + "\n" + body + "\n" + text[b:]


def main():
    ap = argparse.ArgumentParser()
    ap.add_argument("--runs", required=True)
    ap.add_argument("--micro")
    ap.add_argument("--callgrind")
    ap.add_argument("--syscalls")
    ap.add_argument("--out", required=True)
    ap.add_argument("--docs")
    ap.add_argument("--note", default="")
    args = ap.parse_args()

    runs = load_runs(args.runs)
    errors = [r for r in runs if "error" in r]
    summary = summarise(runs)

    def maybe(path):
        if path and os.path.exists(path):
            with open(path) as f:
                return json.load(f)
        return None

    micro = maybe(args.micro)
    callgrind = maybe(args.callgrind)
    syscalls = maybe(args.syscalls)

    parts = [table(summary, errors)]
    g = goals(summary, callgrind, syscalls)
    if g:
        parts += ["#### Goals", g]
    m = micro_table(micro, callgrind)
    if m:
        parts += ["#### The receive path alone (micro benchmark, memory line)", m]
    if args.note:
        parts += [args.note]
    body = "\n\n".join(parts)

    os.makedirs(args.out, exist_ok=True)
    with open(os.path.join(args.out, "table.md"), "w") as f:
        f.write(body + "\n")
    png = os.path.join(args.out, "performance.png")
    drew = chart(summary, png)
    print(body)
    if not drew:
        print("\n(no chart: python3-matplotlib is not installed)")

    if args.docs:
        with open(args.docs) as f:
            text = f.read()
        text = replace_between(text, "<!-- bench:begin -->", "<!-- bench:end -->", body)
        with open(args.docs, "w") as f:
            f.write(text)
        if drew:
            shutil.copyfile(png, os.path.join(os.path.dirname(args.docs), "performance.png"))


if __name__ == "__main__":
    main()
