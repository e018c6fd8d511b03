#!/usr/bin/env python3
"""forge_bundle.py BUNDLE KEY OTHER: writes beside BUNDLE what differs from it by one change each, CHANGE.bundle.
A changed manifest is signed with KEY again in signed-CHANGE.bundle, as are a policy with a fault and one that
lacks a needed domain; other.bundle is signed with OTHER."""

import hashlib
import json
import pathlib
import subprocess
import sys
import tarfile
import tempfile

source, key, other = sys.argv[1:]


class Bundle:
    """The entries of a bundle, to be changed."""

    def __init__(self):
        with tarfile.open(source) as archive:
            self.entries = [(member, archive.extractfile(member).read()) for member in archive]

    def add(self, name, content=b"", kind=tarfile.REGTYPE, target=""):
        member = tarfile.TarInfo(name)
        member.type, member.linkname = kind, target
        self.entries.append((member, content))

    def replace(self, index, old, new):
        member, content = self.entries[index]
        assert old in content
        self.entries[index] = member, content.replace(old, new, 1)

    def describe(self):
        """Makes the manifest that of the files."""
        member, text = self.entries[0]
        manifest = json.loads(text)
        manifest["files"] = [
            {"path": file.name.removeprefix("policy/"), "size": len(content), "sha256": hashlib.sha256(content).hexdigest()}
            for file, content in self.entries[2:]]
        self.entries[0] = member, json.dumps(manifest).encode()

    def sign(self, private_key):
        with tempfile.NamedTemporaryFile() as text:
            text.write(self.entries[0][1])
            text.flush()
            signature = subprocess.run(
                ["openssl", "pkeyutl", "-sign", "-rawin", "-inkey", private_key, "-in", text.name],
                check=True, capture_output=True).stdout
        self.entries[1] = self.entries[1][0], signature
        return self

    def write(self, name):
        archive = b""
        for member, content in self.entries:
            member.size = len(content)
            archive += member.tobuf(tarfile.USTAR_FORMAT) + content + bytes(-len(content) % 512)
        pathlib.Path(source).with_name(name + ".bundle").write_bytes(archive + bytes(1024))


CHANGES = {
    "file": lambda bundle: bundle.replace(2, b"r", b"R"),
    "extra": lambda bundle: bundle.add("policy/objects/zzz", b"newLabel\n"),
    "missing": lambda bundle: bundle.entries.pop(),
    "order": lambda bundle: bundle.add("policy/domains/aaa"),
    "parent": lambda bundle: bundle.add("policy/objects/../zzz"),
    "absolute": lambda bundle: bundle.add("/etc/zzz"),
    "elsewhere": lambda bundle: bundle.add("policy/zzz/zzz"),
    "link": lambda bundle: bundle.add("policy/objects/zzz", kind=tarfile.SYMTYPE, target="/etc/passwd"),
    "mode": lambda bundle: setattr(bundle.entries[-1][0], "mode", 0o755),
    "no-manifest": lambda bundle: bundle.entries.pop(0),
}
FAULTS = {
    "policy/domains/appDom": b"-s no_such_call grant\n",
    "policy/fileLabels/base": b"/no/such hostConfig\n",
}
POLICIES = {
    "fault": lambda entries: [(file, text + FAULTS.get(file.name, b"")) for file, text in entries],
    "stop": lambda entries: [(file, text) for file, text in entries if file.name != "policy/domains/ioFilterDom"],
}
MANIFESTS = {
    "name": (b'"name": "', b'"name": "not-'),
    "version": (b"secpolicy.bundle/1", b"secpolicy.bundle/2"),
    "another": (b"secpolicy.bundle/1", b"something/1"),
    "no-json": (b"{", b""),
    "no-serial": (b'"serial"', b'"cereal"'),
    "far-serial": (b'"serial": ', b'"serial": 9007199254740993, "first": '),
}

for name, change in CHANGES.items():
    bundle = Bundle()
    change(bundle)
    bundle.write(name)
for name, (old, new) in MANIFESTS.items():
    bundle = Bundle()
    bundle.replace(0, old, new)
    bundle.write(name)
    bundle.sign(key).write("signed-" + name)
for name, change in POLICIES.items():
    bundle = Bundle()
    bundle.entries = change(bundle.entries)
    bundle.describe()
    bundle.sign(key).write("signed-" + name)
Bundle().sign(key).write("same")
Bundle().sign(other).write("other")
