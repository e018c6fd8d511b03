#!/bin/bash
# neovim.sh: opens a policy in Neovim as a person does who has set it up by examples/editors, and acts.
# SECPOLICY names the command.
set -euo pipefail
source=$(cd "$(dirname "$0")/../.." && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

mkdir -p "$work/r/etc/zorvan" "$work/r/usr/share"
cp -r "$source/examples/broken" "$work/r/etc/zorvan/secpolicy"
export HOME=$work XDG_STATE_HOME=$work/state XDG_DATA_HOME=$work/data XDG_CACHE_HOME=$work/cache
export POLICY=$work/r/etc/zorvan/secpolicy
timeout 120 nvim --headless --clean \
  --cmd "set runtimepath^=$source/examples/editors/vim" \
  --cmd "let g:secpolicy_command = '$SECPOLICY' | let g:secpolicy_root = '$work/r'" \
  --cmd "let g:secpolicy_options = ['--fresh']" \
  -S "$source/examples/editors/nvim/secpolicy.lua" -S "$source/tests/lsp/neovim.lua"
# The command finds in the saved files what the editor has shown.
"$SECPOLICY" --root "$work/r" check --fresh --errors-only
grep -q '^httpProgram' "$POLICY/objects/base"
