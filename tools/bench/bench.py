#!/usr/bin/python3
"""Start-up benchmark of the launcher beside its alternatives, run as alternating pairs.

    python3 tools/bench/bench.py [--pairs 21] [--no-wine] [--out docs]
Needs a built Linux launcher (build/linux), its runtime and the demo application (make dist-linux),
Debian's OpenJDK 17 (with openjdk-17-jre for its Swing), Xvfb, python3-matplotlib and libx11-dev; under
Wine also the x86_64 build. Prints the table and writes docs/performance.md and docs/performance.png. Not
a test: nothing here passes or fails."""
import argparse, datetime, glob, string, fcntl, os, platform, pwd, queue, re, shutil, signal, socket, statistics, subprocess, sys, threading, time

HERE = os.path.dirname(os.path.abspath(__file__))
ROOT = os.path.dirname(os.path.dirname(HERE))
JDK = '/usr/lib/jvm/java-17-openjdk-amd64'
MAIN = 'com.qz.kpo.emu57.app.ApplicationMainForm'
EXE = 'QZ-Lumiscope_QZ-57'
# The instance lock's folder and file, as the launcher names them: below the account's home, per machine.
LOCKS = os.path.join(pwd.getpwuid(os.getuid()).pw_dir, '.cache')
LOCK = f"QZ-Lumiscope_QZ-57/\u5a51\u4c2d\u6d75\u7369\u6f63\u6570\u515f\u2d5a\u3735@{os.uname().nodename.replace('/', '_')}.lock"
HANDOFF_ARGS = ['/home/ana/Messungen/Probe \u00e9t\u00e9.l57', 'scan \U0001F600 02.l57']
WINE = '/usr/lib/wine/wine64'
JAVA_FRAME = 'com-qz-kpo-emu57-app-ApplicationMainForm'  # the class Java's toolkit gives the main class's windows
SETTLE_S = 1.0  # the frame up and painted before its process's peak memory is read
PACKAGE = 'dist/qz-lumiscope-qz57_*_amd64.deb'

def reexec():
    """Runs again under Debian's python3 (matplotlib) in a private network namespace (port 6152) and a
    mount namespace whose tmpfs covers the instance lock's folder (no running application meets ours)."""
    if os.environ.get('BENCH_NETNS'):
        if os.environ['BENCH_NETNS'] == 'private':
            subprocess.run(['ip', 'link', 'set', 'lo', 'up'], check=True)
            subprocess.run(['mount', '-t', 'tmpfs', '-o', 'mode=0700', 'bench', LOCKS], check=True)
        return
    py = '/usr/bin/python3' if os.path.exists('/usr/bin/python3') else sys.executable
    private = shutil.which('unshare') and subprocess.run(['unshare', '-nm', 'true'], capture_output=True).returncode == 0
    os.environ['BENCH_NETNS'] = 'private' if private else 'shared'
    os.makedirs(LOCKS, mode=0o700, exist_ok=True)
    argv = ['unshare', '-nm'] if private else []
    os.execvp(argv[0] if argv else py, argv + [py, os.path.abspath(__file__)] + sys.argv[1:])

def sh(*argv, **kw):
    return subprocess.run(argv, check=True, capture_output=True, text=True, **kw).stdout

