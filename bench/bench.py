#!/usr/bin/python3
"""bench.py BUILD [ROW...]: runs the benchmarks and prints a table of ratios, ours / peer.

Each row's two sides run in turn (the calls of micro.cpp in random order), on the same input, and the
ratio is that of each pair of runs; the table has the minimum, median and maximum over the pairs. A
ratio below 1 is in our favour. Rows that need the unit run inside a stand-in unit (bench.py BUILD
--inside ROW), with a system log that is read."""
import ctypes
import json
import os
import shutil
import socket
import statistics
import subprocess
import sys
import time
from pathlib import Path

import validate

REPETITIONS = 20
HERE = Path(__file__).resolve().parent
BUILD = Path(sys.argv[1]).resolve()
DISK = BUILD / "disk"
TMPFS = Path("/dev/shm/vlsys-bench")
UNIT_TMPFS = Path("/run/bench")
CALL = str(BUILD / "bench/vlsys-call")

rows = {}  # name: (function, kind of unit or None)
results = []


def row(name, unit=None):
    def register(function):
        rows[name] = (function, unit)
        return function
    return register


def add(subject, peer, ours, theirs, unit="s"):
    """Adds one line of the table: samples of both sides, in pairs."""
    ratios = [a / b for a, b in zip(ours, theirs)]
    results.append({"row": current, "subject": subject, "peer": peer, "unit": unit,
                    "min": min(ratios), "median": statistics.median(ratios), "max": max(ratios),
                    "ours": ours, "theirs": theirs})


# ---- Ways to measure


def micro(pattern, **environment):
    """{subject: {who: [seconds of each repetition]}} of the benchmarks in micro.cpp."""
    scratch = scratch_directory / "micro.json"
    subprocess.run(
        [BUILD / "bench/vlsys-micro", f"--benchmark_filter={pattern}", f"--benchmark_out={scratch}",
         f"--benchmark_repetitions={REPETITIONS}", "--benchmark_min_time=0.05",
         "--benchmark_enable_random_interleaving=true"],
        env={**os.environ, **environment}, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
        check=True)
    samples = {}
    for run in json.loads(scratch.read_text())["benchmarks"]:
        if run.get("error_occurred"):
            sys.exit(f"{run['name']}: {run['error_message']}")
        if run["run_type"] == "iteration":
            _, subject, who = run["name"].split("/")[:3]
            samples.setdefault(subject, {}).setdefault(who, []).append(run["real_time"] * 1e-6)
    scratch.unlink()
    return samples


def measure(command, **environment):
    """(wall seconds, CPU seconds, peak kB) of a command."""
    out = subprocess.run([BUILD / "bench/vlsys-measure", *command], check=True, text=True,
                         env={**os.environ, **environment}, stdout=subprocess.PIPE,
                         stderr=subprocess.DEVNULL).stdout.split()
    if out[3] != "0":
        sys.exit(f"{command}: wait status {out[3]}")
    return float(out[0]), float(out[1]), float(out[2])


def alternate(sides, repetitions=REPETITIONS):
    """Calls each side in turn; {name: [result of each turn]}."""
    samples = {name: [] for name in sides}
    for _ in range(repetitions):
        for name, side in sides.items():
            samples[name].append(side())
    return samples


def timed(function, calls=1):
    """Seconds a call."""
    start = time.perf_counter()
    for _ in range(calls):
        function()
    return (time.perf_counter() - start) / calls


def add_all(subject, samples, unit="s"):
    """One line for each peer of "ours"."""
    for peer in samples:
        if peer != "ours":
            add(subject, peer, samples["ours"], samples[peer], unit)


# ---- The rows

KEYS = ["ONBOOT", "BOOTPROTO", "IPADDR", "NETMASK", "IPV6INIT", "IPV6_AUTOCONF", "NM_CONTROLLED",
        "PEERDNS", "DNS1", "DNS2", "DOMAIN", "DEFROUTE"]
