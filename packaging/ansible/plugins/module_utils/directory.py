# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

"""A policy directory that takes the place of the host's own, and gives it back."""

import contextlib
import fcntl
import hashlib
import os
import shutil

from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import sides

HOST_POLICY = '/etc/zorvan/secpolicy'


class Directory:
    """The files of one directory, to become the host's policy, which is kept beside it then."""

    def __init__(self, module, command):
        self.command = command
        self.name = module.params['src'] or HOST_POLICY
        self.source = below(command.root, self.name)
        self.home = below(command.root, HOST_POLICY)
        self.next = self.home + '.next'
        self.replaced = self.home + '.replaced'
        self.previous = self.home + '.previous'
        self.before, self.after = self.changes()

    def replaces(self):
        """Whether the host gets other files."""
        return self.changed_files() > 0 or self.is_torn()

    def changed_files(self):
        return len(set(self.before) | set(self.after))

    def plan(self):
        # Of files that are the host's already the plan knows all parts of the policy.
        return self.command.ask('secpolicy.plan/1', 'load', '--plan', self.name if self.replaces() else HOST_POLICY)

    def diff(self):
        def lines(files):
            return ['{0} {1}'.format(digest[:16], path) for path, digest in sorted(files.items())]
        return sides('files of the policy', lines(self.before), 'files of the new policy', lines(self.after))

    def install(self):
        with self.taking_over():
            self.command.run('load', '--all-or-nothing')

    def is_home(self):
        return os.path.realpath(self.source) == os.path.realpath(self.home)

    def is_torn(self):
        """Whether a run was killed while it replaced the host's policy, which is elsewhere then."""
        return not self.is_home() and os.path.isdir(self.replaced)

    def changes(self):
        """The digests of the files that differ, as they are and as they will be."""
        if self.is_home():
            return {}, {}
        before, after = digests(self.replaced if self.is_torn() else self.home), digests(self.source)
        after.update({path: digest for path, digest in before.items() if is_of_tardisk(path) and path not in after})
        return missing_in(after, before), missing_in(before, after)

    @contextlib.contextmanager
    def taking_over(self):
        """The host's policy while the body runs, and from then on; when the body fails, the one before comes back."""
        if self.is_home():
            yield
            return
        os.makedirs(os.path.dirname(self.home), exist_ok=True)
        with locked(os.path.dirname(self.home)):
            self.give_back()
            self.prepare()
            try:
                if os.path.isdir(self.home):
                    os.rename(self.home, self.replaced)
                os.rename(self.next, self.home)
                yield
            except BaseException:
                if not os.path.isdir(self.next):
                    shutil.rmtree(self.home)
                self.give_back()
                raise
            self.keep_previous()

    def prepare(self):
        before, after = digests(self.home), digests(self.source)
        copy_whole(self.source, self.next)
        for path in before:
            if is_of_tardisk(path) and after.get(path, before[path]) == before[path]:
                self.keep(path)

    def keep(self, path):
        """The very file: a host knows by it which tardisk has brought it."""
        target = os.path.join(self.next, path)
        os.makedirs(os.path.dirname(target), mode=0o755, exist_ok=True)
        with contextlib.suppress(FileNotFoundError):
            os.unlink(target)
        os.link(os.path.join(self.home, path), target)

    def give_back(self):
        """Undoes what was begun: by this run, or by one that was killed."""
        shutil.rmtree(self.next, ignore_errors=True)
        if os.path.isdir(self.replaced):
            shutil.rmtree(self.home, ignore_errors=True)
            os.rename(self.replaced, self.home)

    def keep_previous(self):
        if os.path.isdir(self.replaced):
            shutil.rmtree(self.previous, ignore_errors=True)
            os.rename(self.replaced, self.previous)


def is_of_tardisk(path):
    """Whether it is among the policy that tardisks bring, which stays where a policy does not name it."""
    return path.startswith('tardisks/')


def below(root, path):
    return os.path.join(root, os.path.normpath('/' + path).lstrip('/'))


@contextlib.contextmanager
def locked(directory):
    """One run at a time; whoever comes second waits."""
    descriptor = os.open(directory, os.O_RDONLY | os.O_DIRECTORY)
    try:
        fcntl.flock(descriptor, fcntl.LOCK_EX)
        yield
    finally:
        os.close(descriptor)


def digests(directory):
    """The SHA-256 of each file by its path below the directory."""
    found = {}
    for place, _directories, names in os.walk(directory):
        for path in (os.path.join(place, name) for name in names):
            with open(path, 'rb') as file:
                found[os.path.relpath(path, directory)] = hashlib.sha256(file.read()).hexdigest()
    return found


def missing_in(others, files):
    return {path: digest for path, digest in files.items() if others.get(path) != digest}


def copy_whole(source, target):
    """Copies what a policy consists of, with the rights that a policy has, past a power cut."""
    for place, _directories, names in os.walk(source):
        directory = os.path.normpath(os.path.join(target, os.path.relpath(place, source)))
        os.mkdir(directory)
        os.chmod(directory, 0o755)
        for name in names:
            copy_file(os.path.join(place, name), os.path.join(directory, name))


def copy_file(source, target):
    with open(source, 'rb') as content, open(target, 'xb') as file:
        shutil.copyfileobj(content, file)
        os.fchmod(file.fileno(), 0o644)
        file.flush()
        os.fsync(file.fileno())
