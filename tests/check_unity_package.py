#!/usr/bin/env python3
"""Checks the Unity package as the Package Manager and the Editor would take it.

usage: check_unity_package.py COMMITTED PACKAGE VERSION BINDING LIBRARY...
  COMMITTED  bindings/csharp/unity/, the package's committed files and .meta files
  PACKAGE    a laid-out package folder, or the release's com.orvane.sdk-VERSION.tgz
  LIBRARY    each library the package must hold a copy of (from the build, or the archives)
"""
import json, os, re, sys, tarfile, tempfile

PLATFORMS = ["Editor", "LinuxStandalone64", "WindowsStandalone64"]
# Per library: the platforms its importer enables, with their settings; every other one is off.
PLUGINS = {"OrvaneSDK.dll": {"Editor: Editor": "CPU: x86_64 DefaultValueInitialized: true OS: Windows",
                             "Standalone: Win64": "CPU: x86_64"},
           "libOrvaneSDK.so": {"Editor: Editor": "CPU: x86_64 DefaultValueInitialized: true OS: Linux",
                               "Standalone: Linux64": "CPU: x86_64"}}


def fail(what):
    sys.exit("FAILED: the Unity package: " + what)


def read(path):
    with open(path, "rb") as f:
        return f.read()


def check_tarball(path, version):
    """npm pack's layout, reproducible: package/ at the root, sorted, 0:0, fixed modes, one time."""
    if os.path.basename(path) != "com.orvane.sdk-%s.tgz" % version or read(path)[4:8] != bytes(4):
        fail(path + ": its name, or a time in its gzip header")
    with tarfile.open(path) as tar:
        members = tar.getmembers()
        rows = {(m.name.split("/")[0], m.mode == (0o755 if m.isdir() else 0o644) and m.isreg() != m.isdir(),
                 m.uid, m.gid, m.uname + m.gname, m.mtime) for m in members}
        if len(rows) != 1 or next(iter(rows))[:5] != ("package", True, 0, 0, ""):
            fail("tarball members not package/..., files 0644 and folders 0755 of 0:0, one time: %s"
                 % sorted(rows))
        names = [m.name for m in members]  # as tar --sort=name gives them: by name within each folder
        if names != sorted(names, key=lambda name: name.split("/")):
            fail("tarball members not sorted")
        folder = tempfile.mkdtemp()
        tar.extractall(folder, **({"filter": "data"} if hasattr(tarfile, "data_filter") else {}))
    return os.path.join(folder, "package")


def platform_data(meta):
    """The importer's platformData as {'Editor: Editor': (enabled, 'settings as one line')}."""
    entries = re.findall(r"  - first:\n      (.*)\n    second:\n      enabled: (\d)\n      settings:"
                         r"( \{\}|(?:\n        .*)*)", meta)
    return {key: (enabled, " ".join(settings.split())) for key, enabled, settings in entries}


def check_plugin(name, meta):
    data, enabled = platform_data(meta), PLUGINS[name]
    got = {key: settings for key, (on, settings) in data.items() if on == "1"}
    if got != enabled:
        fail("%s is enabled for %s, not %s" % (name, got, enabled))
    for key, (on, settings) in data.items():
        if key == ": Any":  # the exclusions, used only when Any Platform is on, agree with the choice
            excluded = {p for p, x in re.findall(r"Exclude (\w+): (\d)", settings) if x == "1"}
            wanted = {k.split(": ")[1] for k in data if k.startswith("Standalone") and k not in enabled}
            if excluded != wanted:
                fail("%s excludes %s from Any Platform, not %s" % (name, excluded, wanted))
        elif on == "0" and key.startswith("Standalone") and settings != "CPU: None":
            fail("%s: %s is off with %s" % (name, key, settings))


def main(committed, package, version, binding, *libraries):
    if package.endswith(".tgz"):
        package = check_tarball(package, version)
    guids = {}
    for folder, dirs, files in os.walk(committed):
        for name in files:
            if name.endswith(".meta"):
                path = os.path.join(folder, name)
                guid = re.search(r"^fileFormatVersion: 2\nguid: ([0-9a-f]{32})\n", read(path).decode())
                if not guid or guids.setdefault(guid.group(1), path) != path:
                    fail(path + ": no GUID of its own")
                if name[:-5] in PLUGINS:
                    check_plugin(name[:-5], read(path).decode())
    for folder, dirs, files in os.walk(package):
        for name in dirs + files:
            path = os.path.join(folder, name)
            relative = os.path.relpath(path, package)
            if name.endswith(".meta"):  # it has its asset, and is the committed file
                if not os.path.exists(path[:-5]) or read(path) != read(os.path.join(committed, relative)):
                    fail(relative + " has no asset or differs from the committed one")
            elif not name.endswith("~") and not relative.startswith("Documentation~"):
                if not os.path.exists(path + ".meta"):
                    fail(relative + " has no .meta")
    for asmdef in "Runtime/Orvane.SDK.asmdef", "Samples~/SessionRecorder/Orvane.SDK.Sample.asmdef":
        if sorted(json.loads(read(os.path.join(package, asmdef)))["includePlatforms"]) != PLATFORMS:
            fail(asmdef + " is compiled for other platforms than " + " ".join(PLATFORMS))
    manifest = json.loads(read(os.path.join(package, "package.json")))
    linked = [manifest[key] for key in ("documentationUrl", "changelogUrl", "licensesUrl") if key in manifest]
    linked += [sample["path"] for sample in manifest.get("samples", [])]
    if (manifest["name"], manifest["version"]) != ("com.orvane.sdk", version) or \
            not re.fullmatch(r"\d+\.\d+\.\d+", version) or not re.fullmatch(r"\d{4}\.\d+", manifest["unity"]) or \
            not manifest["displayName"] or not manifest["description"] or \
            not all(os.path.exists(os.path.join(package, path)) for path in linked):
        fail("package.json: %s" % manifest)
    plugins = os.path.join(package, "Runtime/Plugins/x86_64")
    copies = {re.sub(r"(\.so)\.[\d.]+$", r"\1", os.path.basename(path)): read(path) for path in libraries}
    held = {name: read(os.path.join(plugins, name)) for name in os.listdir(plugins) if not name.endswith(".meta")}
    if held != copies or read(os.path.join(package, "Runtime/OrvaneSDK.cs")) != read(binding):
        fail("its libraries %s or its binding are not the copies of %s" % (sorted(held), (binding,) + libraries))

if __name__ == "__main__":
    main(*sys.argv[1:])