IFCFG = "".join(f"{key}=old\n" for key in KEYS + [f"OTHER{i}" for i in range(18)])


def edit_commands(file):
    sed = ";".join(f"s/^{key}=.*/{key}=new/" for key in KEYS)
    augeas = "".join(f"set /files{file}/{key} new\n" for key in KEYS) + "save\n"
    merge = "".join(f"{key}=new\n" for key in KEYS)
    script = file.with_name("augeas")
    script.write_text(augeas)
    return {
        "ours": [CALL, "edit", file, *(f"{key}=new" for key in KEYS)],
        "sed -i, sync": ["sh", "-c", 'sed -i "$1" "$2" && exec sync "$2"', "-", sed, file],
        "augtool": ["augtool", "--noautoload", "-t", f"Shellvars incl {file}", "-f", script],
        "crudini": ["sh", "-c", 'printf %s "$1" | crudini --merge "$2"', "-", merge, file],
    }


@row("edit")
def row_edit():
    """One edit of a 30-line ifcfg file that sets 12 keys."""
    for place, directory in (("tmpfs", TMPFS), ("disk", DISK)):
        samples = micro("^edit/", BENCH_DIRECTORY=str(directory))
        for subject, sides in samples.items():
            add_all(f"edit, {subject}, {place}", sides)
        file = directory / "ifcfg"

        def run(command):
            file.write_text(IFCFG)
            return measure(command)[0]

        commands = edit_commands(file)
        add_all(f"the same as a process, {place}",
                alternate({name: lambda c=command: run(c) for name, command in commands.items()}))


@row("growth")
def row_growth():
    """Time per line, and per item at 1000 lines, of each step beside that of the step before."""
    for subject, sizes in micro("^growth/", BENCH_DIRECTORY=str(TMPFS)).items():
        steps = sorted((int(size), samples) for size, samples in sizes.items())
        for (small, before), (large, after) in zip(steps, steps[1:]):
            add(f"edit, {large} {subject}: time per one", f"{small} {subject}",
                [t / large for t in after], [t / small for t in before])


def set_interfaces(count):
    """Gives the unit eth0 to eth<count - 1>."""
    have = {name for _, name in socket.if_nameindex() if name.startswith("eth")}
    want = {f"eth{i}" for i in range(count)}
    batch = "".join(f"link del {name}\n" for name in have - want)
    batch += "".join(f"link add {name} type veth peer name {name} netns outside\n"
                     for name in sorted(want - have))
    subprocess.run(["ip", "-batch", "-"], input=batch, text=True, check=True)


def make_roots(count):
    """A unit's files, to be copied under a root path for each run."""
    original = UNIT_TMPFS / "original"
    shutil.rmtree(original, ignore_errors=True)
    shutil.copytree("/etc/sysconfig", original / "etc/sysconfig")
    shutil.copytree("/etc/sysctl.d", original / "etc/sysctl.d")
    scripts = original / "etc/sysconfig/network-scripts"
    eth0 = (scripts / "ifcfg-eth0").read_text()
    shutil.rmtree(scripts)
    scripts.mkdir()
    for i in range(count):
        (scripts / f"ifcfg-eth{i}").write_text(eth0.replace("eth0", f"eth{i}"))
    return original


def count_calls(command, **environment):
    """(system calls, child processes) of a command."""
    out = UNIT_TMPFS / "strace"
    subprocess.run(["strace", "-f", "-qq", "-c", "-o", out, *command], check=True,
                   env={**os.environ, **environment}, stdout=subprocess.DEVNULL)
    lines = [line.split() for line in out.read_text().splitlines()]
    calls = {words[-1]: int(words[3]) for words in lines if len(words) > 4 and words[0][0].isdigit()}
    return calls["total"], sum(calls.get(name, 0) for name in ("clone", "clone3", "fork", "vfork"))


