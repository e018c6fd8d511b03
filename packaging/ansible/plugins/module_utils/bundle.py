# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

"""A signed bundle that becomes the host's policy; the command verifies it, and replaces the files."""

from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import sides


class Bundle:
    def __init__(self, module, command, status):
        self.command = command
        self.name = module.params['bundle']
        self.load = ['load', '--bundle', self.name]
        for key in module.params['key']:
            self.load += ['--key', key]
        if module.params['allow_older']:
            self.load.append('--allow-older')
        self.installed = status.get('bundle')
        self.offered = None

    def plan(self):
        plan = self.command.ask('secpolicy.plan/1', *(self.load + ['--plan']))
        self.offered = plan['bundle']
        return plan

    def replaces(self):
        """Whether the files of the host are others than those of this bundle, or others are installed."""
        if not self.installed or self.offered['edited'] or not self.installed.get('installed'):
            return True
        return any(self.installed[word] != self.offered[word] for word in ('name', 'serial', 'key'))

    def changed_files(self):
        """Only those are known that somebody has edited; what they are replaced by is in the bundle."""
        return len(self.offered['edited'])

    def diff(self):
        before = [told(self.installed)] + ['edited: ' + path for path in self.offered['edited']]
        return sides('bundle', before, 'new bundle', [told(self.offered)])

    def install(self):
        self.command.run(*self.load)


def told(bundle):
    if not bundle or 'problem' in bundle:
        return 'none'
    return '{name}, serial {serial}, signed by {key}'.format(**bundle)