def build(a):
    """The baselines, the stand-in application and the application folders, in build/bench."""
    b = a.work
    os.makedirs(b, exist_ok=True)
    for name in ['map_watch', 'baseline_window', 'baseline_send']:
        sh('cc', '-O2', '-o', f'{b}/{name}', f'{HERE}/{name}.c', *(['-lX11'] if 'send' not in name else []))
    sh('cc', '-O2', '-shared', '-fPIC', '-o', f'{b}/vm_load_stamp.so', f'{HERE}/vm_load_stamp.c')
    sh(f'{JDK}/bin/javac', '--release', '17', '-d', f'{b}/classes', f'{HERE}/ApplicationMainForm.java')
    sh(f'{JDK}/bin/jar', '--create', '--file', f'{b}/bench.jar', '-C', f'{b}/classes', '.')
    sh(f'{JDK}/bin/javac', '--release', '17', '-d', f'{b}/frame-classes', f'{HERE}/frame/ApplicationMainForm.java')
    sh(f'{JDK}/bin/jar', '--create', '--file', f'{b}/frame.jar', '-C', f'{b}/frame-classes', '.')
    jre, demo = os.path.abspath(a.jre), os.path.join(os.path.dirname(os.path.abspath(a.jre)), 'emu57.jar')
    if not os.path.exists(f'{jre}/lib/server/libjvm.so') or not os.path.exists(demo):
        sys.exit(f'bench: no runtime at {jre} or no demo application beside it: run make dist-linux first')
    sh('bash', f'{ROOT}/runtime/make-jre.sh', f'{b}/old-runtime', '--old')
    a.runtimes = [jre, os.path.abspath(f'{b}/old-runtime/jre')]
    folders = {'app': (f'{b}/bench.jar', jre), 'nojre': (f'{b}/bench.jar', None)}  # nojre: stops before the VM
    for program, jar in [('demo', demo), ('other', f'{b}/frame.jar')]:
        for n, runtime in enumerate(a.runtimes):
            folders[f'frame-{program}-{n}'] = (jar, runtime)
    for name, (jar, runtime) in folders.items():
        d = f'{b}/{name}'
        shutil.rmtree(d, ignore_errors=True)
        os.makedirs(d)
        shutil.copy2(a.launcher, f'{d}/{EXE}')
        shutil.copy2(jar, f'{d}/emu57.jar')
        runtime and os.symlink(runtime, f'{d}/jre')
    if a.wine:
        sh('x86_64-w64-mingw32-gcc', '-O2', '-static', '-mwindows', '-o', f'{b}/baseline_window_win.exe',
           f'{HERE}/baseline_window_win.c')
        d = f'{b}/wine-app'
        os.makedirs(f'{d}/jre/bin/client', exist_ok=True)
        shutil.copy2(a.exe, f'{d}/{EXE}.exe')
        shutil.copy2(f'{a.build}/x86_64/tests/wine/jvm.dll', f'{d}/jre/bin/client/jvm.dll')
        open(f'{d}/emu57.jar', 'w').close()

def environment(a, **extra):
    home = f'{a.tmp}/home'
    return dict({'PATH': '/usr/bin:/bin', 'HOME': home,
                 'XDG_CONFIG_HOME': f'{home}/.config', 'LANG': 'C.UTF-8'}, **extra)

def spawn(argv, env, out=os.devnull):
    actions = [(os.POSIX_SPAWN_OPEN, 0, os.devnull, os.O_RDONLY, 0),
               (os.POSIX_SPAWN_OPEN, 1, out, os.O_WRONLY | os.O_CREAT | os.O_TRUNC, 0o600),
               (os.POSIX_SPAWN_DUP2, 1, 2)]
    start = time.monotonic_ns()
    return start, os.posix_spawn(argv[0], argv, env, file_actions=actions)

def finish(pid):
    """Waits for the process: (end time, exit code, peak resident KB)."""
    _, status, usage = os.wait4(pid, 0)
    return time.monotonic_ns(), os.waitstatus_to_exitcode(status), usage.ru_maxrss

