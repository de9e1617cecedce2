# SPDX-License-Identifier: MIT
# shellcheck shell=bash disable=SC2034,SC2154
# Sourced by scripts that have a folder $work: checks that are counted.
failed=0

# check WHAT COMMAND...: runs it; when it fails, shows what it printed and goes on.
check() {
  local what=$1
  shift
  if "$@" >"$work/output" 2>&1; then
    echo "ok: $what"
  else
    echo "NOT OK: $what" >&2
    cat "$work/output" >&2
    failed=1
  fi
}
