#!/usr/bin/env python3
"""Boots archives that somebody hostile, or a broken disk, has made.

Each archive either boots, and the root then is what tar makes of it, or it is refused by name, and
neither the root nor anything beside it has changed. What is tried follows from the seed alone:

  hostile_archives.py COMMAND [--count N] [--seed N] [--only KIND] [--verbose]
  hostile_archives.py COMMAND --entries N [--directory DIR]   one archive of so many, with its cost
"""

import argparse
import bz2
import gzip
import io
import lzma
import os
import random
import resource
import shutil
import stat
import subprocess
import sys
import tarfile
import tempfile
import time

BLOCK = 512
WELL_KNOWN = ("globalVMDom", "ioFilterDom", "appDom", "daemonFrameworkDom")
IMAGE = "hostile.tar"

BOOTS, REFUSED, EITHER = "boots", "is refused", "boots or is refused"


# ---- Archives

def entry(name, kind=tarfile.REGTYPE, content=b"", target="", mode=None):
    info = tarfile.TarInfo(name)
    info.type = kind
    info.mode = mode if mode is not None else (0o755 if kind == tarfile.DIRTYPE else 0o644)
    info.linkname = target
    info.size = len(content)
    info.mtime = 1_000_000_000
    info.uid, info.gid = os.geteuid(), os.getegid()
    info.devmajor, info.devminor = 1, 3
    return info, content


def pack(entries, form=tarfile.PAX_FORMAT):
    """The archive up to its end mark and padding, and where each entry begins."""
    output = io.BytesIO()
    starts = []
    for info, content in entries:
        starts.append(output.tell())
        output.write(info.tobuf(form, "utf-8", "surrogateescape"))
        output.write(content + bytes(-len(content) % BLOCK))
    size = output.tell()
    output.write(bytes(2 * BLOCK))
    output.write(bytes(-output.tell() % 10240))
    return output.getvalue(), starts, size


def zstd(data):
    return subprocess.run(["zstd", "-q", "-c"], input=data, stdout=subprocess.PIPE, check=True).stdout


COMPRESSIONS = {
    "gzip": lambda data: gzip.compress(data, 6, mtime=0),
    "bzip2": bz2.compress,
    "xz": lzma.compress,
    "zstd": zstd,
}


def some_tree(chance):
    """Entries as an honest archive has them: directories, files, links and fifos of odd names."""
    entries = []
    places = [""]
    files = []
    for number in range(chance.randint(3, 12)):
        name = chance.choice(places) + chance.choice(("name", "n\u00e4me", "a b", "-x", "n" * 90)) + str(number)
        kind = chance.random()
        if kind < 0.25:
            entries.append(entry(name, tarfile.DIRTYPE, mode=chance.choice((0o755, 0o700, 0o555))))
            places.append(name + "/")
        elif kind < 0.7 or not files:
            content = chance.randbytes(chance.choice((0, 1, 511, 512, 513, 5000)))
            entries.append(entry(name, content=content, mode=chance.choice((0o644, 0o600, 0o755, 0o444))))
            files.append(name)
        elif kind < 0.8:
            entries.append(entry(name, tarfile.SYMTYPE, target=chance.choice(("name0", "/nowhere", "..", "x" * 120))))
        elif kind < 0.9:
            entries.append(entry(name, tarfile.LNKTYPE, target=chance.choice(files)))
        else:
            entries.append(entry(name, tarfile.FIFOTYPE))
    return entries


# ---- Kinds of archive: each answers its bytes and what has to become of them.

def whole(chance):
    form = chance.choice((tarfile.PAX_FORMAT, tarfile.GNU_FORMAT))
    data, _, _ = pack(some_tree(chance), form)
    name = chance.choice([None, *COMPRESSIONS])
    return (COMPRESSIONS[name](data) if name else data), BOOTS


