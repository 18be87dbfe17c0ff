"""Shared pieces of the bench runners: building Velloca in Release mode,
running it headless in its own XDG folders, sampling its /proc figures and
keeping the results under bench/results/.

Imported by bench/peer, bench/linerate, bench/scale and bench/startup.
"""

import json
import os
import resource
import shlex
import shutil
import signal
import socket
import subprocess
import sys
import tempfile
import time

BENCH_DIR = os.path.dirname(os.path.abspath(__file__))
REPO_DIR = os.path.dirname(BENCH_DIR)
RESULTS_DIR = os.path.join(BENCH_DIR, "results")
DEFAULT_BUILD_DIR = os.path.join(REPO_DIR, "build-release")
# What building Velloca needs; the full list is in scripts/setup.sh.
BUILD_TOOLS = ("cmake", "ninja", "g++")
EXIT_SETUP = 4
# Entries of the session's buffer-size list (bytes), by BufferSize index.
BUFFER_SIZES = [1024, 4096, 8192, 16384, 32768, 65536, 131072, 262144, 524288, 1048576,
                2097152, 4194304, 8388608, 16777216, 33554432, 67108864]
CLOCK_TICKS = os.sysconf("SC_CLK_TCK")
PAGE_SIZE = os.sysconf("SC_PAGE_SIZE")

_log_prefix = os.path.basename(sys.argv[0]) or "bench"


class SetupError(Exception):
    pass


def set_log_prefix(prefix):
    global _log_prefix
    _log_prefix = prefix


def log(text):
    print(f"{_log_prefix}: {text}", file=sys.stderr, flush=True)


def run(argv, **kwargs):
    log("$ " + " ".join(shlex.quote(a) for a in argv))
    result = subprocess.run(argv, **kwargs)
    if result.returncode != 0:
        raise SetupError(f"{' '.join(argv[:3])} ... failed with exit status {result.returncode}")
    return result


# ---------------------------------------------------------------- building

def cached_build_type(build_dir):
    try:
        with open(os.path.join(build_dir, "CMakeCache.txt")) as f:
            for line in f:
                if line.startswith("CMAKE_BUILD_TYPE:"):
                    return line.split("=", 1)[1].strip()
    except OSError:
        return None
    return ""


def ensure_velloca(build_dir, jobs):
    """Configure (Release) when the folder is new, then let Ninja rebuild
    whatever changed; returns the path of the executable."""
    missing = [t for t in BUILD_TOOLS if not shutil.which(t)]
    if missing:
        raise SetupError(f"{', '.join(missing)} not found: run {REPO_DIR}/scripts/setup.sh once "
                         "to install the build dependencies")
    build_type = cached_build_type(build_dir)
    if build_type not in (None, "Release"):
        raise SetupError(f"{build_dir} is configured as {build_type or 'no build type'}, not "
                         "Release; pass --build-dir with a new folder")
    # Configuring again is cheap and picks up source files added since: the
    # libraries are globbed at configure time.
    configure = ["cmake", "-S", REPO_DIR, "-B", build_dir, "-DCMAKE_BUILD_TYPE=Release"]
    if build_type is None:
        configure[1:1] = ["-G", "Ninja"]
    run(configure, stdout=sys.stderr)
    run(["cmake", "--build", build_dir, "--target", "velloca", "-j", str(jobs)], stdout=sys.stderr)
    binary = os.path.join(build_dir, "velloca")
    if not os.access(binary, os.X_OK):
        raise SetupError(f"build finished but {binary} is not there")
    return binary


def add_build_options(ap):
    ap.add_argument("--build-dir", default=DEFAULT_BUILD_DIR,
                    help="Release build folder for Velloca (default %(default)s)")
    ap.add_argument("--jobs", type=int, default=1, help="parallel build jobs (default 1)")
    ap.add_argument("--velloca", help="use this velloca executable and build nothing")


def velloca_from_args(args):
    """The executable named by --velloca, or a fresh Release build."""
    if args.jobs < 1:
        raise SetupError(f"--jobs must be at least 1, got {args.jobs}")
    velloca = (os.path.abspath(args.velloca) if args.velloca
               else ensure_velloca(os.path.abspath(args.build_dir), args.jobs))
    if not os.access(velloca, os.X_OK):
        raise SetupError(f"{velloca} is not an executable")
    return velloca


def velloca_revision():
    result = subprocess.run(["git", "-C", REPO_DIR, "describe", "--always", "--dirty"],
                            capture_output=True, text=True)
    return result.stdout.strip() if result.returncode == 0 else "unknown"


# ---------------------------------------------------------------- running

def raise_fd_limit(wanted):
    """Raises the soft RLIMIT_NOFILE (inherited by Velloca) to at least
    `wanted`, as far as the hard limit allows; returns the new soft limit."""
    soft, hard = resource.getrlimit(resource.RLIMIT_NOFILE)
    target = wanted if hard == resource.RLIM_INFINITY else min(wanted, hard)
    if soft == resource.RLIM_INFINITY or soft >= target:
        return soft
    resource.setrlimit(resource.RLIMIT_NOFILE, (target, hard))
    return target


