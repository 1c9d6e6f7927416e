# Installed as a user installs it, a document opened as a desktop opens it: the Debian package in a
# minimal Debian 12 (tests/package/prepare-root.sh), each Windows installer under Wine. The document
# reaches the Java application on the first start and, on Linux, a second one reaches the running
# frame; removal leaves nothing of the package behind and every file of the user's in place.
import hashlib
import os
import shutil
import signal
import subprocess
import time
from pathlib import Path

import pytest
from Xlib import error as xerror

import conftest

ROOT = Path(__file__).resolve().parents[2]
DIST = ROOT / "dist"
PACKAGE, APP_ID, DOCUMENT_TYPE = "qz-lumiscope-qz57", "com.qz.kpo.emu57", "application/x-qz57"
JAVA_FRAME = "com-qz-kpo-emu57-app-ApplicationMainForm"


def only(pattern):
    found = sorted(DIST.glob(pattern))
    assert len(found) == 1, f"expected one dist/{pattern} (make package), found {found}"
    return found[0]


def wait_for(check, seconds, what):
    deadline = time.monotonic() + seconds
    while time.monotonic() < deadline:
        found = check()
        if found:
            return found
        time.sleep(0.2)
    pytest.fail(f"no {what} after {seconds} s")


def test_debian_package_checks(platform, tmp_path):
    # What Debian's and freedesktop.org's own tools say of the package and the files it installs.
    deb = only(f"{PACKAGE}_*_amd64.deb")
    lint = subprocess.run(["lintian", "--tag-display-limit", "0", deb], capture_output=True, text=True)
    assert not [line for line in lint.stdout.splitlines() if line.startswith("E:")], lint.stdout
    subprocess.run(["dpkg-deb", "-x", deb, tmp_path], check=True)
    share = tmp_path / "usr/share"
    validate = subprocess.run(["desktop-file-validate", share / f"applications/{APP_ID}.desktop"], capture_output=True, text=True)
    assert (validate.returncode, validate.stdout + validate.stderr) == (0, "")
    appstream = subprocess.run(["appstreamcli", "validate", "--no-net", share / f"metainfo/{APP_ID}.metainfo.xml"], capture_output=True, text=True)
    assert appstream.returncode == 0, appstream.stdout
    assert os.readlink(tmp_path / f"usr/bin/{PACKAGE}") == f"../lib/{PACKAGE}/QZ-Lumiscope_QZ-57"
    assert sorted(p.name for p in (tmp_path / f"usr/lib/{PACKAGE}").iterdir()) == ["QZ-Lumiscope_QZ-57", "emu57.jar", "jre"]


class DebianRoot:
    # A working copy of the prepared minimal Debian 12. Each command runs chrooted, in a mount
    # namespace of its own with /proc and /dev (which live as long as what the command started).
    SYSTEM_BOOKKEEPING = ("proc", "dev", "sys", "run", "tmp", "root", "var/cache", "var/lib/apt", "var/lib/dpkg", "var/log")

    def __init__(self, prepared, display):
        self.path, self.display = prepared / "work", display
        shutil.rmtree(self.path, ignore_errors=True)
        subprocess.run(["cp", "-a", prepared / "pristine", self.path], check=True)

    def run(self, *command, display=False, check=True, **kw):
        env = ["HOME=/root", "LANG=C.UTF-8", "PATH=/usr/sbin:/usr/bin:/sbin:/bin"] + [f"DISPLAY={self.display}"] * display
        enter = 'mount -t proc proc "$0/proc" && mount --bind /dev "$0/dev" && cd "$0/root" && exec chroot "$0" env -i "$@"'
        return subprocess.run(["unshare", "-m", "sh", "-c", enter, self.path, *env, *command], check=check, text=True,
                              **({"capture_output": True} | kw))

    def files(self):  # every path outside the system's bookkeeping and the user's home
        paths = set()
        for folder, dirs, names in os.walk(self.path):
            rel = os.path.relpath(folder, self.path)
            dirs[:] = [d for d in dirs if os.path.normpath(os.path.join(rel, d)) not in self.SYSTEM_BOOKKEEPING]
            paths.update(os.path.join(rel, name) for name in dirs + names)
        return paths

    def home(self):  # the user's files and what they hold
        return {str(p): p.is_file() and not p.is_symlink() and hashlib.sha256(p.read_bytes()).hexdigest()
                for p in sorted((self.path / "root").rglob("*"))}

    def end_processes(self):
        for pid in filter(str.isdigit, os.listdir("/proc")):
            try:
                if os.readlink(f"/proc/{pid}/root") == str(self.path):
                    os.kill(int(pid), signal.SIGKILL)
            except OSError:
                pass

    def close(self):
        self.end_processes()
        shutil.rmtree(self.path, ignore_errors=True)


