#!/usr/bin/env bash
# Lets the example's plug-in talk to its front end. Exits with 0 only if both succeed.
#
#   run_demo.sh FOLDER [--log] [--port PORT] [--access-token TEXT] [--emulator COMMAND]
#
# FOLDER holds the two programs. --log shows the library's log lines too. COMMAND is an emulator that
# runs the programs.
set -u

usage() {
  echo 'usage: run_demo.sh FOLDER [--log] [--port PORT] [--access-token TEXT] [--emulator COMMAND]' >&2
  exit 2
}

[ $# -ge 1 ] || usage
programs=$1
shift
emulator=()
front_end_options=()
plugin_options=()
log=
while [ $# -gt 0 ]; do
  case $1 in
    --log) log=shown && shift ;;
    --port) front_end_options+=("$1" "${2?--port takes a number}") && shift 2 ;;
    --access-token) plugin_options+=("$1" "${2?--access-token takes a text}") && shift 2 ;;
    --emulator) emulator=("${2?--emulator takes a command}") && shift 2 ;;
    *) usage ;;
  esac
done
[ -n "$log" ] || export DLOG_STANDIN_PRIORITY="${DLOG_STANDIN_PRIORITY:-S}"

scratch=$(mktemp -d) || exit 1
front_end=
cleanup() {
  [ -z "$front_end" ] || kill "$front_end" 2>/dev/null
  rm -rf "$scratch"
}
trap cleanup EXIT

"${emulator[@]}" "$programs/front_end" --scenario "${BASH_SOURCE[0]%/*}/day.scenario" \
  "${front_end_options[@]}" --port-file "$scratch/port" &
front_end=$!
while [ ! -e "$scratch/port" ]; do
  if ! kill -0 "$front_end" 2>/dev/null; then
    front_end=
    exit 1 # it has said why
  fi
  sleep 0.05
done

"${emulator[@]}" "$programs/plugin_session" "$(cat "$scratch/port")" "${plugin_options[@]}"
plugin_status=$?
wait "$front_end"
front_end_status=$?
front_end=
if [ "$plugin_status" -ne 0 ] || [ "$front_end_status" -ne 0 ]; then
  echo "demo: failed (plug-in $plugin_status, front end $front_end_status)" >&2
  exit 1
fi