class Screen:
    """A private Xvfb (-displayfd: never races for a number) or a given display, with the map watcher."""
    def __init__(self, a, display=None, env=None):
        self.server = None
        if display is None:
            r, w = os.pipe()
            self.server = subprocess.Popen(['Xvfb', '-displayfd', str(w), '-screen', '0', '1280x1024x24',
                                            '-nolisten', 'tcp'], pass_fds=(w,), stdout=subprocess.DEVNULL,
                                           stderr=subprocess.DEVNULL)
            os.close(w)
            display = ':' + os.fdopen(r).readline().strip()
        self.display, self.maps = display, queue.Queue()
        self.watch = subprocess.Popen([f'{a.work}/map_watch'], env=dict(env or os.environ, DISPLAY=display),
                                      stdout=subprocess.PIPE, text=True)
        assert self.watch.stdout.readline().strip() == 'ready'
        threading.Thread(target=self.read, daemon=True).start()

    def read(self):
        for line in self.watch.stdout:
            _, ns, w, h, cls = line.split()
            self.maps.put((int(ns), int(w), int(h), cls))

    def mapped(self, wanted, timeout=30):
        """The time of the first window mapped whose (width, height, class) is `wanted`."""
        end = time.monotonic() + timeout
        while True:
            ns, *window = self.maps.get(timeout=max(0.01, end - time.monotonic()))
            if wanted(*window):
                return ns

    def close(self):
        for p in filter(None, [self.watch, self.server]):
            p.kill(), p.wait()

def map_time(screen, argv, env, wanted, peak=False):
    """Process start to the first window mapped whose (width, height, class) is `wanted` (None when none
    came); with `peak`, also the process's peak memory (MiB) once that window has been up for SETTLE_S.
    The process is then ended."""
    while not screen.maps.empty():
        screen.maps.get()
    start, pid = spawn(argv, env)
    try:
        ms = (screen.mapped(wanted) - start) / 1e6
        if not peak:
            return ms
        time.sleep(SETTLE_S)
        return ms, int(re.search(r'VmHWM:\s*(\d+)', open(f'/proc/{pid}/status').read())[1]) / 1024
    except queue.Empty:
        return None
    finally:
        os.kill(pid, signal.SIGKILL)
        finish(pid)

def java_run(argv, env, out, stamps=None):
    """ms from start to: main entered, process end, [the program's first code, the load of libjvm.so]."""
    if stamps:
        env = dict(env, LD_AUDIT=stamps[0], BENCH_STAMP_LOG=stamps[1])
        open(stamps[1], 'w').close()
    start, pid = spawn(argv, env, out)
    end, code, _ = finish(pid)
    lines = open(out).read().split()
    entered = next((int(w) for w in lines if w.isdigit()), None)
    if code != 0 or entered is None:
        sys.exit(f'bench: {argv[0]} ended with {code}:\n' + open(out).read())
    marks = [(int(l.split()[0]) - start) / 1e6 for l in open(stamps[1])] if stamps else []
    return [(entered - start) / 1e6, (end - start) / 1e6] + marks

def handoff_time(listener, argv, env):
    """Process start to the last byte received on 6152; with the bytes received."""
    start, pid = spawn(argv, env)
    listener.settimeout(60)
    conn, _ = listener.accept()
    data, last = b'', None
    while chunk := conn.recv(65536):
        data, last = data + chunk, time.monotonic_ns()
    conn.close()
    finish(pid)
    return (last - start) / 1e6, data