def java_frames(display):  # the application's frames as the window manager lists them
    clients = display.root.get_full_property(display.atom("_NET_CLIENT_LIST"), 0)
    frames = []
    for window in (display.x.create_resource_object("window", i) for i in (clients.value if clients else [])):
        try:
            frames += [window] if (window.get_wm_class() or ("", ""))[1] == JAVA_FRAME else []
        except xerror.XError:  # gone while we looked (the splash)
            pass
    return frames


def test_debian_package_installed(platform):
    prepared = platform.build / "package-root"
    if not (prepared / "pristine/.ready").exists():
        pytest.skip("no minimal Debian 12 to install into: " + ((prepared / "not-ready").read_text().strip() if (prepared / "not-ready").exists()
                                                               else "tests/package/prepare-root.sh did not run"))
    root = DebianRoot(prepared, platform.display.name)
    try:
        shutil.copy(only(f"{PACKAGE}_*_amd64.deb"), root.path / "tmp/package.deb")
        (root.path / "root/Café.qz57").write_text("first\n")
        (root.path / "root/Zweites Dokument.qz57").write_text("second\n")

        # Its dependencies alone, on a minimal system: it installs, and the application starts headless.
        root.run("apt-get", "install", "-y", "--no-install-recommends", "/tmp/package.deb")
        headless = root.run(PACKAGE, "/root/Café.qz57", check=False, timeout=120)
        assert headless.returncode == 0 and "argument: /root/Café.qz57" in headless.stdout.splitlines(), headless
        root.run("apt-get", "purge", "-y", PACKAGE)

        # On a desktop: dpkg's triggers make the document type and the entry known, no script of ours.
        root.run("apt-get", "install", "-y", "libglib2.0-bin", "xdg-utils", "desktop-file-utils", "shared-mime-info")
        before = root.files()
        root.run("apt-get", "install", "-y", "/tmp/package.deb")
        assert root.run("xdg-mime", "query", "filetype", "/root/Café.qz57").stdout.strip() == DOCUMENT_TYPE
        assert root.run("xdg-mime", "query", "default", DOCUMENT_TYPE).stdout.strip() == f"{APP_ID}.desktop"

        # The desktop's own opener, twice: the first document starts the application, the second goes to its frame.
        output = root.path / "tmp/opened.txt"
        with open(output, "w") as opened:
            root.run("gio", "open", "/root/Café.qz57", display=True, stdout=opened, stderr=subprocess.STDOUT, capture_output=False)
            lines = lambda: output.read_text(errors="replace").splitlines()
            wait_for(lambda: "ready" in lines(), 60, "frame")
            # "ready" comes when Java has asked for its frame; the window manager takes it a moment later.
            assert "argument: /root/Café.qz57" in lines() and wait_for(lambda: java_frames(platform.display), 30, "frame managed")
            root.run("gio", "open", "/root/Zweites Dokument.qz57", display=True, stdout=opened, stderr=subprocess.STDOUT, capture_output=False)
            wait_for(lambda: "forwarded: /root/Zweites Dokument.qz57" in lines(), 60, "document handed to the running frame")
            assert len(java_frames(platform.display)) == 1, "the second document opened a second frame"
        if os.environ.get("QZ57_SCREENSHOT"):  # the README's picture
            subprocess.run(["import", "-display", platform.display.name, "-window", "root", os.environ["QZ57_SCREENSHOT"]], check=True)
        root.end_processes()

        # Removed, or installed again and purged: nothing of the package remains, the user's files are as they were.
        home = root.home()
        for removal in ("remove", "purge"):
            if removal == "purge":
                root.run("apt-get", "install", "-y", "/tmp/package.deb")
            root.run("apt-get", removal, "-y", PACKAGE)
            assert root.files() == before and root.home() == home, removal
            assert root.run("xdg-mime", "query", "default", DOCUMENT_TYPE).stdout.strip() == "", removal
    finally:
        root.close()