def free_tcp_ports(count):
    """`count` distinct ports that were free a moment ago on 127.0.0.1."""
    held = []
    try:
        for _ in range(count):
            s = socket.socket(socket.AF_INET, socket.SOCK_STREAM)
            s.bind(("127.0.0.1", 0))
            held.append(s)
        return [s.getsockname()[1] for s in held]
    finally:
        for s in held:
            s.close()


def listening_tcp_ports():
    """Local ports in LISTEN state, from /proc/net/tcp and tcp6."""
    ports = set()
    for name in ("/proc/net/tcp", "/proc/net/tcp6"):
        try:
            with open(name) as f:
                next(f)
                for line in f:
                    fields = line.split()
                    if fields[3] == "0A":
                        ports.add(int(fields[1].rsplit(":", 1)[1], 16))
        except OSError:
            pass
    return ports


def wait_until(condition, timeout, interval=0.01):
    deadline = time.monotonic() + timeout
    while True:
        if condition():
            return True
        if time.monotonic() >= deadline:
            return False
        time.sleep(interval)


def session_section(number, **keys):
    return f"[Session{number}]\n" + "".join(f"{k}={v}\n" for k, v in keys.items())


def configuration(sessions, ports=None, **global_keys):
    """A configuration file text: `sessions` is a list of dicts of session
    keys, `ports` maps connector numbers to device paths for [Ports]."""
    text = "[Velloca]\n" + f"NumSessions={len(sessions)}\n"
    text += "".join(f"{k}={v}\n" for k, v in global_keys.items())
    if ports:
        text += "[Ports]\n" + "".join(f"COM{n}={path}\n" for n, path in sorted(ports.items()))
    for i, keys in enumerate(sessions, start=1):
        text += session_section(i, **keys)
    return text


class Velloca:
    """One headless Velloca process with its own XDG folders; the
    configuration is its default.vlk."""

    def __init__(self, binary, config_text, workdir=None):
        self.binary = binary
        self.own_workdir = workdir is None
        self.workdir = workdir or tempfile.mkdtemp(prefix="velloca-bench-")
        self.config_home = os.path.join(self.workdir, "xdg-config")
        self.runtime_dir = os.path.join(self.workdir, "xdg-runtime")
        self.home = os.path.join(self.workdir, "home")
        for d in (self.config_home, self.runtime_dir, self.home):
            os.makedirs(d, exist_ok=True)
            os.chmod(d, 0o700)
        self.program_folder = os.path.join(self.config_home, "velloca")
        os.makedirs(self.program_folder, exist_ok=True)
        with open(os.path.join(self.program_folder, "default.vlk"), "w") as f:
            f.write(config_text.replace("\n", "\r\n"))
        self.proc = None
        self.started_at = None

    @property
    def virtual_port_folder(self):
        return os.path.join(self.runtime_dir, "velloca")

    @property
    def pid(self):
        return self.proc.pid

    def environment(self):
        env = dict(os.environ)
        for key in ("DISPLAY", "WAYLAND_DISPLAY", "QT_QPA_PLATFORM"):
            env.pop(key, None)
        env.update(HOME=self.home, XDG_CONFIG_HOME=self.config_home,
                   XDG_RUNTIME_DIR=self.runtime_dir)
        return env

    def start(self):
        env = self.environment()
        self.stderr = open(os.path.join(self.workdir, "stderr.txt"), "w")
        self.started_at = time.monotonic()
        self.proc = subprocess.Popen([self.binary], env=env, cwd=self.workdir,
                                     stdin=subprocess.DEVNULL, stdout=self.stderr,
                                     stderr=self.stderr)
        return self

    def running(self):
        return self.proc is not None and self.proc.poll() is None

    def error_log(self):
        try:
            with open(os.path.join(self.program_folder, "errorlog.txt"), "rb") as f:
                return f.read().decode("utf-8", "replace")
        except OSError:
            return ""

    def stderr_text(self):
        try:
            with open(os.path.join(self.workdir, "stderr.txt")) as f:
                return f.read()[-2000:]
        except OSError:
            return ""

    def wait_for_listening(self, ports, timeout=30):
        wanted = set(ports)
        return wait_until(lambda: not self.running() or wanted <= listening_tcp_ports(),
                          timeout, 0.02) and self.running()

    def wait_for_log(self, text, timeout=30):
        return wait_until(lambda: not self.running() or text in self.error_log(),
                          timeout, 0.05) and self.running()

    def stop(self, timeout=10):
        """SIGTERM (Velloca shuts down and saves), SIGKILL when it hangs;
        returns the exit status."""
        if self.proc is None:
            return None
        if self.proc.poll() is None:
            self.proc.send_signal(signal.SIGTERM)
            try:
                self.proc.wait(timeout)
            except subprocess.TimeoutExpired:
                log(f"velloca {self.proc.pid} did not stop within {timeout} s: killing it")
                self.proc.kill()
                self.proc.wait()
        self.stderr.close()
        return self.proc.returncode

    def cleanup(self):
        if self.own_workdir:
            shutil.rmtree(self.workdir, ignore_errors=True)

    def __enter__(self):
        return self.start()

    def __exit__(self, *exc):
        self.stop()
        self.cleanup()


