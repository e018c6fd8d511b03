#!/bin/sh
# The page of `secpolicy report` in Chromium; skipped where there is none.
set -eu
if ! command -v chromium >/dev/null; then
  echo "$0: skipped: chromium is not installed (scripts/install-deps test)" >&2
  exit 77
fi
exec pytest-3 -q -p no:cacheprovider "$(dirname "$0")"