def measure(a):
    R = {f[0]: [[] for _ in range(1 + len(f[3]))] for f in FIGS}
    for d in ['home/.config', 'home/Documents/QZ-LumiscopeQZ-57Nova/logs']:  # the launcher logs
        os.makedirs(f'{a.tmp}/{d}', mode=0o700)
    launcher, out = f'{a.work}/app/{EXE}', f'{a.tmp}/out.txt'
    headless = environment(a)
    # Debian's java gets exactly the options the launcher gave its VM (read back from the VM itself).
    start, pid = spawn([launcher], dict(headless, BENCH_PRINT_OPTIONS='1'), out)
    finish(pid)
    options = [l[7:] for l in open(out).read().splitlines() if l.startswith('option ')]
    # The VM does not report the class path; the launcher's is the application folder's emu57.jar.
    java = [f'{a.jre}/bin/java', '-cp', f'{a.work}/app/emu57.jar'] + options + [MAIN]
    a.java = java
    # The frames: the launcher with each runtime, and Debian's java of the full JDK with the same options.
    a.frames = {program: [[f'{a.work}/frame-{program}-{n}/{EXE}'] for n in range(len(a.runtimes))] +
                [[f'{JDK}/bin/java', '-cp', f'{a.work}/frame-{program}-0/emu57.jar'] + options + [MAIN]]
                for program in ('demo', 'other')}
    screen = Screen(a)
    xenv = environment(a, DISPLAY=screen.display)
    size = tuple(int(v) for v in a.splash_size)
    listener = socket.create_server(('127.0.0.1', 6152), reuse_port=False)
    encoded = [arg.encode('utf-16-be').hex() for arg in HANDOFF_ARGS]
    wine = None
    try:
        wine = Wine(a) if a.wine else None
        pairs(a, R, screen, wine, listener, xenv, size, headless, java, encoded, out)
    finally:
        screen.close()
        wine and wine.close()
    return R

def pairs(a, R, screen, wine, listener, xenv, size, headless, java, encoded, out):
    launcher, nojre = f'{a.work}/app/{EXE}', f'{a.work}/nojre/{EXE}'
    for i in range(a.pairs):
        order = (0, 1) if i % 2 == 0 else (1, 0)  # who goes first alternates too
        for who in order:
            for name, run in [
                ('splash', lambda: map_time(screen, [launcher] if who == 0 else [f'{a.work}/baseline_window', *a.splash_size],
                                            xenv, lambda *window: window[:2] == size)),
                ('wine', lambda: wine and wine.map_time(who)),
                ('main', lambda: java_run([launcher] if who == 0 else java, headless, out)),
                ('prevm', lambda: java_run([launcher] if who == 0 else java, headless, out,
                                                (f'{a.work}/vm_load_stamp.so', f'{a.tmp}/stamps.txt'))),
                ('handoff', lambda: handoff(a, listener, launcher, encoded, who, headless)),
                ('rss', lambda: rss(a, nojre, headless) if who == 0 else None)]:
                v = run()
                if name == 'main':
                    R['main'][who].append(v[0])
                    R['end'][who].append(v[1])
                elif name == 'prevm':
                    R['link'][who].append(v[2])
                    R['prevm'][who].append(v[3] - v[2])
                    a.vm_part[who].append(v[0] - v[3])
                elif v is not None:
                    R[name][who].append(v)
        for program, series in a.frames.items():  # three series: who goes first turns round
            for who in [(i + k) % len(series) for k in range(len(series))]:
                ms, mib = map_time(screen, series[who], xenv, lambda *window: window[2] == JAVA_FRAME, peak=True) or \
                    sys.exit(f'bench: no Java frame from {series[who][0]} within 30 s')
                R[f'frame_{program}'][who].append(ms)
                R[f'rss_{program}'][who].append(mib)
        print(f'bench: pair {i + 1}/{a.pairs} done', file=sys.stderr, flush=True)

def handoff(a, listener, launcher, encoded, who, env):
    os.makedirs(os.path.dirname(f'{LOCKS}/{LOCK}'), mode=0o700, exist_ok=True)
    with open(f'{LOCKS}/{LOCK}', 'a') as lock:  # a first instance, as far as the launcher can tell
        fcntl.flock(lock, fcntl.LOCK_EX)
        ms, data = handoff_time(listener, [launcher, *HANDOFF_ARGS] if who == 0 else
                                [f'{a.work}/baseline_send', *encoded], env)
    if data != ''.join(encoded).encode():
        sys.exit(f'bench: hand-off bytes differ: {data!r}')
    return ms

