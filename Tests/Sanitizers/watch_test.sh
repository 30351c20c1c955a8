#!/usr/bin/env bash
# Whether a test fails when a process that it starts has a defect, even when it looks neither at what that process says nor at how
# it ends.
#
#   watch_test.sh WATCH PROGRAM DEFECT...
set -euo pipefail
watch=$1 program=$2
shift 2

# shellcheck disable=SC2016 # the inner shell expands them
start() { "$watch" sh -c '"$0" "$1" 2>/dev/null; true' "$program" "$1" 2>&1; }

start none || { echo "A program without a defect has failed its test."; exit 1; }
for defect in "$@"; do
  if report=$(start "$defect"); then
    echo "Nobody was told of this defect: $defect."
    exit 1
  fi
  grep --quiet 'SUMMARY: .*Sanitizer' <<<"$report" || { echo "This defect was not described: $defect."; exit 1; }
done
