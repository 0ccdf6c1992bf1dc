#!/usr/bin/env bash
# demo_test.sh CASE EXAMPLES: the demo as a user runs it, from the folder of its programs.
set -euo pipefail
unset DLOG_STANDIN_PRIORITY
demo=$(dirname "${BASH_SOURCE[0]}")/../examples/run_demo.sh
examples=$2
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

fail() {
  printf '%s\n' "$*" >&2
  head -n 50 "$scratch"/* >&2
  exit 1
}

run() { "$demo" "$examples" "$@" >"$scratch/out" 2>"$scratch/err"; }

case $1 in
  whole_session)
    run || fail 'the demo failed'
    # All but the port and the clock, whose numbers have as many digits on every day.
    sed -E 's/(127\.0\.0\.1:|currentTimeMillis: |sentTime: |recorded at |clock says ).*/\1.../' \
      "$scratch/out" | diff "$(dirname "${BASH_SOURCE[0]}")/demo_transcript.txt" - >&2 ||
      fail 'another conversation'
    ;;
  access_token_is_not_shown)
    run || fail 'the demo failed'
    ! grep -q 'example-access-token' "$scratch/out" "$scratch/err" || fail 'the access token shows'
    ;;
  log_is_shown)
    run || fail 'the demo failed'
    grep -q ' D MESSAGE_PLUGIN .* > \[[0-9]*\]chat_request_serialize: exit$' "$scratch/err" ||
      fail 'no log lines'
    ;;
  no_log)
    run --no-log || fail 'the demo failed'
    [ ! -s "$scratch/err" ] || fail 'log lines all the same'
    ;;
  wrong_token)
    ! run --access-token wrong || fail 'a wrong token is no failure'
    grep -qx 'demo: failed (plug-in 1, front end 1)' "$scratch/err" || fail 'other exit statuses'
    ;;
  taken_port)
    "$examples/front_end" --port-file "$scratch/port" >"$scratch/first" &
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
