#!/usr/bin/python
# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

DOCUMENTATION = r'''
module: secpolicy_policy
short_description: Install a security policy, all of it or nothing
version_added: 1.0.0
description:
  - Installs a signed bundle as the policy of the host, in its files and at once; or the files of a directory, as they are.
  - What would change is asked first, by C(secpolicy load --plan). A policy with errors is refused then, and so is nothing changed.
  - Nothing is done where nothing would change.
  - A load that fails on the way leaves rules, objects and labels of files as they were.
options:
  src:
    description:
      - Directory on the host that holds the whole policy. Its files stay where they are and what they are, whatever becomes of the load.
      - Those of the host's own directory, which something else has written there, are what every boot installs.
      - Those of a directory elsewhere are installed until the next boot or load, and give objects, domains and labels of files only;
        partner domains and the policy of tardisks stay those of the host's own directory.
      - What takes the place of the host's own files, and gives them back when its load fails, is a I(bundle).
    type: path
    default: /etc/zorvan/secpolicy
  bundle:
    description:
      - File on the host that holds a signed policy, to be verified, to take the place of the files in C(/etc/zorvan/secpolicy), and
        to be installed. Those that were there are kept in C(/etc/zorvan/secpolicy.previous); when the load fails, they are put back.
      - One that is older than what the host has is refused.
    type: path
  key:
    description:
      - Files on the host with the public keys that may have signed the I(bundle).
      - Without any, those in C(/etc/secpolicy/bundle-keys).
    type: list
    elements: path
    default: []
  digest:
    description: The digest of the I(bundle), the SHA-256 of its manifest; another one is refused.
    type: str
  allow_older:
    description: Whether the I(bundle) may be older than what the host has, or be of another policy.
    type: bool
    default: false
  unfinished:
    description:
      - File on the host that says what is to follow a load of the I(bundle); it is written before the load.
      - Who has done that removes it. While it is there, what has begun is not finished, and the same I(bundle) is C(changed) again,
        with the domains that it has created and the bundle C(before) as they were told the first time.
    type: path
extends_documentation_fragment:
  - secpolicy.secpolicy.root
attributes:
  check_mode:
    description: Tells what would change, and changes nothing.
    support: full
  diff_mode:
    description: Shows domains, objects, rules and labels of files, and which bundle the files come from; of each side the first 1000 lines.
    support: full
notes:
  - The early policy, below C(early), is loaded by the next boot.
seealso:
  - module: secpolicy.secpolicy.secpolicy_level
author:
  - The libsecpolicy authors (@libsecpolicy)
'''

EXAMPLES = r'''
- name: Install a signed policy
  secpolicy.secpolicy.secpolicy_policy:
    bundle: /var/cache/web.bundle
    key: /etc/ssl/policy.pem

- name: Install what is in /etc/zorvan/secpolicy
  secpolicy.secpolicy.secpolicy_policy:
  notify: Restart what the policy confines

- name: Try a policy until the next boot
  secpolicy.secpolicy.secpolicy_policy:
    src: /var/cache/policy

- name: Go back to an older policy
  secpolicy.secpolicy.secpolicy_policy:
    bundle: /var/cache/old.bundle
    allow_older: true

- name: Show what would change
  secpolicy.secpolicy.secpolicy_policy:
    bundle: /var/cache/web.bundle
  check_mode: true
  diff: true
'''