def cut_at_block(chance):
    data, _, size = pack(some_tree(chance))
    kept = BLOCK * chance.randint(1, size // BLOCK + 1)
    name = chance.choice([None, *COMPRESSIONS])
    return (COMPRESSIONS[name](data[:kept]) if name else data[:kept]), REFUSED


def cut_anywhere(chance):
    data, _, _ = pack(some_tree(chance))
    packed = COMPRESSIONS[chance.choice(list(COMPRESSIONS))](data)
    return packed[:chance.randint(0, len(packed) - 1)], REFUSED


def flipped_bit_of_header(chance):
    data, starts, _ = pack(some_tree(chance), tarfile.GNU_FORMAT)
    changed = bytearray(data)
    # Its name, mode, owner, size or time; long names have their own entries before.
    changed[chance.choice(starts) + chance.randint(0, 147)] ^= 1 << chance.randint(0, 7)
    return bytes(changed), REFUSED


def flipped_bit(chance):
    data, _, size = pack(some_tree(chance))
    changed = bytearray(data)
    changed[chance.randint(0, size - 1)] ^= 1 << chance.randint(0, 7)
    return bytes(changed), EITHER


def flipped_bit_of_compressed(chance):
    data, _, _ = pack(some_tree(chance))
    changed = bytearray(COMPRESSIONS[chance.choice(list(COMPRESSIONS))](data))
    changed[chance.randint(0, len(changed) - 1)] ^= 1 << chance.randint(0, 7)
    # A bit that means nothing, such as the time in a gzip header.
    return bytes(changed), EITHER


def wrong_gzip_trailer(chance):
    changed = bytearray(COMPRESSIONS["gzip"](pack(some_tree(chance))[0]))
    changed[-chance.randint(1, 8)] ^= 1 << chance.randint(0, 7)
    return bytes(changed), REFUSED


def concatenated(chance):
    first, _, size = pack(some_tree(chance))
    second, _, _ = pack(some_tree(chance))
    way = chance.randint(0, 2)
    if way == 0:
        return first + second, REFUSED
    if way == 1:
        return first[:size + 2 * BLOCK] + second, REFUSED
    name = chance.choice(list(COMPRESSIONS))
    return COMPRESSIONS[name](first) + COMPRESSIONS[name](second), REFUSED


def followed(chance):
    data, _, _ = pack(some_tree(chance))
    rest = chance.choice((b"x", chance.randbytes(20), bytes(BLOCK) + b"x"))
    name = chance.choice([None, *COMPRESSIONS])
    return (COMPRESSIONS[name](data) + rest if name else data + rest), REFUSED


def zeros_between(chance):
    data, starts, _ = pack(some_tree(chance))
    place = chance.choice(starts)
    return data[:place] + bytes(BLOCK * chance.randint(1, 3)) + data[place:], REFUSED


def huge(chance):
    info, _ = entry("huge")
    info.size = chance.choice((1 << 33, 1 << 62, (1 << 63) - 1, 8_000_000))
    header = info.tobuf(chance.choice((tarfile.GNU_FORMAT, tarfile.PAX_FORMAT)))
    return header + chance.randbytes(4 * BLOCK) + bytes(2 * BLOCK), REFUSED


def hostile_entry(chance):
    link, hard, directory = tarfile.SYMTYPE, tarfile.LNKTYPE, tarfile.DIRTYPE
    bad = chance.choice((
        [entry("/absolute")], [entry("../outside/victim", content=b"owned")],
        [entry("a/../../outside/victim", content=b"owned")], [entry("..", directory)],
        [entry("out", link, target=".."), entry("out/outside/victim", content=b"owned")],
        [entry("up/victim", content=b"owned")], [entry("up/made", directory)],
        [entry("mine", hard, target="../outside/victim")], [entry("mine", hard, target="up/victim")],
        [entry("mine", hard, target="/etc/passwd")], [entry("mine", hard, target="there")],
        [entry("device", tarfile.CHRTYPE)], [entry("device", tarfile.BLKTYPE)],
        [entry("dev/null")], [entry("./run//secpolicy/host.db")], [entry("proc/file")], [entry("sys", link, target="x")],
        [entry("tardisks/more.tgz")], [entry("Tardisks/more.tgz")],
        [entry("etc/zorvan/secpolicy/domains/appDom")], [entry("etc/./zorvan//secpolicy/early/domains/appDom")],
        [entry("ETC/zorvan/SecPolicy/domains/appDom")], [entry("etc/zorvan/secpolicy/tardisks", link, target="/opt")],
        [entry("etc", link, target="opt")], [entry("etc/zorvan", directory, mode=0o777)],
        [entry("etc/zorvan/secpolicy", link, target="/opt")], [entry("policy/domains/appDom")],
        [entry("f"), entry("etc/zorvan", hard, target="f")],
        [entry("var/lib/secpolicy/config.db")], [entry("var/lib/secpolicy", directory, mode=0o700)],
        [entry("var", link, target="opt")], [entry("var/lib", directory, mode=0o775)],
        [entry("VAR/lib/secpolicy/saved/x.db")],
        [entry("n" * 256)], [entry("d/" * 2100 + "f")],
        [entry("file"), entry("file/below")], [entry("there/below")], [entry("sub")], [entry("sub", link, target="..")],
    ))
    entries = some_tree(chance)
    place = chance.randint(0, len(entries))
    form = chance.choice((tarfile.PAX_FORMAT, tarfile.GNU_FORMAT))
    return pack(entries[:place] + bad + entries[place:], form)[0], REFUSED


def odd_entry(chance):
    odd = chance.choice((
        [entry("./")], [entry("a//b/./c", content=b"text")], [entry("there", content=b"new")],
        [entry("dangling", content=b"new")], [entry("twice", content=b"one"), entry("twice", content=b"two")],
        [entry("leads", tarfile.SYMTYPE, target="there"), entry("leads", content=b"new")],
        [entry("l" * 255, content=b"text")], [entry("d/" * 300 + "f", content=b"deep")],
        [entry("policy/tardisks/hostile", content=b"")],
        [entry("f", content=b"f"), entry("g", tarfile.LNKTYPE, target="./f")],
        [entry("caf\udce9", content=b"not UTF-8")], [entry("line\nend", content=b"text")],
    ))
    if odd[0][0].name == "./":
        odd = [entry("./", tarfile.DIRTYPE, mode=0o700)]
    form = chance.choice((tarfile.PAX_FORMAT, tarfile.GNU_FORMAT))
    return pack(some_tree(chance) + odd, form)[0], BOOTS


def sparse(chance):
    with tempfile.TemporaryDirectory() as place:
        with open(os.path.join(place, "sparse"), "wb") as file:
            for _ in range(chance.randint(0, 5)):
                file.seek(chance.randint(0, 1 << 22))
                file.write(chance.randbytes(chance.randint(1, 5000)))
            file.truncate(chance.randint(1 << 22, 1 << 23))
        form = chance.choice((["--format=gnu"], ["--format=posix", "--sparse-version=" + chance.choice(("0.0", "0.1", "1.0"))]))
        data = subprocess.run(["tar", "--create", "--sparse", *form, "--directory", place, "sparse"],
                              stdout=subprocess.PIPE, check=True).stdout
    if chance.random() < 0.5:
        return data, BOOTS
    return data[:BLOCK * chance.randint(1, max(1, len(data.rstrip(b"\0")) // BLOCK))], REFUSED


KINDS = {kind.__name__.replace("_", "-"): kind for kind in (
    whole, cut_at_block, cut_anywhere, flipped_bit_of_header, flipped_bit, flipped_bit_of_compressed,
    wrong_gzip_trailer, concatenated, followed, zeros_between, huge, hostile_entry, odd_entry, sparse)}


# ---- The world in which they boot

def make_world(world):
    """A root with what an archive may stumble over, and beside it what it has no business with."""
    root = os.path.join(world, "root")
    for directory in ("run", "tardisks", "sub/below", "policy/tardisks", "etc/zorvan", "var/lib"):
        os.makedirs(os.path.join(root, directory))
    os.makedirs(os.path.join(world, "outside"))
    for directory in ("domains", "objects", "fileLabels"):
        os.makedirs(os.path.join(root, "policy", directory))
    for domain in WELL_KNOWN:
        write(os.path.join(root, "policy/domains", domain), b"")
    os.symlink("../../policy", os.path.join(root, "etc/zorvan/secpolicy"))
    write(os.path.join(root, "there"), b"old")
    write(os.path.join(world, "outside/victim"), b"untouched")
    os.symlink("../outside", os.path.join(root, "up"))
    os.symlink("../outside/missing", os.path.join(root, "dangling"))
    return root


def write(path, content):
    with open(path, "wb") as file:
        file.write(content)


def describe(top, left_out=()):
    """What lies below `top`, without what a boot makes of its own."""
    found = {}
    names = {}
    for directory, subdirectories, files in os.walk(os.fsencode(top)):
        where = os.path.relpath(directory, os.fsencode(top))
        subdirectories[:] = [name for name in subdirectories if os.path.normpath(os.path.join(where, name)) not in left_out]
        for name in subdirectories + files:
            path = os.path.join(directory, name)
            status = os.lstat(path)
            kind = stat.S_IFMT(status.st_mode)
            fact = (kind, status.st_mode if kind != stat.S_IFLNK else 0, status.st_uid)
            if kind == stat.S_IFREG:
                with open(path, "rb") as file:
                    fact += (file.read(), int(status.st_mtime) == 1_000_000_000)
            if kind == stat.S_IFLNK:
                fact += (os.readlink(path),)
            plain = os.path.normpath(os.path.join(where, name))
            found[plain] = fact
            if kind != stat.S_IFDIR:
                names.setdefault(status.st_ino, []).append(plain)
    return found, sorted(sorted(group) for group in names.values())


def difference(one, other):
    (files, groups), (other_files, other_groups) = one, other
    for path in sorted(files.keys() | other_files.keys()):
        if files.get(path) != other_files.get(path):
            return f"{path!r}: {str(files.get(path))[:200]} and {str(other_files.get(path))[:200]}"
    return "" if groups == other_groups else f"hard links: {groups} and {other_groups}"


OWN = (b"run", b"tardisks")


def boot(command, root):
    return subprocess.run([command, "--root", root, "boot"], capture_output=True, check=False)


def try_archive(command, data, expected, scratch):
    """What is wrong with what became of it, or nothing, and whether it booted."""
    world, twin = os.path.join(scratch, "world"), os.path.join(scratch, "twin")
    root, other = make_world(world), make_world(twin)
    write(os.path.join(root, "tardisks", IMAGE), data)
    write(os.path.join(scratch, "image"), data)
    try:
        run = boot(command, root)
        last = run.stderr.decode(errors="replace").rstrip("\n").rsplit("\n", 1)[-1]
        after = describe(root, OWN)
        beside = difference(describe(world, (b"root",)), describe(twin, (b"root",)))
        if beside:
            return f"beside the root: {beside}", run.returncode == 0
        if run.returncode == 0:
            if expected == REFUSED:
                return "it booted", True
            tar = subprocess.run(["tar", "--extract", "--file", os.path.join(scratch, "image"), "--directory", other,
                                  "--same-permissions", "--delay-directory-restore", "--warning=no-timestamp"],
                                 capture_output=True, check=False)
            if tar.returncode != 0:
                return "tar refuses it: " + tar.stderr.decode(errors="replace"), True
            return difference(after, describe(other, OWN)), True
        if expected == BOOTS:
            return "it was refused: " + last, False
        if run.returncode != 1 or not last.startswith(f"secpolicy: boot: Unable to unpack tardisk {IMAGE}: "):
            return f"ended with {run.returncode}: {last}", False
        return difference(after, describe(other, OWN)), False
    finally:
        for place in (world, twin):
            subprocess.run(["chmod", "-R", "u+rwX", place], check=False)
            shutil.rmtree(place)


def try_many(arguments):
    kinds = [arguments.only] if arguments.only else list(KINDS)
    failures, booted = 0, 0
    with tempfile.TemporaryDirectory(prefix="hostile-archives-") as scratch:
        for number in range(arguments.count):
            kind = kinds[number % len(kinds)]
            seed = f"{arguments.seed}-{number}-{kind}"
            data, expected = KINDS[kind](random.Random(seed))
            wrong, well = try_archive(arguments.command, data, expected, scratch)
            booted += well
            if arguments.verbose:
                print(seed, "booted" if well else "refused", flush=True)
            if wrong:
                failures += 1
                print(f"{seed}: {wrong}", flush=True)
    print(f"{arguments.count} archives: {booted} booted, {arguments.count - booted} refused, {failures} wrong")
    # All refused, or all booted, would prove little.
    enough = arguments.only or (booted > 0 and booted < arguments.count)
    return 0 if failures == 0 and enough else 1


def try_big(arguments):
    """One archive of very many entries, a thousand to a directory."""
    with tempfile.TemporaryDirectory(prefix="hostile-archives-", dir=arguments.directory) as scratch:
        root = make_world(os.path.join(scratch, "world"))
        with gzip.open(os.path.join(root, "tardisks/big.tgz"), "wb", 1) as image:
            for number in range(arguments.entries):
                info, content = entry(f"big/{number // 1000}/{number}", content=b"x")
                image.write(info.tobuf(tarfile.USTAR_FORMAT) + content + bytes(BLOCK - 1))
            image.write(bytes(2 * BLOCK))
        start = time.monotonic()
        run = boot(arguments.command, root)
        spent = time.monotonic() - start
        used = resource.getrusage(resource.RUSAGE_CHILDREN)
        there = sum(len(files) for _, _, files in os.walk(os.path.join(root, "big")))
        print(f"{arguments.entries} entries: {spent:.1f} s ({used.ru_utime:.1f} s user, {used.ru_stime:.1f} s system), "
              f"{used.ru_maxrss / 1024:.0f} MiB; {run.stderr.decode().strip()}")
        return 0 if run.returncode == 0 and there == arguments.entries else 1


def main():
    parser = argparse.ArgumentParser()
    parser.add_argument("command")
    parser.add_argument("--count", type=int, default=112)
    parser.add_argument("--seed", type=int, default=1)
    parser.add_argument("--only", choices=list(KINDS))
    parser.add_argument("--verbose", action="store_true")
    parser.add_argument("--entries", type=int)
    parser.add_argument("--directory")
    arguments = parser.parse_args()
    os.umask(0o022)
    sys.exit(try_big(arguments) if arguments.entries else try_many(arguments))


if __name__ == "__main__":
    main()