def registry(platform, key):  # {value name: data} of one key, None when it does not exist
    query = subprocess.run([platform.env["WINE"], "reg", "query", key], env=platform.env, capture_output=True, timeout=60)
    if query.returncode != 0:
        return None
    values = {}
    for line in query.stdout.decode("utf-8", "replace").splitlines():
        name, kind, data = (line.strip().split("    ") + ["", "", ""])[:3]
        if kind.startswith("REG_"):
            values["" if name == "(Default)" else name] = data
    return values


def test_windows_installer(platform):
    arch, exe = platform.name.split("-")[1], "QZ-Lumiscope_QZ-57.exe"
    setup = only(f"QZ-Lumiscope_QZ-57-*-setup-{arch}.exe")
    version = setup.name.split("-")[-3]
    # No pipes: what Wine starts on a program's behalf would hold them open.
    wine = lambda *args: subprocess.run([platform.env["WINE"], *map(str, args)], env=platform.env, stdin=subprocess.DEVNULL,
                                        stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, timeout=120)
    folder = platform.drive_c / "Program Files/QZ-Lumiscope QZ-57"
    shortcut = platform.drive_c / "ProgramData/Microsoft/Windows/Start Menu/Programs/QZ-Lumiscope QZ-57/QZ-Lumiscope QZ-57.lnk"
    classes, program_id = r"HKLM\Software\Classes", "QZLumiscope.QZ57Document"
    uninstall = r"HKLM\Software\Microsoft\Windows\CurrentVersion\Uninstall\QZ-Lumiscope QZ-57"
    installed = "C:\\Program Files\\QZ-Lumiscope QZ-57"

    # Silent, twice: the second installs over the first.
    for _ in range(2):
        assert wine(setup, "/S").returncode == 0
    assert sorted(p.name for p in folder.iterdir()) == [exe, "Uninstall.exe", "emu57.jar", "jre", "vm-script.txt"] and shortcut.exists()
    assert registry(platform, classes + r"\.qz57")[""] == program_id
    assert registry(platform, rf"{classes}\{program_id}\shell\open\command")[""] == f'"{installed}\\{exe}" "%1"'
    assert registry(platform, rf"{classes}\{program_id}\DefaultIcon")[""] == f"{installed}\\{exe},0"
    entry = registry(platform, uninstall)
    assert {k: entry.get(k) for k in ("DisplayName", "DisplayVersion", "Publisher", "DisplayIcon", "InstallLocation", "UninstallString",
                                      "QuietUninstallString", "NoModify", "NoRepair")} == {
        "DisplayName": "QZ-Lumiscope QZ-57", "DisplayVersion": version, "Publisher": "QZ", "DisplayIcon": f"{installed}\\{exe}",
        "InstallLocation": installed, "UninstallString": f'"{installed}\\Uninstall.exe"',
        "QuietUninstallString": f'"{installed}\\Uninstall.exe" /S', "NoModify": "0x1", "NoRepair": "0x1"}
    assert int(entry["EstimatedSize"], 16) > 0

    # A document opened through the shell's association reaches main; the log it writes is the user's.
    (platform.docs / conftest.LOG).parent.mkdir(parents=True, exist_ok=True)
    document = platform.docs / "Café.qz57"
    document.write_text("")
    assert wine("start", "/unix", document).returncode == 0
    record = folder / "vm-record.txt"
    wait_for(lambda: record.exists() and "end" in conftest.Record(record.read_bytes()).lines, 60, "main's return in vm-record.txt")
    assert conftest.Record(record.read_bytes()).args == [conftest.hexed("C:\\" + str(document.relative_to(platform.drive_c)).replace("/", "\\"))]
    wine("taskkill", "/F", "/IM", exe)  # it waits in its closing box
    record.unlink()

    # The uninstaller named in the entry takes away what the installer made, and only that.
    assert wine(folder / "Uninstall.exe", "/S").returncode == 0
    wait_for(lambda: not folder.exists(), 60, "removal of the installation folder")
    assert not shortcut.parent.exists() and platform.read_log() is not None
    for key in (classes + r"\.qz57", rf"{classes}\{program_id}", uninstall, r"HKLM\Software\QZ"):
        assert registry(platform, key) is None, key


test_debian_package_checks.only = test_debian_package_installed.only = "linux"
test_windows_installer.only = "wine"
