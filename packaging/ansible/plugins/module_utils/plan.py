# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

"""What the plan of a load says, in a size that a controller can take from thousands of hosts."""

# Of each side of a diff. A first policy may have 100,000 rules, and a controller keeps the result of each host.
SHOWN_LINES = 1000


def counts_of(plan):
    """How much a load changes; only domains, of which a host has few, are named."""
    rules, objects = plan['rules'], plan['objects']
    return dict(
        domains_created=plan['domains']['create'],
        domains_removed=plan['domains']['remove'],
        objects_added=len(objects['add']),
        objects_removed=len(objects['remove']),
        rules_added=len(rules['add']),
        rules_changed=len(rules['change']),
        rules_removed=len(rules['remove']),
        files_labelled=len(plan['labels']),
    )


def diff_of(plan):
    """The two sides of what changes, for Ansible to compare."""
    rules, objects = plan['rules'], plan['objects']
    before = ['domain ' + name for name in plan['domains']['remove']]
    after = ['domain ' + name for name in plan['domains']['create']]
    before += ['object ' + name for name in objects['remove']]
    after += ['object ' + name for name in objects['add']]
    before += ['{domain}: {before}'.format(**rule) for rule in rules['change']]
    after += ['{domain}: {after}'.format(**rule) for rule in rules['change']]
    before += ['{domain}: {rule}'.format(**rule) for rule in rules['remove']]
    after += ['{domain}: {rule}'.format(**rule) for rule in rules['add']]
    before += ['label of {path}: {before}'.format(**label) for label in plan['labels']]
    after += ['label of {path}: {after}'.format(**label) for label in plan['labels']]
    return sides('installed policy', before, 'new policy', after)


def sides(before_header, before, after_header, after):
    return dict(before_header=before_header, before=text_of(before), after_header=after_header, after=text_of(after))


def text_of(lines):
    shown = lines[:SHOWN_LINES]
    if len(lines) > len(shown):
        shown.append('[{0} more]'.format(len(lines) - len(shown)))
    return ''.join(line + '\n' for line in shown)