@row("tool", unit="no-surrogate")
def row_tool():
    """The whole tool beside a script that makes the same files, and systemd's first-boot tool."""
    fc_cache = Path("/usr/bin/fc-cache")
    fc_cache.unlink(missing_ok=True)
    fc_cache.symlink_to("true")
    root = UNIT_TMPFS / "root"
    commands = {
        "ours": [BUILD / "factory/vlsys-factory"],
        "sed, ln, sync": [HERE / "factory_files.sh", "each"],
        "the same, one sed": [HERE / "factory_files.sh", "all"],
        "systemd-firstboot": ["systemd-firstboot", f"--root={root}", "--timezone=Etc/GMT",
                              "--hostname=rhx416-41600123"],
    }
    environment = {"VL_ROOT": str(root), "ROOT": str(root)}
    for count in (1, 4, 64, 1000):
        set_interfaces(count)
        original = make_roots(count)
        made = {}

        def run(name, how=measure):
            shutil.rmtree(root, ignore_errors=True)
            shutil.copytree(original, root)
            result = how(commands[name], **environment)
            made[name] = {path: os.readlink(path) if path.is_symlink()
                          else (path.stat().st_mode, path.read_text())
                          for path in root.rglob("*") if path.is_symlink() or path.is_file()}
            return result

        samples = alternate({name: lambda n=name: run(n) for name in commands})
        for name in ("sed, ln, sync", "the same, one sed"):
            if made[name] != made["ours"]:
                wrong = {str(k) for k in made[name].keys() | made["ours"].keys()
                         if made[name].get(k) != made["ours"].get(k)}
                sys.exit(f"{name}: not the same files: {sorted(wrong)[:5]}")
        subject = f"tool, {count} interface{'s' if count > 1 else ''}"
        for i, (what, unit) in enumerate((("wall", "s"), ("CPU", "s"), ("peak memory", "kB"))):
            add_all(f"{subject}: {what}",
                    {name: [sample[i] for sample in side] for name, side in samples.items()}, unit)
        counts = {name: run(name, count_calls) for name in commands}
        for i, what in enumerate(("system calls", "child processes")):
            add_all(f"{subject}: {what}", {name: [count[i]] for name, count in counts.items()
                                          if count[i]}, "")


class Address6(ctypes.Structure):
    _fields_ = [("addr", ctypes.c_char * 46), ("prefix", ctypes.c_uint32),
                ("scope", ctypes.c_char * 8)]


class Interface(ctypes.Structure):
    _fields_ = [("index", ctypes.c_uint8), ("name", ctypes.c_char * 16),
                ("lower_up", ctypes.c_uint8), ("mac", ctypes.c_char * 18), ("up", ctypes.c_uint8),
                ("addr", ctypes.c_char * 16), ("broadaddr", ctypes.c_char * 16),
                ("netmask", ctypes.c_char * 16), ("prefix", ctypes.c_uint8),
                ("ipv4_mode", ctypes.c_uint32), ("has_ipv6", ctypes.c_uint8),
                ("addr6", Address6 * 4), ("ipv6_mode", ctypes.c_uint32)]


class Dns(ctypes.Structure):
    _fields_ = [("domain", ctypes.c_char * 1025), ("server", (ctypes.c_char * 46) * 3),
                ("iface", ctypes.c_char * 16), ("mode", ctypes.c_uint32)]


class Gateway4(ctypes.Structure):
    _fields_ = [("iface", ctypes.c_char * 16), ("addr", ctypes.c_char * 16),
                ("mode", ctypes.c_uint32)]


class Gateway6(ctypes.Structure):
    _fields_ = [("iface", ctypes.c_char * 16), ("addr", ctypes.c_char * 46),
                ("mode", ctypes.c_uint32)]


MANUAL = 1