def rss(a, nojre, env):
    # Through GNU time: a child of posix_spawn inherits this Python's peak in its ru_maxrss.
    start, pid = spawn(['/usr/bin/time', '-f', '%M', '-o', f'{a.tmp}/rss.txt', nojre], env)
    _, code, _ = finish(pid)
    return int(open(f'{a.tmp}/rss.txt').read().split()[-1]) / 1024 if code == 255 else sys.exit(f'bench: run without runtime ended with {code}')

class Wine:
    """The x86_64 build under wine64 on the test bed's own Xvfb and prefix (tests/wine/bed.sh)."""
    def __init__(self, a):
        print('bench: setting up the Wine prefix', file=sys.stderr, flush=True)
        self.bed = f'{a.work}/wine-bed'
        sh('bash', f'{ROOT}/tests/wine/bed.sh', 'setup', self.bed)
        self.env = dict(l.split('=', 1) for l in sh('bash', '-c', f'. {self.bed}/env.sh; env -0').split('\0') if '=' in l)
        self.screen = Screen(a, self.env['DISPLAY'], self.env)
        exe, base = f'{a.work}/wine-app/{EXE}.exe', f'{a.work}/baseline_window_win.exe'
        self.argv = [[WINE, exe], [WINE, base, *a.splash_size]]

    def map_time(self, who):
        return map_time(self.screen, self.argv[who], self.env, lambda *window: True)

    def close(self):
        self.screen.close()
        sh('bash', f'{ROOT}/tests/wine/bed.sh', 'teardown', self.bed)

SAME = "Debian's java, same runtime and options"
OLD, FULL = ('launcher, runtime made the old way', 'old runtime'), ("Debian's java -cp emu57.jar, full JDK", "Debian's java")
FIGS = [  # key, what, unit, [(alternative, its label in the plot, goal of the ratio or None)], ceiling of the launcher's own figure
    ('splash', 'start to splash window mapped, Linux on Xvfb', 'ms', [('baseline_window (bare Xlib window)', 'bare window', 1.10)], None),
    ('wine', 'start to splash window mapped, x86_64 under Wine', 'ms', [('baseline_window_win.exe', 'bare window', 1.10)], None),
    ('main', 'start to Java main entered', 'ms', [(SAME, 'java', 1.00)], None),
    ('end', 'start to process end', 'ms', [(SAME, 'java', 1.00)], None),
    ('link', 'exec and dynamic linking: start to the program\'s first code', 'ms', [(SAME, 'java', None)], None),
    ('prevm', 'own work before the VM library: first code to the load of libjvm.so', 'ms', [(SAME, 'java', None)], 2.0),
    ('handoff', 'second instance: start to last byte received on 6152', 'ms', [('baseline_send (bare sender)', 'bare sender', 1.20)], None),
    ('rss', 'peak resident memory, run stopped before the VM', 'MiB', [], 4.0),
    ('frame_demo', 'start to the Java frame mapped: the demo application', 'ms', [(*OLD, 0.75), (*FULL, 0.85)], None),
    ('frame_other', 'start to the Java frame mapped: a frame program outside the training', 'ms', [(*OLD, 0.85), (*FULL, 0.92)], None),
    ('rss_demo', 'peak resident memory with the frame up: the demo application', 'MiB', [(*OLD, 0.85), (*FULL, None)], None),
    ('rss_other', 'peak resident memory with the frame up: the frame program outside the training', 'MiB', [(*OLD, None), (*FULL, None)], None),
]

def stats(v):
    return statistics.median(v), min(v), max(v)

