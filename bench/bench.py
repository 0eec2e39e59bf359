#!/usr/bin/python3
"""bench.py BUILD ROW...: measures the rows, prints the table of docs/performance.md, and writes
every sample to BUILD/results.json. A row is a function below; one that needs the unit runs inside a
stand-in, as bench.py BUILD --inside ROW. A side is a function that gives one sample: seconds, or a
number of system calls."""
import collections
import json
import os
import platform
import shutil
import socket
import statistics
import subprocess
import sys
import tempfile
import time
import timeit
from pathlib import Path

import validate

TURNS = 15
HERE = Path(__file__).resolve().parent
BUILD = Path(sys.argv[1]).resolve()
CALLS = BUILD / "bench/bench-calls"
results = []


def compare(subject, ours, peers, unit="s", turns=TURNS, before=lambda: None):
    """Samples every side once a turn, after `before`, and adds a result for each peer."""
    samples = [[] for _ in range(1 + len(peers))]
    for _ in range(turns):
        for side, taken in zip([ours, *peers.values()], samples):
            before()
            taken.append(side())
    for peer, theirs in zip(peers, samples[1:]):
        ratio = statistics.median(a / b for a, b in zip(samples[0], theirs))
        results.append({"subject": subject, "peer": peer, "ratio": ratio, "unit": unit,
                        "ours": samples[0], "theirs": theirs})


# ---- Sides


def call(name, times=1):
    """A benchmark of calls.cpp."""
    def side():
        subprocess.run([CALLS, f"--benchmark_filter=^{name}/", "--benchmark_min_time=0.05",
                        "--benchmark_out=call.json"],
                       stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=True)
        [run] = json.loads(Path("call.json").read_text())["benchmarks"]
        if "error_message" in run:
            sys.exit(f"{name}: {run['error_message']}")
        return run["real_time"] * 1e-9 * times
    return side


def process(*command):
    def side():
        start = time.perf_counter()
        subprocess.run(command, stdout=subprocess.DEVNULL, check=True)
        return time.perf_counter() - start
    return side


def count_calls(*command):
    """{system call: how often} of a command and its children, and "total"."""
    subprocess.run(["strace", "-f", "-qq", "-c", "-U", "name,calls", "-o", "calls", *command],
                   stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=True)
    words = Path("calls").read_text().split()
    return collections.Counter({name: int(n) for name, n in zip(words, words[1:]) if n.isdigit()})


# ---- Rows that run on the machine


def check_bare_calls():
    """Says where the bare calls are not those of the edit, but for the memory."""
    ours, bare = (count_calls(CALLS, f"--benchmark_filter=^{name}/30_lines/",
                              "--benchmark_min_time=0") for name in ("edit", "edit_bare"))
    for name in ("brk", "mmap", "munmap", "total"):
        del ours[name], bare[name]
    if ours != bare:
        print(f"bench: edit alone calls {dict(ours - bare)}, its peer alone {dict(bare - ours)}",
              file=sys.stderr)


