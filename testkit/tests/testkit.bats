#!/usr/bin/env bats
# The program qel-testkit. SOURCE is the repository, BUILT the folder of the program, EXAMPLES that of
# the demo's programs, RECORDER the recorder, EMULATOR what runs them, if this machine does not.
# shellcheck disable=SC2034,SC2154 # variables of bats
bats_require_minimum_version 1.5.0
BATS_PRINT_OUTPUT_ON_FAILURE=1
export LC_ALL=C DLOG_STANDIN_PRIORITY=S

setup() { cd "$BATS_TEST_TMPDIR" || exit; }

testkit() { ${EMULATOR:+"$EMULATOR"} "$BUILT/qel-testkit" "$@"; }

# serve OPTION...: lets the demo's plug-in talk to the program. Its report goes to the file report,
# what the plug-in says to the file said.
serve() {
  local served=0 line port
  coproc TESTKIT { exec ${EMULATOR:+"$EMULATOR"} "$BUILT/qel-testkit" --listen 0 --timeout 5 "$@" 2>report 3>&-; }
  local pid=$TESTKIT_PID
  read -r line <&"${TESTKIT[0]}"
  port=${line##*:}
  env "${plugin_environment[@]}" ${EMULATOR:+"$EMULATOR"} "$EXAMPLES/plugin_session" "$port" --timeout 2 \
    "${plugin_options[@]}" >said 2>&1 || true
  wait "$pid" || served=$?
  return "$served"
}

# listen SCENARIO: lets this shell be the plug-in, which sends and receives by the descriptor $plugin.
listen() {
  local line
  echo "world { isSignedIn: true } $1" >scenario
  coproc TESTKIT {
    exec ${EMULATOR:+"$EMULATOR"} "$BUILT/qel-testkit" --listen 0 --timeout 2 --scenario scenario \
      2>report 3>&-
  }
  served=$TESTKIT_PID
  read -r line <&"${TESTKIT[0]}"
  exec {plugin}<>"/dev/tcp/127.0.0.1/${line##*:}"
}

# ends_with STATUS: the program that 'listen' has begun.
ends_with() {
  local ended=0
  wait "$served" || ended=$?
  [ "$ended" -eq "$1" ]
}

# ask_for_time TIMES: the plug-in's request.
ask_for_time() {
  local id
  for id in $(seq "$1"); do printf '\22CurrentTimeRequest\0\0\0\2X%b' "\\x$id" >&"$plugin"; done
}

# record FILE OPTION...: serve, with a session file of the demo's plug-in, by the recorder.
record() {
  [ -e "$RECORDER" ] || skip 'there is no recorder'
  local plugin_environment=("${EMULATOR:+QEMU_SET_ENV=}LD_PRELOAD=$RECORDER" QEL_TRACE_FILE="$1")
  serve "${@:2}"
}

record_demo() {
  record session --scenario "$SOURCE/examples/day.scenario"
  mv said demo
}

@test "lines: what is due comes first, and then when there is more" {
  echo 'world { isSignedIn: true } push ClientEcho { requestId: 5 }' >scenario
  run --separate-stderr -0 testkit --scenario scenario <<<'ClientEchoReply 0805'
  diff - <(printf '%s\n' 'ClientEcho 0805' 'next never' 'next never') <<<"$output"
}

@test "lines: time passes as the test says" {
  printf '%s\n' 'world { isSignedIn: true }' 'expect CurrentTimeRequest' \
    'answer CurrentTimeReply after 5s' >scenario
  run --separate-stderr -0 testkit --scenario scenario <<'TXT'
CurrentTimeRequest 5807
wait 4999
wait 1
TXT
  diff - <(printf '%s\n' 'next never' 'next 5000' 'next 1' 'CurrentTimeReply 5807' 'next never') \
    <<<"$output"
}

@test "lines: the report goes to standard error, and the status is 1" {
  echo 'world { isSignedIn: true } push ClientEcho' >scenario
  run --separate-stderr -1 testkit --scenario scenario <<'TXT'
ClientEchoReply 0805
TXT
  [[ $stderr == *'Message 1 of the plug-in, a ClientEchoReply, is wrong: it answers nothing'* ]]
}

@test "lines that mean nothing end it with status 2" {
  for line in 'ChatRequest 0' 'ChatRequest xx' 'wait long' 'wait -1' 'wait' 'ChatRequest 08 07'; do
    run -2 testkit <<<"$line"
  done
}

@test "lines: a control character is part of none" {
  for line in 'wait 1\0' 'wait\t1' 'wait 1\r' 'ChatRequest\0 08'; do
    # shellcheck disable=SC2059 # its escapes are meant
    printf "$line\n" >lines
    run -2 testkit <lines
  done
}

@test "lines: a problem has its line's number" {
  run --separate-stderr -2 testkit <<<$'wait 1\n\nwait long'
  [ "$stderr" = 'qel-testkit: line 3: no number of milliseconds' ]
}

@test "lines: a blank one is ignored" {
  run --separate-stderr -0 testkit <<<$'\n  '
  [ "$output" = 'next never' ]
}

@test "lines: the last one needs no end" {
  run --separate-stderr -0 testkit < <(printf 'wait 1')
  diff - <(printf '%s\n' 'next never' 'next never') <<<"$output"
}

@test "lines: none is read if there is nothing to play" {
  echo 'expekt' >scenario
  { testkit --scenario scenario 2>report || cat; } <<<'wait 1' >output
  diff - output <<<'wait 1'
}

@test "wrong calls end it with status 2" {
  echo 'strict' >scenario
  for options in '--scenario' '--unknown x' '--listen x' '--scenario scenario --replay scenario' \
    '--scenario none' '--scenario .' '--listen 0 --timeout 0' '--timeout 1' '--ignore title' 'word'; do
    # shellcheck disable=SC2086 # several words
    run -2 testkit $options </dev/null
  done
}

@test "the empty name is that of no file" {
  for option in --scenario --replay; do
    run -2 testkit "$option" '' </dev/null
  done
}

@test "a scenario with a byte of 0 is refused" {
  printf 'strict\0expekt' >scenario
  run -1 testkit --scenario scenario </dev/null
  [ "$output" = 'qel-testkit: scenario is no text: a byte is 0' ]
}

@test "a text that is no scenario ends it with status 1, also before anybody connects" {
  echo 'expekt' >scenario
  run -1 testkit --scenario scenario --listen 0 </dev/null
  [[ $output == *'The scenario cannot be read: line 1, column 1: '* ]]
}

@test "TCP: the demo's plug-in goes through the demo's scenario" {
  serve --scenario "$SOURCE/examples/day.scenario"
  grep -x 'plug-in: session complete' said
}

@test "TCP: what went wrong is reported" {
  plugin_options=(--access-token wrong-token)
  run -1 serve --scenario "$SOURCE/examples/day.scenario"
  grep 'it has another access token than the service' report
  run ! grep wrong-token report
}

@test "TCP: a late answer comes" {
  sed '/^expect ChannelAuthRequest/a answer after 200ms' "$SOURCE/examples/day.scenario" >scenario
  serve --scenario scenario
  grep -x 'plug-in: session complete' said
}

@test "TCP: a plug-in that says no more when the scenario is over need not close the connection" {
  listen 'expect CurrentTimeRequest'
  ask_for_time 1
  ends_with 0
}

@test "TCP: what is missing when the plug-in falls silent is reported, and nothing else" {
  listen 'expect CurrentTimeRequest'
  ends_with 1
  diff - report <<<'Line 1 expects a CurrentTimeRequest, which never came.'
}

@test "TCP: what is due is waited for, beyond the time of silence too" {
  listen 'expect CurrentTimeRequest answer after 2500ms'
  ask_for_time 1
  read -r -N 17 -u "$plugin" name
  [ "$name" = $'\20CurrentTimeReply' ]
  exec {plugin}>&-
  ends_with 0
}

@test "TCP: a plug-in that closes the connection before the last message is found" {
  listen 'push ClientEcho after 10s'
  exec {plugin}>&-
  ends_with 1
  diff - <(sed 's/[0-9][0-9]*/N/' report) <<<'A ClientEcho was due N ms later, but the test was over.'
}

@test "TCP: a plug-in may close the connection without reading its answer" {
  listen 'expect CurrentTimeRequest'
  ask_for_time 1
  until read -r -t 0 -u "$plugin"; do :; done
  exec {plugin}>&-
  ends_with 0
}

@test "TCP: a plug-in may close the connection before its answers are sent" {
  listen ''
  kill -STOP "$served" # so that it finds all of them, and the end
  ask_for_time 7
  exec {plugin}>&-
  kill -CONT "$served"
  ends_with 0
}

@test "the demo's session, recorded and replayed, gives equal outputs" {
  record_demo
  grep -x 'plug-in: session complete' demo
  record again --replay session
  diff demo said
  messages="$SOURCE/qel-trace/tests/session.py"
  [ "$("$messages" session | wc -l)" -gt 30 ]
  diff <("$messages" session) <("$messages" again)
}

@test "a plug-in that says something else than in the recorded session is found" {
  record_demo
  sed -i 's/Lunch on Friday/Lunch on Monday/' session
  run -1 serve --replay session
  grep 'ChangeChatroomMetaRequest, is not what record [0-9]* expects: title is "Lunch on Friday" instead of "Lunch on Monday"' report
  serve --replay session --ignore title
}
