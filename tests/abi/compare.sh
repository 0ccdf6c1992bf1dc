#!/usr/bin/env bash
# compare.sh BASELINES NOW VERSION: says in words what the author of a plug-in has to do for the library NOW, a
# description, that was built with the newest release before VERSION of those in the folder BASELINES. Fails if
# VERSION, which the library is to have, does not tell.
set -euo pipefail
baselines=$1
now=$2
version=$3
release=''
for folder in $(printf '%s\n' "$baselines"/*.*.*/ | sort -V); do
  ! dpkg --compare-versions "$(basename "$folder")" lt "$version" || release=$(basename "$folder")
done
if [ -z "$release" ]; then
  echo 'There is no release before.'
  exit
fi

status=0
report=$(abidiff "$baselines/$release/$(basename "$now")" "$now" 2>&1) || status=$?
show_report() { printf '%s\n' "$report"; }
if [ $((status & 3)) -ne 0 ] || grep -q 'error :' <<<"$report"; then
  show_report >&2
  exit 1
fi

# functions LETTER: those that abidiff reports as added, changed or deleted.
functions() { grep -oP "^ *\[$1\] '(function|method) [^(]*?\K\w+(?=\()" <<<"$report" | paste -sd ' ' || true; }

# number FIELD VERSION
number() { cut -d. -f"$1" <<<"${2%%[+~]*}"; }

# too_low WHICH: the version has to tell, and does not.
too_low() {
  echo "The version $version does not say so: raise its $1 number."
  exit 1
}

changed=$(functions C)
gone=$(functions D)
new=$(functions A)
major=$(($(number 1 "$version") - $(number 1 "$release")))
minor=$(($(number 2 "$version") - $(number 2 "$release")))

if [ -n "$changed$gone" ] || [ "$major" -gt 0 ]; then
  echo "Every plug-in that was built with $release has to be compiled anew, with the new header."
  [ -z "$changed" ] || echo "Changed, in themselves or in a record: $changed"
  [ -z "$gone" ] || echo "Gone, so that plug-ins that call them have to change: $gone"
  [ -z "$new" ] || echo "New: $new"
  [ "$status" -eq 0 ] || show_report
  [ "$major" -gt 0 ] || too_low first
elif [ -n "$new" ]; then
  echo "A plug-in that was built with $release runs as it is. One that calls a new function needs $version"
  echo "or later: $new"
  [ "$minor" -gt 0 ] || too_low second
elif [ "$status" -ne 0 ]; then
  echo "What this means for plug-ins is not known:"
  show_report
  exit 1
else
  echo "A plug-in that was built with $release runs as it is."
fi
echo 'Modules that use the exported classes have to be compiled anew for each version.'