@row("validate", unit="sy")
def row_validate():
    """The validators beside the same rules in Python, which logs nothing: ours log faults only."""
    library = ctypes.CDLL(str(BUILD / "vlsys/libvlsys.so"))
    library.vlsys_setlogmask(0x1F)  # up to LOG_WARNING
    for count, calls in ((2, 100), (64, 3), (1000, 1)):
        set_interfaces(count)
        settings = [(f"eth{i}", f"10.{i // 256}.{i % 256}.2", 24, f"fd00:{i:x}::2", 64)
                    for i in range(count)]
        nifs = (Interface * count)()
        for nif, (name, address, prefix, address6, prefix6) in zip(nifs, settings):
            nif.name, nif.addr, nif.prefix = name.encode(), address.encode(), prefix
            nif.netmask, nif.ipv4_mode, nif.ipv6_mode = b"24", MANUAL, MANUAL
            nif.addr6[0].addr, nif.addr6[0].prefix = address6.encode(), prefix6
        dns = Dns(mode=MANUAL, domain=b"example.org")
        gw4 = Gateway4(addr=b"10.0.0.1", mode=MANUAL)
        gw6 = Gateway6(addr=b"fd00:0::1", mode=MANUAL)
        hostname = ctypes.create_string_buffer(b"rhx416-41600123", 1025)
        servers = ["10.0.0.3", "10.0.0.4"]

        def set_servers(texts):
            for slot, text in zip(dns.server, texts):
                slot.value = text.encode()

        def ours():
            set_servers(servers)
            result = library.vlsys_address_check2(nifs, count, ctypes.byref(gw4), ctypes.byref(gw6),
                                                  ctypes.byref(dns), hostname)
            if result != 0:
                sys.exit(f"vlsys_address_check2: {result:#x}")

        def ours_each():
            for i, nif in enumerate(nifs):
                gateway = ctypes.create_string_buffer(texts[i][0], 16)
                gateway6 = ctypes.create_string_buffer(texts[i][1], 46)
                set_servers(own_servers[i])
                result = library.vlsys_address_check(ctypes.byref(nif), gateway, gateway6,
                                                     ctypes.byref(dns), hostname)
                if result != 0:
                    sys.exit(f"vlsys_address_check: {result:#x}")

        nets = [f"10.{i // 256}.{i % 256}" for i in range(count)]
        texts = [(f"{net}.1".encode(), f"fd00:{i:x}::1".encode()) for i, net in enumerate(nets)]
        own_servers = [[f"{net}.3", f"{net}.4"] for net in nets]

        def theirs_each():
            for i, setting in enumerate(settings):
                validate.check_one(setting, f"{nets[i]}.1", f"fd00:{i:x}::1", own_servers[i])

        def theirs():
            validate.check_all(settings, "10.0.0.1", "fd00:0::1", servers)

        add_all(f"vlsys_address_check, each of {count} interfaces", alternate(
            {"ours": lambda: timed(ours_each, calls),
             "Python ipaddress": lambda: timed(theirs_each, calls)}))
        add_all(f"vlsys_address_check2, {count} interfaces", alternate(
            {"ours": lambda: timed(ours, calls),
             "Python ipaddress": lambda: timed(theirs, calls)}))


@row("state", unit="sy")
def row_state():
    """The readers, as calls, beside the commands that a program would run instead."""
    library = ctypes.CDLL(str(BUILD / "vlsys/libvlsys.so"))
    for line in ("addr add 192.168.1.2/24 dev eth0", "route add default via 192.168.1.1",
                 "addr add fd00::2/64 dev eth0", "-6 route add default via fd00::1"):
        subprocess.run(["ip", *line.split()], check=True)
    nif, gw4, gw6 = Interface(), Gateway4(), Gateway6()

    def call(name, *arguments):
        result = getattr(library, name)(*arguments)
        if result != 0:
            sys.exit(f"{name}: {result}")

    def gateways():
        call("vlsys_get_ipv4_default_gateway2", ctypes.byref(gw4))
        call("vlsys_get_ipv6_default_gateway2", ctypes.byref(gw6))

    add_all("vlsys_get_netif", alternate({
        "ours": lambda: timed(lambda: call("vlsys_get_netif", b"eth0", ctypes.byref(nif)), 20),
        "ip -j addr": lambda: measure(["ip", "-j", "addr"])[0]}))
    add_all("both default gateways", alternate({
        "ours": lambda: timed(gateways, 20),
        "ip -j route": lambda: measure(["ip", "-j", "route"])[0]}))
    if (gw4.addr, gw6.addr) != (b"192.168.1.1", b"fd00::1") or nif.addr != b"192.168.1.2":
        sys.exit("the state read is not the unit's")


