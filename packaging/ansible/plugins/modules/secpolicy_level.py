#!/usr/bin/python
# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

DOCUMENTATION = r'''
module: secpolicy_level
short_description: Set the enforcement level of domains
version_added: 1.0.0
description:
  - Gives domains that are installed a level, and stores it, so that it stays over loads and boots.
  - A domain that is permissive refuses nothing, and tells what it would refuse.
  - Programs that run already keep the level that they were started with.
options:
  domain:
    description: The domains.
    type: list
    elements: str
    required: true
  level:
    description: Their level.
    type: str
    required: true
    choices: [enforcing, permissive, disabled]
  stored:
    description:
      - Whether the level is stored, to stay over loads and boots.
      - If not, what is stored is forgotten, also of a domain that is not installed any more.
    type: bool
    default: true
  planned:
    description: Domains that are still to be installed, which have no level yet in check mode. Of any other domain it is told that there is none.
    type: list
    elements: str
    default: []
extends_documentation_fragment:
  - secpolicy.secpolicy.root
attributes:
  check_mode:
    description: Tells which domains would get another level, and gives none.
    support: full
  diff_mode:
    description: Shows the domains that get another level.
    support: full
author:
  - The libsecpolicy authors (@libsecpolicy)
'''

EXAMPLES = r'''
- name: Let a new domain tell what it would refuse
  secpolicy.secpolicy.secpolicy_level:
    domain: webDom
    level: permissive

- name: Refuse it
  secpolicy.secpolicy.secpolicy_level:
    domain: [webDom, mailDom]
    level: enforcing
  notify: Restart what the policy confines

- name: Forget the level of a domain that the policy has no more
  secpolicy.secpolicy.secpolicy_level:
    domain: oldDom
    level: enforcing
    stored: false
'''

RETURN = r'''
domains:
  description: The domains that got another level, or would get one.
  returned: success
  type: list
  elements: str
  sample: [webDom]
before:
  description: Of each of these, the C(level) that it had, and whether that was C(stored).
  returned: success, or when the command has failed on the way
  type: dict
  sample:
    webDom:
      level: permissive
      stored: true
problems:
  description: What went wrong, in the words of the command.
  returned: failure
  type: list
  elements: str
  sample: []
'''

from ansible.module_utils.basic import AnsibleModule
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.command import ROOT_ARGUMENT, CommandFailed, run_module
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import sides


def set_levels(module, command):
    domains, wanted = module.params['domain'], module.params['level']
    installed = installed_levels(command)
    stored = command.ask('secpolicy.settings/1', 'settings', 'list')['enforcement']
    known = set(installed).union(module.params['planned'] if module.check_mode else [])
    unknown = [domain for domain in domains if domain not in known]
    if unknown and module.params['stored']:
        module.fail_json(msg='not installed, so nothing was changed: ' + ', '.join(unknown), problems=[])
    changed = [domain for domain in domains if not has_level(module, installed.get(domain), stored.get(domain))]
    result = dict(changed=bool(changed), domains=changed, before={domain: before(domain, installed, stored) for domain in changed})
    if module._diff:
        result['diff'] = sides('levels', ['{0}: {1}'.format(domain, installed.get(domain, 'not installed')) for domain in changed],
                               'new levels', ['{0}: {1}'.format(domain, wanted) for domain in changed])
    if changed and not module.check_mode:
        try:
            give(command, [domain for domain in changed if domain in installed], wanted)
            if not module.params['stored']:
                forget(command, changed)
        except CommandFailed as failure:
            failure.result = dict(before=result['before'])
            raise
    return result


def installed_levels(command):
    by_level = command.ask('secpolicy.status/1', 'status')['domainsByLevel']
    return {domain: level for level, domains in by_level.items() for domain in domains}


def has_level(module, installed, stored):
    wanted = module.params['level']
    if module.params['stored']:
        return installed == stored == wanted
    return installed in (wanted, None) and stored is None


def before(domain, installed, stored):
    return dict(level=stored.get(domain, installed.get(domain)), stored=domain in stored)


def give(command, domains, level):
    for domain in domains:
        command.run('settings', 'enforcement', operands=[domain, level])
    command.run('restore')


def forget(command, domains):
    stored = command.ask('secpolicy.settings/1', 'settings', 'list')['enforcement']
    for domain in domains:
        if domain in stored:
            command.run('settings', 'unset', operands=['enforcement', domain])


def main():
    module = AnsibleModule(
        argument_spec=dict(domain=dict(type='list', elements='str', required=True),
                           level=dict(type='str', required=True, choices=['enforcing', 'permissive', 'disabled']),
                           stored=dict(type='bool', default=True),
                           planned=dict(type='list', elements='str', default=[]), **ROOT_ARGUMENT),
        supports_check_mode=True)
    run_module(module, set_levels)


if __name__ == '__main__':
    main()