# ---------------------------------------------------------------- measuring

class ProcSample:
    """CPU time, context switches (all threads) and memory of a process at
    one moment."""

    def __init__(self, pid):
        self.time = time.monotonic()
        with open(f"/proc/{pid}/stat") as f:
            fields = f.read().rsplit(")", 1)[1].split()
        # utime and stime are fields 14 and 15; fields[0] is field 3.
        self.cpu_seconds = (int(fields[11]) + int(fields[12])) / CLOCK_TICKS
        # Per thread: a thread that ends between two samples takes its
        # count with it, so only threads seen in both are compared.
        self.switches = {}
        for tid in os.listdir(f"/proc/{pid}/task"):
            try:
                status = _status_fields(f"/proc/{pid}/task/{tid}/status")
            except OSError:
                continue  # the thread ended meanwhile
            self.switches[tid] = (status.get("voluntary_ctxt_switches", 0),
                                  status.get("nonvoluntary_ctxt_switches", 0))
        self.threads = len(self.switches)
        status = _status_fields(f"/proc/{pid}/status")
        self.rss_kib = status.get("VmRSS", 0)
        self.hwm_kib = status.get("VmHWM", 0)
        self.fds = len(os.listdir(f"/proc/{pid}/fd"))


def _status_fields(path):
    out = {}
    with open(path) as f:
        for line in f:
            key, _, value = line.partition(":")
            parts = value.split()
            if parts and parts[0].isdigit():
                out[key] = int(parts[0])
    return out


def usage_between(before, after):
    """CPU share of one core (%) and wake-ups per second between two samples."""
    wall = after.time - before.time
    cpu = after.cpu_seconds - before.cpu_seconds
    # A thread that started in between counts from zero.
    voluntary = involuntary = 0
    for tid, (vol, invol) in after.switches.items():
        was_vol, was_invol = before.switches.get(tid, (0, 0))
        voluntary += vol - was_vol
        involuntary += invol - was_invol
    switches = voluntary + involuntary
    return {
        "wall_s": round(wall, 3),
        "cpu_s": round(cpu, 3),
        "cpu_percent_of_one_core": round(100.0 * cpu / wall, 3) if wall > 0 else None,
        "wakeups_per_s": round(switches / wall, 2) if wall > 0 else None,
        "voluntary_per_s": round(voluntary / wall, 2) if wall > 0 else None,
        "involuntary_per_s": round(involuntary / wall, 2) if wall > 0 else None,
        "rss_kib": after.rss_kib,
        "peak_rss_kib": after.hwm_kib,
        "threads": after.threads,
        "fds": after.fds,
    }


def percentile(values, p):
    """Nearest-rank percentile (p in 0..100) of a non-empty list."""
    if not values:
        return None
    ordered = sorted(values)
    rank = max(1, -(-len(ordered) * p // 100))
    return ordered[int(rank) - 1]


def load_average():
    try:
        with open("/proc/loadavg") as f:
            return " ".join(f.read().split()[:3])
    except OSError:
        return "?"


# ---------------------------------------------------------------- reporting

def format_table(headers, rows):
    cells = [[str(h) for h in headers]] + [["" if c is None else str(c) for c in r] for r in rows]
    widths = [max(len(r[i]) for r in cells) for i in range(len(headers))]
    lines = ["  ".join(c.ljust(w) for c, w in zip(r, widths)).rstrip() for r in cells]
    lines.insert(1, "  ".join("-" * w for w in widths))
    return "\n".join(lines)


def header_lines(velloca):
    return (f"# velloca {velloca_revision()} ({velloca}); {time.strftime('%Y-%m-%d %H:%M:%S %z')}; "
            f"load average {load_average()} on {os.cpu_count()} CPUs; "
            "2 shared cores, figures are noisy\n")


def save_results(results_dir, tag, table_text, data):
    """Writes <tag>.txt (the printed table) and <tag>.json; returns the base path."""
    os.makedirs(results_dir, exist_ok=True)
    base = os.path.join(results_dir, tag)
    with open(base + ".txt", "w") as f:
        f.write(table_text if table_text.endswith("\n") else table_text + "\n")
    with open(base + ".json", "w") as f:
        json.dump(data, f, indent=2)
        f.write("\n")
    return base
