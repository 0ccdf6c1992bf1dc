#!/usr/bin/env bash
# demo_test.sh CASE EXAMPLES [EMULATOR]: the demo as a user runs it, from the folder of its programs,
# which run in the emulator.
set -euo pipefail
unset DLOG_STANDIN_PRIORITY
demo=$(dirname "${BASH_SOURCE[0]}")/../examples/run_demo.sh
examples=$2
emulator=${3:-}
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

fail() {
  printf '%s\n' "$*" >&2
  head -n 50 "$scratch"/* >&2
  exit 1
}

run() { "$demo" "$examples" ${emulator:+--emulator "$emulator"} "$@" >"$scratch/out" 2>"$scratch/err"; }

case $1 in
  whole_session)
    run || fail 'the demo failed'
    # All but the port and the clock, whose numbers have as many digits on every day. Each end on its
    # own: which of two lines comes first is open where both print at once.
    sed -E 's/(127\.0\.0\.1:|[a-z]+TimeMillis: |sentTime: |recorded at |clock says )[-: 0-9]*[0-9]/\1.../' \
      "$scratch/out" >"$scratch/said"
    transcript=$(dirname "${BASH_SOURCE[0]}")/demo_transcript.txt
    diff <(grep '^plug-in: ' "$transcript") <(grep '^plug-in: ' "$scratch/said") >&2 ||
      fail 'the plug-in says something else'
    diff <(grep -v '^plug-in: ' "$transcript") <(grep -v '^plug-in: ' "$scratch/said") >&2 ||
      fail 'another conversation'
    ;;
  access_token_is_not_shown)
    run || fail 'the demo failed'
    ! grep -q 'example-access-token' "$scratch/out" "$scratch/err" || fail 'the access token shows'
    ! run --access-token refused-access-token || fail 'a wrong token is no failure'
    ! grep -q 'access-token' "$scratch/out" "$scratch/err" || fail 'a refused access token shows'
    ;;
  lines_fit_a_terminal)
    run || fail 'the demo failed'
    ! LC_ALL=C.UTF-8 grep -E '.{81}' "$scratch/out" >&2 || fail 'more than 80 columns'
    ;;
  log_is_shown_if_asked_for)
    run --log || fail 'the demo failed'
    grep -q ' D MESSAGE_PLUGIN .* > \[[0-9]*\]chat_request_serialize: exit$' "$scratch/err" ||
      fail 'no log lines'
    ;;
  log_is_not_shown)
    run || fail 'the demo failed'
    [ ! -s "$scratch/err" ] || fail 'log lines all the same'
    ;;
  every_function_is_called)
    run --log || fail 'the demo failed'
    functions=$(grep -v '^forward_stored_message_' \
      "$(dirname "${BASH_SOURCE[0]}")/../proto-lib/exported-functions.txt")
    for function in $functions; do
      grep -Eq "\]$function(:? start|: enter)$" "$scratch/err" || fail "$function was not called"
    done
    ;;
  wrong_token)
    ! run --access-token wrong || fail 'a wrong token is no failure'
    grep -qx 'demo: failed (plug-in 1, front end 1)' "$scratch/err" || fail 'other exit statuses'
    ;;
  taken_port)
    ${emulator:+"$emulator"} "$examples/front_end" --port-file "$scratch/port" >"$scratch/first" &
    for _ in $(seq 200); do [ -e "$scratch/port" ] || sleep 0.05; done
    status=0
    run --port "$(cat "$scratch/port")" || status=$?
    kill %1
    [ "$status" -ne 0 ] || fail 'a taken port is no failure'
    grep -qx "front_end: port $(cat "$scratch/port") is taken: choose another with --port, or leave --port out" \
      "$scratch/err" || fail 'another message'
    ;;
  *)
    fail "no such case: $1"
    ;;
esac
