#!/usr/bin/env bash
# leaks.sh ROOT: lists lines under ROOT that carry a path of somebody's machine or the address of a package registry.
# Those belong to the machine's configuration. Exit status 1 when there is one.
set -euo pipefail
cd "$1"

# The letter in brackets keeps this file from finding itself.
home='(^|[^[:alnum:]_./-])/([r]oot|[h]ome/[a-z]+|[w]ork|[U]sers/[A-Za-z]+)(/|\b)'
address='[a-z]+://[^[:space:]"<>]*([r]egistry|[m]irror|[a]rtifact|[p]roxy|deb\.[d]ebian|[n]pmjs|[p]ypi)'
lock='"[r]esolved": *"'

skipped=(--exclude-dir={build,demo-out,tutorial,.git,.cache,.idea,.vscode} --exclude=.git)
if grep -rnIE "${skipped[@]}" "$home|$address|$lock" .; then
  exit 1
fi
