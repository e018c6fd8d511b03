# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

"""What is to follow a load, kept on the host until it is done: a play may be stopped at any moment."""

import json
import os


class Unfinished:
    """What a run has begun with the bundle of this plan. Without a file for it, nothing is kept."""

    def __init__(self, module, plan):
        name = module.params['unfinished']
        self.path = name and module.params['root'].rstrip('/') + '/' + name.lstrip('/')
        self.digest = name and plan['bundle']['digest']

    def complete(self, result):
        """Adds to the result what a run that was not finished has done."""
        begun = self.read()
        if not begun or begun['digest'] != self.digest:
            return
        created = result['changes']['domains_created']
        created += [domain for domain in begun['domains_created'] if domain not in created]
        result.update(changed=True, replaced=result['before'] != begun['before'] or result['replaced'], before=begun['before'])

    def read(self):
        if not self.path or not os.path.exists(self.path):
            return None
        with open(self.path) as file:
            return json.load(file)

    def write(self, result):
        if not self.path:
            return
        begun = dict(digest=self.digest, domains_created=result['changes']['domains_created'], before=result['before'])
        with open(self.path + '.new', 'w') as file:
            json.dump(begun, file)
            file.flush()
            os.fsync(file.fileno())
        os.rename(self.path + '.new', self.path)
