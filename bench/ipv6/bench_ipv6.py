"""Inside the sandbox: vornnetd against RAs from scapy in the peer host of eth0 (see run)."""
import os
import re
import select
import statistics
import subprocess
import sys
import time

DAEMON, TOOL, SENDER = sys.argv[1:4]
ARGS = sys.argv[4:]
COUNT = int(ARGS[ARGS.index("--count") + 1]) if "--count" in ARGS else 3000
TRIALS = int(ARGS[ARGS.index("--trials") + 1]) if "--trials" in ARGS else 20
PEER = os.environ["VORN_PEER_eth0_PID"]
SYSLOG = "/run/vorn/syslog.log"
IP = "/usr/sbin/ip"


def sh(*argv, check=True):
    return subprocess.run(argv, check=check, capture_output=True, text=True).stdout


def sysctl(key, value):
    with open("/proc/sys/net/ipv6/conf/" + key, "w") as f:
        f.write(value + "\n")


def link_local(peer):
    for _ in range(100):
        cmd = ["nsenter", "-t", PEER, "-n", IP] if peer else [IP]
        out = sh(*cmd, "-6", "addr", "show", "dev", "eth0")
        m = re.search(r"inet6 (fe80::[0-9a-f:]+)/64", out)
        if m and "tentative" not in out:
            return m.group(1)
        time.sleep(0.1)
    raise SystemExit("no link-local address on eth0")


def processed():
    with open(SYSLOG, errors="replace") as f:
        return sum(1 for line in f if "Process RA from" in line)


def wait_bus():
    for _ in range(200):
        if subprocess.run(["gdbus", "call", "--session", "--dest", "com.vornlink.net",
                           "--object-path", "/", "--method", "org.freedesktop.DBus.Peer.Ping"],
                          capture_output=True).returncode == 0:
            return
        time.sleep(0.05)
    raise SystemExit("vornnetd did not come up")


def main():
    for i in ("all", "default", "eth0"):
        sysctl(i + "/accept_ra", "0")
        sysctl(i + "/autoconf", "0")
    router = link_local(True)
    link_local(False)
    os.makedirs("/etc/sysconfig/network-scripts", exist_ok=True)
    daemon = subprocess.Popen([DAEMON], stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    wait_bus()
    sender = subprocess.Popen(["nsenter", "-t", PEER, "-n", "/usr/bin/python3", "-I", SENDER,
                               "serve", "eth0", router],
                              stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True)

    def ask(line):
        sender.stdin.write(line + "\n")
        sender.stdin.flush()
        return sender.stdout.readline().strip()

    print("vornnetd IPv6 router advertisement watch, up to %d RAs per run (scapy from the peer host)"
          % COUNT)
    runs = [("same state:", ""), ("flags flipping:", " flip"),
            ("same state, 500/s:", " rate=500"), ("flipping, 50/s:", " flip rate=50")]
    for label, options in runs:
        count = COUNT if "rate" not in options else min(COUNT, 1000 if "500" in options else 200)
        # Settle: one RA decides the state first.
        ask("ra")
        time.sleep(0.5)
        before = processed()
        start = time.monotonic()
        sent = ask("flood %d%s" % (count, options))
        m = re.match(r"sent (\d+) in ([0-9.]+) s", sent)
        send_rate = int(m.group(1)) / max(float(m.group(2)), 1e-9)
        last, last_change = before, time.monotonic()
        while time.monotonic() - last_change < 2.0:
            now = processed()
            if now != last:
                last, last_change = now, time.monotonic()
            if now - before >= count:
                break
            time.sleep(0.02)
        handled = last - before
        elapsed = (last_change if handled < count else time.monotonic()) - start
        print("  %-22s sent %6.0f RA/s   handled %5d of %d (%5.1f%%) at %7.0f RA/s"
              % (label, send_rate, handled, count, 100.0 * handled / count, handled / elapsed))

    latencies = []
    for _ in range(TRIALS):
        sh(TOOL, "gateway", "del", "--ifname", "eth0", "--type", "v6", check=False)
        sh(IP, "-6", "route", "flush", "exact", "::/0", check=False)
        sh(TOOL, "reset-ipv6", "eth0")
        monitor = subprocess.Popen([IP, "-6", "monitor", "route"], stdout=subprocess.PIPE)
        time.sleep(0.2)
        sent_at = float(ask("ra"))
        seen = None
        deadline = time.monotonic() + 10
        text = b""
        fd = monitor.stdout.fileno()
        while seen is None and time.monotonic() < deadline:
            ready, _, _ = select.select([fd], [], [], 0.1)
            if not ready:
                continue
            chunk = os.read(fd, 4096)
            if not chunk:
                break
            text += chunk
            if ("default via " + router).encode() in text:
                seen = time.monotonic()
        monitor.kill()
        monitor.wait()
        if seen is not None:
            latencies.append((seen - sent_at) * 1000.0)
    if latencies:
        latencies.sort()
        print("  RA -> default route in the kernel: median %.1f ms, p90 %.1f ms, max %.1f ms "
              "(%d of %d trials)" % (statistics.median(latencies),
                                     latencies[int(0.9 * (len(latencies) - 1))], latencies[-1],
                                     len(latencies), TRIALS))
    else:
        print("  RA -> default route: no route seen")
    sender.stdin.close()
    sender.wait()
    daemon.terminate()
    daemon.wait()


main()