def table(R):
    rows, missed = ['| figure | series | median | min | max | goal | met |', '|---|---|---:|---:|---:|---|---|'], []
    for key, what, unit, alts, ceiling in FIGS:
        mine = R[key][0]
        if not mine:
            continue
        series = [('launcher', mine, unit, ceiling and (lambda m: m < ceiling, f'< {ceiling:g} {unit}'))]
        for (alt, _, goal), other in zip(alts, R[key][1:]):
            if other:
                series += [(alt, other, unit, None), ('ratio launcher / alternative', [x / y for x, y in zip(mine, other)], 'x',
                                                      goal and (lambda m, goal=goal: m <= goal, f'<= {goal:.2f}x'))]
        for n, (name, v, u, goal) in enumerate(series):
            m = stats(v)
            if goal and not goal[0](m[0]):
                missed.append((key, name if u != 'x' else series[n - 1][0]))
            rows.append(f'| {what if n == 0 else ""} | {name} | ' + ' | '.join(f'{x:.2f} {u}' for x in m) +
                        f' | {goal[1] if goal else ""} | {("met" if goal[0](m[0]) else "NOT met") if goal else ""} |')
    return '\n'.join(rows), missed

def sizes(a):
    picture = os.path.getsize(a.bmp)
    rows = ['| executable | total | splash picture | without picture |', '|---|---:|---:|---:|']
    for name, path, pad in [('Linux x86_64 ELF', a.launcher, 1), ('Windows x86_64', f'{a.build}/x86_64/launcher/{EXE}.exe', 8),
                            ('Windows i686', f'{a.build}/i686/launcher/{EXE}.exe', 8)]:
        if os.path.exists(path):
            total, pic = os.path.getsize(path), (picture + pad - 1) // pad * pad
            rows.append(f'| {name} | {total:,} B ({total / 1024:.1f} KiB) | {pic:,} B | {total - pic:,} B ({(total - pic) / 1024:.1f} KiB) |')
    mib = lambda n: f'{n:,} B ({n / 2 ** 20:.1f} MiB)'
    folder = lambda d: sum(os.path.getsize(os.path.join(p, f)) for p, _, fs in os.walk(d) for f in fs)
    package = sorted(glob.glob(f'{ROOT}/{PACKAGE}'))
    rows += ['', '| Java runtime, package | size |', '|---|---:|',
             f'| the private runtime (`{os.path.relpath(a.runtimes[0], ROOT)}`), its archive `lib/server/classes.jsa` '
             f'{mib(os.path.getsize(a.runtimes[0] + "/lib/server/classes.jsa"))} | {mib(folder(a.runtimes[0]))} |',
             f'| the runtime made the old way | {mib(folder(a.runtimes[1]))} |',
             f'| the Debian package (`{PACKAGE}`) | ' + (f'{mib(os.path.getsize(package[-1]))}, {os.path.basename(package[-1])} |'
                                                       if package else 'not built |')]
    return '\n'.join(rows)

def plot(R, path):
    import matplotlib
    matplotlib.use('Agg')
    import matplotlib.pyplot as plt
    figs = [f for f in FIGS if R[f[0]][0]]
    cols = (len(figs) + 2) // 3
    fig, axes = plt.subplots(3, cols, figsize=(3.2 * cols, 13), squeeze=False)
    [ax.set_visible(False) for ax in axes.flat[len(figs):]]
    for ax, (key, what, unit, alts, ceiling) in zip(axes.flat, figs):
        data = [(label, v) for label, v in zip(['launcher'] + [alt[1] for alt in alts], R[key]) if v]
        ax.boxplot([v for _, v in data], labels=[label for label, _ in data], widths=0.5, showfliers=False)
        for n, (_, v) in enumerate(data):
            ax.plot([n + 1 + 0.12 * ((i % 5) - 2) / 2 for i in range(len(v))], v, '.', alpha=0.6,
                    color=['tab:blue', 'tab:orange', 'tab:green'][n])
        if ceiling:
            ax.axhline(ceiling, color='tab:red', linestyle='--', label=f'goal < {ceiling:g} {unit}')
            ax.legend(fontsize=7)
        ax.set_title('\n'.join(__import__('textwrap').wrap(what, 28)), fontsize=8)
        ax.set_ylabel(unit)
        ax.set_ylim(bottom=0)
        ax.tick_params(labelsize=7)
        plt.setp(ax.get_xticklabels(), rotation=15)
    fig.tight_layout()
    fig.savefig(path, dpi=110)