RETURN = r'''
changes:
  description: What was changed, or would be.
  returned: success
  type: dict
  contains:
    domains_created:
      description: Names of the domains that are new.
      type: list
      elements: str
    domains_removed:
      description: Names of the domains that no file defines any more.
      type: list
      elements: str
    objects_added:
      description: How many object labels are new.
      type: int
    objects_removed:
      description: How many object labels are gone.
      type: int
    rules_added:
      description: How many rules are new.
      type: int
    rules_changed:
      description: How many rules say something else.
      type: int
    rules_removed:
      description: How many rules are gone.
      type: int
    files_labelled:
      description: How many files have another label.
      type: int
    edits_replaced:
      description: How many files that somebody has edited are replaced by those of the I(bundle).
      type: int
  sample:
    domains_created: [webDom]
    domains_removed: []
    objects_added: 1
    objects_removed: 0
    rules_added: 12
    rules_changed: 0
    rules_removed: 0
    files_labelled: 3
    edits_replaced: 0
replaced:
  description: Whether the files of the host's policy were replaced by those of the I(bundle), or would be.
  returned: success, or when the load has failed
  type: bool
before:
  description:
    - The bundle that they came from before, with C(name), C(serial), C(key) and C(digest), and how many of them were C(edited).
    - Null when they came from none.
  returned: success, or when the load has failed
  type: dict
  sample:
    name: web
    serial: 1
    key: 0123456789abcdef
    digest: 6b86b273ff34fce19d6b804eff5a3f5747ada4eaa22f1d49c01e52ddb7875b4b
    edited: 0
problems:
  description: What is wrong with the policy, or with the load, in the words of the command; the first hundred.
  returned: failure
  type: list
  elements: str
  sample:
    - "Error in parsing policy for domain: webDom: 3 : unknown system call 'opne'"
'''

from ansible.module_utils.basic import AnsibleModule
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.command import ROOT_ARGUMENT, CommandFailed, run_module
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import counts_of, diff_of
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.source import Bundle, Directory, identity
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.unfinished import Unfinished

HOST_POLICY = '/etc/zorvan/secpolicy'
SHOWN_PROBLEMS = 100


def install(module, command):
    status = command.ask('secpolicy.status/1', 'status')
    bundle = status['bundle']
    source = Bundle(module, command, bundle) if module.params['bundle'] else Directory(module, command)
    plan = source.plan()
    require_digest(module, plan)
    if plan['ending'] != 'done':
        module.fail_json(msg='the policy in {0} has errors, and nothing was changed'.format(source.name),
                         problems=plan['errors'][:SHOWN_PROBLEMS])
    needed = source.replaces or not plan['changesNothing'] or not is_loaded(status, source)
    result = dict(changed=needed, replaced=source.replaces, before=identity(bundle),
                  changes=dict(counts_of(plan), edits_replaced=len(source.edited)))
    begun = Unfinished(module, plan)
    begun.complete(result)
    if module._diff:
        result['diff'] = source.diff() + [diff_of(plan)]
    if not module.check_mode:
        begun.write(result)
        if needed:
            install_now(source, command, result)
    return result


def require_digest(module, plan):
    wanted = module.params['digest']
    if wanted and wanted != plan['bundle']['digest']:
        module.fail_json(msg='{0} is another bundle, and nothing was changed: its digest is {1}'.format(
            module.params['bundle'], plan['bundle']['digest']), problems=[])


def install_now(source, command, result):
    try:
        source.install()
    except CommandFailed as failure:
        replaced = identity(command.ask('secpolicy.status/1', 'status')['bundle']) != result['before']
        failure.result = dict(result, changed=replaced, replaced=replaced)
        raise


def is_loaded(status, source):
    """Whether the latest load did what it was to do; if not, status and monitoring tell of it until there is another."""
    if isinstance(source, Bundle):
        return status['bundle']['installed']
    return status['latestLoad'] is not None and status['latestLoad']['ending'] == 'done'


def main():
    module = AnsibleModule(
        argument_spec=dict(src=dict(type='path', default=HOST_POLICY), bundle=dict(type='path'), digest=dict(type='str'),
                           key=dict(type='list', elements='path', default=[], no_log=False),
                           allow_older=dict(type='bool', default=False), unfinished=dict(type='path'), **ROOT_ARGUMENT),
        mutually_exclusive=[('src', 'bundle')],
        required_by=dict(digest='bundle', unfinished='bundle'),
        supports_check_mode=True)
    run_module(module, install)


if __name__ == '__main__':
    main()