def compare_commands(subject):
    """The edit of calls.cpp beside the commands that make the same file."""
    file = Path("etc/sysconfig/network-scripts/ifcfg-eth0")
    edited = old = file.read_text()
    sed = augeas = ""
    for i in range(12):
        setting = edited.splitlines()[i * 30 // 12]
        key, value = setting.split("=")
        old = old.replace(setting, f"{key}=old")
        sed += f"s/^{key}=.*/{setting}/;"
        augeas += f"set /files/{file}/{key} {value}\n"
    Path("augeas").write_text(augeas + "save\n")

    def restore():
        if file.read_text() != edited:
            sys.exit("edit: a peer makes another file")
        file.write_text(old)

    compare(subject, call("edit/30_lines"), {
        "`sed -i`, `sync`": process("sh", "-c", 'sed -i "$1" "$2" && sync "$2"', "-", sed, file),
        "`augtool`": process("augtool", "--root=.", "--noautoload", "--file=augeas",
                             f"--transform=Shellvars incl /{file}"),
    }, before=restore)


def edit():
    bare = {"its bare system calls": call("edit_bare/30_lines")}
    compare("edit, 12 keys of 30 lines, tmpfs", call("edit/30_lines"), bare, turns=2 * TURNS)
    check_bare_calls()
    with tempfile.TemporaryDirectory(dir=BUILD) as directory:
        os.chdir(directory)
        compare("edit, 12 keys of 30 lines, disk", call("edit/30_lines"), bare)
        compare_commands("edit, 12 keys of 30 lines, disk")


def growth():
    ten_times = {"10 times 10 keys of 1,000 lines": call("edit/1000_lines", times=10)}
    compare("edit, 10 keys of 10,000 lines", call("edit/10000_lines"), ten_times)
    compare("edit, 100 keys of 1,000 lines", call("edit/100_keys"), ten_times)


def make_tree():
    for i in range(10000):
        Path(f"tree/{i // 100}").mkdir(parents=True, exist_ok=True)
        Path(f"tree/{i // 100}/{i}").touch()


def remove():
    compare("vlsys_remove_tree, 10,000 files", call("remove_tree"),
            {"`rm -rf`": process("rm", "-rf", "--one-file-system", "tree")}, before=make_tree)


# ---- Rows that run in the unit


def set_interfaces(count):
    """Gives the unit eth0 and those after it, and each a file like that of eth0."""
    scripts = Path("/etc/sysconfig/network-scripts")
    eth0 = (scripts / "ifcfg-eth0").read_text()
    batch = ""
    for _, name in socket.if_nameindex():
        if name != "lo":
            batch += f"link del {name}\n"
            (scripts / f"ifcfg-{name}").unlink(missing_ok=True)
    for i in range(count):
        batch += f"link add eth{i} type veth peer name eth{i} netns outside\n"
        (scripts / f"ifcfg-eth{i}").write_text(eth0.replace("eth0", f"eth{i}"))
    subprocess.run(["ip", "-batch", "-"], input=batch, text=True, check=True)


def make_root():
    """The unit's files as they were."""
    shutil.rmtree("root", ignore_errors=True)
    for folder in ("etc/sysconfig", "etc/sysctl.d"):
        shutil.copytree(f"/{folder}", f"root/{folder}")


def check_same_files(ours, script):
    for command, copy in ((ours, "ours"), (script, "theirs")):
        make_root()
        subprocess.run(command, stdout=subprocess.DEVNULL, check=True)
        shutil.rmtree(copy, ignore_errors=True)
        os.rename("root", copy)
    subprocess.run(["diff", "-r", "--no-dereference", "ours", "theirs"], check=True)


def tool():
    os.environ["VL_ROOT"] = os.path.abspath("root")
    Path("/usr/bin/fc-cache").unlink(missing_ok=True)
    Path("/usr/bin/fc-cache").symlink_to("true")
    ours = [BUILD / "factory/vlsys-factory"]
    script = [HERE / "factory_files", "root"]
    for count in (4, 64, 1000):
        set_interfaces(count)
        check_same_files(ours, script)
        subject = f"the tool, {count:,} interfaces"
        compare(subject, process(*ours), {"a `sed` script": process(*script)}, before=make_root)
        compare(f"{subject}: system calls", lambda: count_calls(*ours)["total"],
                {"a `sed` script": lambda: count_calls(*script)["total"]},
                unit="", turns=1, before=make_root)


def validators():
    set_interfaces(64)

    def python(count):
        number = 1000 // count
        return lambda: timeit.timeit(lambda: validate.check(count), number=number) / number

    compare("vlsys_address_check", call("check"), {"Python `ipaddress`": python(1)})
    for count in (2, 64):
        compare(f"vlsys_address_check2, {count} interfaces", call(f"check2/{count}"),
                {"Python `ipaddress`": python(count)})


def state():
    for line in ("addr add 192.168.1.2/24 dev eth0", "route add default via 192.168.1.1"):
        subprocess.run(["ip", *line.split()], check=True)
    compare("vlsys_get_netif", call("get_netif"),
            {"`ip -j addr`": process("ip", "-j", "addr", "show", "dev", "eth0")})
    compare("vlsys_get_ipv4_default_gateway2", call("get_gateway"),
            {"`ip -j route`": process("ip", "-j", "route", "show", "default")})


def log():
    compare("vlsys_log, system log", call("log_ours"), {"`syslog`": call("log_syslog")})
    compare("vlsys_log, standard output", call("log_stdout"), {"`printf`": call("log_printf")})


def system():
    compare("vlsys_system, `true`", call("system_ours"), {"`system`": call("system_libc")})


# ---- Running

# Each with the kind of unit that it runs in.
ROWS = {"edit": (edit, None), "growth": (growth, None), "remove": (remove, None),
        "tool": (tool, "no-surrogate"), "validate": (validators, "sy"), "state": (state, "sy"),
        "log": (log, "sy"), "system": (system, "sy")}
# The unit's log is read, and dropped.
INSIDE = """unit-log >/dev/null & while [ ! -S /dev/log ]; do sleep 0.01; done
"$@"; status=$?; kill $!; exit $status"""


def run_row(name, place):
    with tempfile.TemporaryDirectory(dir=place) as directory:
        os.chdir(directory)
        ROWS[name][0]()
        os.chdir(BUILD)


def run_in_unit(name, kind):
    out = subprocess.run([BUILD / "standin/vlsys-unit", kind, "sh", "-c", INSIDE, "-",
                          sys.executable, "-B", __file__, BUILD, "--inside", name],
                         stdout=subprocess.PIPE, check=True).stdout
    results.extend(json.loads(out))


def two_digits(value, unit):
    if unit == "s":
        value, unit = (value * 1e3, " ms") if value >= 1e-3 else (value * 1e6, " us")
    value = float(f"{value:.1e}")
    return f"{value:.1f}{unit}" if value < 10 else f"{value:.0f}{unit}"


def print_page():
    compiler = subprocess.check_output(["c++", "--version"], text=True).splitlines()[0]
    print(f"Measured {time.strftime('%Y-%m-%d')}: {os.cpu_count()} cores ({platform.machine()}), "
          f"Linux {platform.release()},\n{platform.freedesktop_os_release()['PRETTY_NAME']}, "
          f"{compiler}.\n\n| what | ours | peer | peer's | ours / peer |\n|---|---|---|---|---|")
    for result in results:
        ours, theirs = (two_digits(statistics.median(result[side]), result["unit"])
                        for side in ("ours", "theirs"))
        ratio = f"{result['ratio']:.2f}" if result["ratio"] >= 0.01 else "below 0.01"
        print(f"| {result['subject']} | {ours} | {result['peer']} | {theirs} | {ratio} |")


def main(names):
    for name in names:
        print(f"bench: {name}", file=sys.stderr)
        kind = ROWS[name][1]
        if kind:
            run_in_unit(name, kind)
        else:
            run_row(name, "/dev/shm")
    (BUILD / "results.json").write_text(json.dumps(results, indent=1) + "\n")
    print_page()


if sys.argv[2] == "--inside":
    run_row(sys.argv[3], "/run")
    json.dump(results, sys.stdout)
else:
    main(sys.argv[2:])
