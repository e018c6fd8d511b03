#!/bin/sh
# The page of `secpolicy report` in Chromium; skipped where there is none, or none that can run.
set -eu
if ! command -v chromium >/dev/null; then
  echo "$0: skipped: chromium is not installed (scripts/install-deps test)" >&2
  exit 77
fi
profile=$(mktemp -d)
trap 'rm -rf "$profile"' EXIT
if ! timeout 60 chromium --headless=new --no-sandbox --disable-gpu --disable-dev-shm-usage \
  --user-data-dir="$profile" --dump-dom about:blank >/dev/null 2>&1; then
  echo "$0: skipped: chromium does not run here" >&2
  exit 77
fi
pytest-3 -q -p no:cacheprovider "$(dirname "$0")"