@row("remove")
def row_remove():
    """The removal of a tree, a hundred files to a directory, on tmpfs."""
    tree = TMPFS / "tree"
    for count in (10000, 100000):
        def run(*command):
            subprocess.run([CALL, "make-tree", tree, str(count)], check=True)
            return measure([*command, tree])[0]

        add_all(f"vlsys_remove_tree, {count} files", alternate({
            "ours": lambda: run(CALL, "remove-tree"),
            "rm -rf --one-file-system": lambda: run("rm", "-rf", "--one-file-system"),
            "bare unlinkat walk": lambda: run(CALL, "remove-bare")}))


@row("log", unit="sy")
def row_log():
    """One line of the log in each mode beside the C library's own call that writes the same line."""
    add_all("vlsys_log, system log", micro("^log/")["syslog"])
    add_all("vlsys_log, standard output", micro("^stdout/", BENCH_STDOUT="1")["printf"])


@row("system", unit="sy")
def row_system():
    """A waited command through the surrogate parent."""
    add_all("vlsys_system(true)", micro("^system/")["true"])


# ---- Running


def run_inside(name, unit):
    """Runs a row inside a unit whose log is read by a process that drops it."""
    out = subprocess.run(
        [BUILD / "standin/vlsys-unit", unit, "sh", "-c",
         'unit-log >/dev/null & while [ ! -S /dev/log ]; do sleep 0.01; done; "$@"; status=$?; kill $!; '
         "exit $status", "-",
         sys.executable, "-B", __file__, BUILD, "--inside", name],
        stdout=subprocess.PIPE, check=True).stdout
    return json.loads(out)


def text_of(value, unit):
    if unit != "s":
        return f"{value:.0f} {unit}".strip()
    for scale, suffix in ((1, "s"), (1e3, "ms"), (1e6, "us")):
        if value * scale >= 1:
            break
    return f"{value * scale:.3g} {suffix}"


def print_table(table):
    print(f"{'ours / peer':48} {'peer':25} {'min':>8} {'median':>8} {'max':>8} {'ours':>9} {'peer':>9}")
    for line in table:
        ours, theirs = (text_of(statistics.median(line[side]), line["unit"])
                        for side in ("ours", "theirs"))
        print(f"{line['subject']:48} {line['peer']:25} {line['min']:8.3f} {line['median']:8.3f} "
              f"{line['max']:8.3f} {ours:>9} {theirs:>9}")


if sys.argv[2:3] == ["--inside"]:
    current = sys.argv[3]
    scratch_directory = UNIT_TMPFS
    UNIT_TMPFS.mkdir(exist_ok=True)
    rows[current][0]()
    json.dump(results, sys.stdout)
    sys.exit()

scratch_directory = TMPFS
names = sys.argv[2:] or list(rows)
for name in names:
    if name not in rows:
        sys.exit(f"{name}: no such row; there are: {' '.join(rows)}")
for directory in (TMPFS, DISK):
    directory.mkdir(parents=True, exist_ok=True)
try:
    for current in names:
        print(f"bench: {current}", file=sys.stderr)
        function, unit = rows[current]
        if unit:
            results += run_inside(current, unit)
        else:
            function()
finally:
    for directory in (TMPFS, DISK):
        shutil.rmtree(directory)
print_table(results)
(BUILD / "results.json").write_text(json.dumps(results, indent=1) + "\n")
