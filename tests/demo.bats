#!/usr/bin/env bats
# The demo as a user runs it.
load build

run_demo() {
  "$SOURCE/examples/run_demo.sh" "$BUILD/examples" ${EMULATOR:+--emulator "$EMULATOR"} "$@"
}

# Run once without the log and once with it.
setup_file() {
  cd "$BATS_FILE_TMPDIR" || exit
  unset DLOG_STANDIN_PRIORITY
  run_demo >out 2>err || fail "$(cat out err)"
  run_demo --log >/dev/null 2>log || fail "$(cat log)"
}

setup() { cd "$BATS_FILE_TMPDIR" || exit; }

# Each end on its own: which of two lines comes first is open where both print at once. All but the
# port and the clock, whose numbers have as many digits on every day.
said_by() {
  local before='(127\.0\.0\.1:|[a-z]+TimeMillis: |sentTime: |recorded at |clock says )'
  diff <(grep "$@" "$SOURCE/tests/demo_transcript.txt") \
    <(sed -E "s/${before}[-: 0-9]*[0-9]/\1.../" out | grep "$@")
}

@test "the plug-in says what the transcript has" { said_by '^plug-in: '; }
@test "the conversation is that of the transcript" { said_by -v '^plug-in: '; }
@test "lines fit a terminal of 80 columns" { LC_ALL=C.UTF-8 grep -E '.{81}' out | none; }
@test "the access token is not shown" { grep -h 'example-access-token' out err log | none; }

@test "the log is not shown unless it is asked for" {
  [ "$DLOG_STANDIN" = 1 ] || skip "a device's log service is its own matter"
  none <err
}

@test "a refused access token ends both programs and is not shown" {
  run -1 run_demo --access-token refused-token
  says 'demo: failed (plug-in 1, front end 1)'
  [[ $output != *refused-token* ]]
}

@test "a taken port ends the demo with advice" {
  ${EMULATOR:+"$EMULATOR"} "$BUILD/examples/front_end" --port-file port >first 3>&- &
  for _ in $(seq 200); do [ -e port ] || sleep 0.05; done
  front_end=$!
  run run_demo --port "$(cat port)"
  kill "$front_end"
  [ "$status" -ne 0 ]
  says "front_end: port $(cat port) is taken: choose another, or 0 for any that is free"
}

@test "the example without qel-message.h reads a reply and writes an answer" {
  DLOG_STANDIN_PRIORITY=S run -0 ${EMULATOR:+"$EMULATOR"} "$BUILD/examples/direct_calls"
  diff - <(printf '%s\n' 'reply to 7: ok' 'message 9 recorded at 5' 'answer of 2 bytes: 08 07') \
    <<<"$output"
}
