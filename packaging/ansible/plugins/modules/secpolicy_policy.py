#!/usr/bin/python
# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

DOCUMENTATION = r'''
module: secpolicy_policy
short_description: Install a security policy, all of it or nothing
version_added: 1.0.0
description:
  - Makes a policy the one that the host has, in its files and installed.
  - What would change is asked first, by C(secpolicy load --plan). A policy with errors is refused then, and so is nothing changed.
  - Nothing is done where nothing would change.
  - A load that fails on the way leaves rules, objects, labels of files, and the files of the policy as they were.
options:
  src:
    description:
      - Directory on the host that holds the whole policy.
      - The files of one that lies elsewhere than by default take the place of those in C(/etc/zorvan/secpolicy), which are kept
        as C(/etc/zorvan/secpolicy.previous). Of tardisks, which bring their own policy, what is not in I(src) stays.
      - Of the default directory, C(/etc/zorvan/secpolicy), which something else has written, the policy is installed.
    type: path
  bundle:
    description:
      - File on the host that holds a signed policy, to be verified, to take the place of the files in C(/etc/zorvan/secpolicy), and
        to be installed.
      - One that is older than what the host has is refused.
    type: path
  key:
    description:
      - Files on the host with the public keys that may have signed the I(bundle).
      - Without any, those in C(/etc/secpolicy/bundle-keys).
    type: list
    elements: path
    default: []
  allow_older:
    description: Whether the I(bundle) may be older than what the host has, or be of another policy.
    type: bool
    default: false
extends_documentation_fragment:
  - secpolicy.secpolicy.root
attributes:
  check_mode:
    description: Tells what would change, and changes nothing.
    support: full
  diff_mode:
    description: Shows domains, objects, rules, labels of files, and files of the policy; of each side the first 1000 lines.
    support: full
notes:
  - The early policy, below C(early), is loaded by the next boot.
  - Of a directory elsewhere the plan shows objects, domains and labels of files. That partner domains, early or tardisk policy
    change is told by the names of their files alone.
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

- name: Install the policy that was brought to /var/cache/policy
  secpolicy.secpolicy.secpolicy_policy:
    src: /var/cache/policy
  notify: Restart what the policy confines

- name: Install what is in /etc/zorvan/secpolicy
  secpolicy.secpolicy.secpolicy_policy:

- name: Go back to the policy before
  secpolicy.secpolicy.secpolicy_policy:
    src: /etc/zorvan/secpolicy.previous

- name: Show what would change
  secpolicy.secpolicy.secpolicy_policy:
    src: /var/cache/policy
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
    policy_files:
      description: How many files of the policy are new, changed or gone; of a I(bundle), how many edited ones are replaced.
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
    policy_files: 2
problems:
  description: What is wrong with the policy, or with the load, in the words of the command; the first hundred.
  returned: failure
  type: list
  elements: str
  sample:
    - "Error in parsing policy for domain: webDom: 3 : unknown system call 'opne'"
'''

from ansible.module_utils.basic import AnsibleModule
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.bundle import Bundle
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.command import ROOT_ARGUMENT, run_module
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.directory import HOST_POLICY, Directory
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import counts_of, diff_of

SHOWN_PROBLEMS = 100


def install(module, command):
    status = command.ask('secpolicy.status/1', 'status')
    policy = policy_of(module, command, status)
    plan = policy.plan()
    if plan['ending'] != 'done':
        module.fail_json(msg='the policy in {0} has errors, and nothing was changed'.format(policy.name),
                         problems=plan['errors'][:SHOWN_PROBLEMS])
    result = dict(changed=policy.replaces() or not plan['changesNothing'] or not loaded_well(status),
                  changes=dict(counts_of(plan), policy_files=policy.changed_files()))
    if module._diff:
        result['diff'] = [policy.diff(), diff_of(plan)]
    if result['changed'] and not module.check_mode:
        policy.install()
    return result


def policy_of(module, command, status):
    if module.params['bundle']:
        return Bundle(module, command, status)
    return Directory(module, command)


def loaded_well(status):
    """Whether the latest load did what it was to do; if not, monitoring tells of it until there is another."""
    return status['latestLoad'] is not None and status['latestLoad']['ending'] == 'done'


def main():
    module = AnsibleModule(
        argument_spec=dict(src=dict(type='path'), bundle=dict(type='path'),
                           key=dict(type='list', elements='path', default=[], no_log=False),
                           allow_older=dict(type='bool', default=False), **ROOT_ARGUMENT),
        mutually_exclusive=[('src', 'bundle')],
        supports_check_mode=True)
    run_module(module, install)


if __name__ == '__main__':
    main()