def machine():
    cpu = next((l.split(':', 1)[1].strip() for l in sh('lscpu').splitlines() if l.startswith('Model name')), '?')
    debian = open('/etc/debian_version').read().strip() if os.path.exists('/etc/debian_version') else '?'
    return f'{cpu}, {os.cpu_count()} CPUs; Linux {platform.release()}; Debian {debian}'

def document(a, R, text, missed, size_text):
    med = lambda v: f'{statistics.median(v):.1f}' if v else '?'
    notes = ''.join(f'- Not met in this run: {what}' + (f', against {alt}' if len(alts) > 1 else '') + '.\n'
                    for key, what, _, alts, _ in FIGS for k, alt in missed if k == key)
    # $med_<figure>, $alt_<figure> (medians of the launcher and its first alternative) and $ratio_<figure>.
    figures = {}
    for key, *_ in FIGS:
        mine, alt = R[key][0], (R[key][1] if len(R[key]) > 1 else [])
        figures[f'med_{key}'] = f'{statistics.median(mine):.2f}' if mine else '?'
        figures[f'alt_{key}'] = f'{statistics.median(alt):.2f}' if alt else '?'
        figures[f'ratio_{key}'] = f'{statistics.median([x / y for x, y in zip(mine, alt)]):.2f}' if mine and alt else '?'
    return string.Template(open(f'{HERE}/performance.md.in').read()).substitute(figures,
        command=a.command, date=datetime.date.today(), pairs=a.pairs, machine=machine(), table=text,
        netns='a private network namespace' if os.environ.get('BENCH_NETNS') == 'private' else 'the shared network',
        picture=f'{os.path.getsize(a.bmp):,}', sizes=size_text, runtime=os.path.relpath(a.runtimes[0], ROOT), java=' '.join(a.java), vm_launcher=med(a.vm_part[0]),
        vm_java=med(a.vm_part[1]), prevm_launcher=med(R['prevm'][0]), link_launcher=med(R['link'][0]),
        missed=('\n## Goals not met\n' + notes) if notes else '')

def main():
    p = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    p.add_argument('--pairs', type=int, default=21)
    p.add_argument('--build', default=f'{ROOT}/build')
    p.add_argument('--jre', default=f'{ROOT}/dist/linux-x86_64/jre')
    p.add_argument('--out', default=f'{ROOT}/docs')
    p.add_argument('--no-wine', dest='wine', action='store_false')
    a = p.parse_args()
    reexec()
    a.command = 'python3 tools/bench/bench.py' + ''.join(f' {x}' for x in sys.argv[1:])
    a.work, a.launcher, a.bmp = f'{a.build}/bench', f'{a.build}/linux/launcher/{EXE}', f'{a.build}/linux/launcher/splash.bmp'
    a.exe, a.vm_part = f'{a.build}/x86_64/launcher/{EXE}.exe', ([], [])
    a.wine = a.wine and os.path.exists(WINE) and os.path.exists(a.exe)
    head = open(a.bmp, 'rb').read(26)
    a.splash_size = [str(int.from_bytes(head[18:22], 'little')), str(abs(int.from_bytes(head[22:26], 'little', signed=True)))]
    build(a)
    a.tmp = sh('mktemp', '-d').strip()
    try:
        R = measure(a)
    finally:
        shutil.rmtree(a.tmp, ignore_errors=True)
    (text, missed), size_text = table(R), sizes(a)
    print(text + '\n\n' + size_text)
    os.makedirs(a.out, exist_ok=True)
    plot(R, f'{a.out}/performance.png')
    open(f'{a.out}/performance.md', 'w').write(document(a, R, text, missed, size_text))
    print(f'\nwrote {a.out}/performance.md and {a.out}/performance.png')

if __name__ == '__main__':
    main()
