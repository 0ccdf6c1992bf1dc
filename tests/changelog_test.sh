#!/usr/bin/env bash
# changelog_test.sh CASE SOURCE VERSION: what CHANGELOG.md says of versions, against the project's.
set -euo pipefail
changes=$2/CHANGELOG.md

case $1 in
  newest_version_is_the_projects)
    newest=$(sed -nE 's/^## \[([0-9.]+)\] - [0-9]{4}-[0-9]{2}-[0-9]{2}$/\1/p' "$changes" | head -n 1)
    [ "$newest" = "$3" ] || { echo "The newest version in CHANGELOG.md is '$newest', CMakeLists.txt has $3." >&2 && exit 1; }
    ;;
  unreleased_changes_come_first)
    first=$(grep -m 1 '^## ' "$changes")
    [ "$first" = '## [Unreleased]' ] || { echo "CHANGELOG.md begins with '$first'." >&2 && exit 1; }
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
