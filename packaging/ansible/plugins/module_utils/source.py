# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

"""What a host's policy is installed from: a signed bundle, or files that are there already."""

from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import sides


class Directory:
    """Files that are installed where they are."""

    def __init__(self, module, command):
        self.command = command
        self.name = module.params['src']
        self.replaces = False
        self.edited = []

    def plan(self):
        return self.command.ask('secpolicy.plan/1', 'load', '--plan', operands=[self.name])

    def diff(self):
        return []

    def install(self):
        self.command.run('load', '--all-or-nothing', operands=[self.name])


class Bundle:
    """Files that take the place of the host's own; the command verifies them, and exchanges the directories."""

    def __init__(self, module, command, installed):
        self.command = command
        self.name = module.params['bundle']
        self.load = ['load', '--bundle=' + self.name] + ['--key=' + key for key in module.params['key']]
        if module.params['allow_older']:
            self.load.append('--allow-older')
        self.installed = installed
        self.offered = None
        self.edited = []

    def plan(self):
        plan = self.command.ask('secpolicy.plan/1', *self.load, '--plan')
        self.offered = plan['bundle']
        self.edited = self.offered['edited']
        return plan

    @property
    def replaces(self):
        """Whether the files of the host are others than those of this bundle."""
        return bool(self.edited) or not self.installed or self.installed.get('digest') != self.offered['digest']

    def diff(self):
        before = [told(self.installed)] + ['edited: ' + path for path in self.edited]
        return [sides('bundle', before, 'new bundle', [told(self.offered)])]

    def install(self):
        self.command.run(*self.load)


def told(bundle):
    if not bundle or 'problem' in bundle:
        return 'none'
    return '{name}, serial {serial}, signed by {key}'.format(**bundle)


def identity(bundle):
    """Which files the host has, as far as a bundle tells it."""
    if not bundle or 'problem' in bundle:
        return None
    return dict({word: bundle[word] for word in ('name', 'serial', 'key', 'digest')}, edited=len(bundle['edited']))
