#!/usr/bin/env bats
# The recorder before programs that know nothing of it.
# shellcheck disable=SC2030,SC2031,SC2154 # a test has variables of its own; bats sets some
load ../../tests/build

TRACE=$BUILD/qel-trace
TESTS=$TRACE/tests
export DLOG_STANDIN_PRIORITY=S

# recorded FILE PROGRAM [ARGUMENT...]: the program, with the recorder preloaded.
recorded() {
  local preload=LD_PRELOAD=$TRACE/libqel-trace.so
  [ -z "$EMULATOR" ] || preload=QEMU_SET_ENV=$preload
  ${KILL_AFTER:+timeout -s KILL "$KILL_AFTER"} \
    env "$preload" QEL_TRACE_FILE="$1" ${EMULATOR:+"$EMULATOR"} "${@:2}"
}

session() { "$SOURCE/qel-trace/tests/session.py" "$@"; }

# last_ones FILE NUMBER: its records have one number after the other, up to this one, or any.
last_ones() {
  session "$1" >found
  awk -v last="$2" 'NR == 1 { first = $1 } { n = $1 } END { exit NR == 0 || NR != n - first + 1 || (last && n != last) }' found
}

# demo_programs: the demo's programs go to a folder of their own, there with the recorder in front.
demo_programs() {
  local name
  mkdir programs
  for name in front_end plugin_session; do
    {
      printf '#!/usr/bin/env bash\n'
      declare -p TRACE EMULATOR
      declare -f recorded
      printf 'recorded %q %q "$@"\n' "$PWD/$name.pcapng" "$BUILD/examples/$name"
    } >"programs/$name"
    chmod +x "programs/$name"
  done
}

# What went over the connection, by direction: names of messages and their bytes.
sent_over() {
  python3 - "$1" record <<'PY'
import sys
pieces = [line.split() for line in open(sys.argv[2])]
rest = bytes.fromhex("".join(piece for sign, piece in pieces if sign == sys.argv[1]))
while rest:
    name, rest = rest[1:1 + rest[0]].decode(), rest[1 + rest[0]:]
    size = int.from_bytes(rest[:4], "big")
    print(name, rest[4:4 + size].hex())
    rest = rest[4 + size:]
PY
}

# The same by the session. Requests that were refused were not sent.
recorded_as() {
  session plugin_session.pcapng |
    awk -v way="$1" 'NR == FNR { message[$1] = $2; next } $2 == way && $3 == "done" { print message[$4] " " $5 }' \
      <(jq -r '.messages | to_entries[] | "\(.key) \(.value)"' "$BUILD/contract/contract.json") -
}

# telling TOKEN FILE...: those that have four bytes of it in a row, as they are, in hex or in base64.
telling() {
  python3 - "$@" <<'PY'
import base64, sys
token = sys.argv[1].encode()
pieces = [token[i:i + 4] for i in range(len(token) - 3)]
forms = {form for piece in pieces for form in (piece, piece.hex().encode(), piece.hex().upper().encode())}
for before in range(3):
    text = base64.b64encode(bytes(before) + token).rstrip(b"=")
    forms |= {text[i:i + 5] for i in range(before + 1, len(text) - 5)}
for name in sys.argv[2:]:
    with open(name, "rb") as file:
        data = file.read()
    if any(form in text for form in forms for text in (data, data.translate(None, b" \n"))):
        print(name)
PY
}

# What qel-wire writes of a session goes to the folder written.
write_all() {
  mkdir -p written
  local wire=$BUILD/qel-wire/qel-wire auth=ChannelAuthRequest
  "$wire" session "$1" --show-token >written/list
  "$wire" session "$1" --json --show-token >written/list.json
  "$wire" decode auto "$1" --show-token >written/text
  "$wire" decode auto "$1" --show-token --json >written/json
  "$wire" explain auto "$1" --show-token --all >written/rows
  "$wire" export "$1" >written/export
  "$wire" decode $auth "$1" --number=1 --show-token | "$wire" encode $auth --hex >written/hex
  "$wire" decode $auth "$1" --number=1 --show-token | "$wire" encode $auth --base64 >written/base64
}

hex() { printf %s "$1" | od -An -v -tx1 | tr -d ' \n'; }

@test "of the demo, with the plug-in as it is, every message is recorded as it went over the connection" {
  demo_programs
  RECORD=record "$SOURCE/examples/run_demo.sh" programs --emulator "$SOURCE/qel-wire/tests/relay.py" >out
  tail -n 1 out | grep 'session complete'
  [ ! -e front_end.pcapng ] # which calls no function
  token=example-access-token
  diff <(sent_over '>' | sed "s/$(hex "$token")/$(hex "${token//?/*}")/") <(recorded_as sent)
  diff <(sent_over '<') <(recorded_as received)
  [ "$(recorded_as sent | wc -l)" -gt 15 ]
  grep -c "$token" plugin_session.pcapng | grep -x 0
  capinfos plugin_session.pcapng | grep 'Number of packets: *40'
}

@test "the contract holds through the recorder, but for the moment at which a requestId is written" {
  export QEL_TRACE_SIZE=64K
  recorded "$PWD/session" "$BUILD/tests/contract_tests" --gtest_brief
  # In children, calls end the process.
  session session.* | grep -q 'received not-ended chat_reply_deserialize'
}

@test "a call that an exception ends is recorded as ended" {
  recorded "$PWD/session" "$BUILD/tests/contract_tests" --gtest_brief \
    --gtest_filter='chat_reply_deserialize/each_new_refused.*'
  session session | grep -c 'received done'
  session session | grep 'not-ended' | none
}

@test "eight threads that call at once have their own results and lines, and all are recorded" {
  recorded "$PWD/session" "$BUILD/tests/contract_threads_tests" --gtest_brief
  last_ones session
  [ "$(wc -l <found)" -gt 1000 ]
}

@test "how a call ended is recorded" {
  recorded "$PWD/session" "$TESTS/caller" ends
  diff - <(session session) <<'TXT'
1 received done chat_reply_deserialize 5807
2 received refused chat_reply_deserialize 58
3 received untold chat_reply_deserialize 5807
4 received untold read_message_reply_deserialize 5807
5 sent refused change_chatroom_meta_request_serialize
TXT
}

@test "the access tokens of all logins are in no message after them" {
  recorded "$PWD/session" "$TESTS/caller" tokens a-secret-token
  [ "$(session session | wc -l)" -eq 9 ]
  [ -z "$(telling a-secret-token session)$(telling another-secret-token session)" ]
  # A short one is found in its login alone, as it may be anything elsewhere.
  session session | grep -c "$(hex short)" | grep -x 2
}

@test "the access token is in no form in what qel-wire writes of a session" {
  [ -x "$BUILD/qel-wire/qel-wire" ] || skip 'there is no qel-wire'
  token=Qz7wKx2vXp9jJk4h
  recorded "$PWD/session" "$TESTS/caller" tokens "$token"
  write_all session
  telling "$token" session written/* | none
  # Of a file that has it, all but the lists tell it.
  sed "s/${token//?/[*]}/$token/g" session >unmasked
  write_all unmasked
  diff <(telling "$token" unmasked written/*) <(printf '%s\n' unmasked written/{base64,export,hex,json,rows,text})
}

@test "the ring keeps the last messages in a file of the size that was asked for" {
  QEL_TRACE_SIZE=256K recorded "$PWD/session" "$TESTS/caller" many 20000
  [ "$(stat -c %s session)" -eq 262144 ]
  last_ones session 20000
  [ "$(wc -l <found)" -gt 1000 ]
}

@test "forks in the middle of calls, with and without a recording, leave no child behind" {
  export QEL_TRACE_SIZE=64K
  recorded '' "$TESTS/caller" forks
  recorded "$PWD/session" "$TESTS/caller" forks
  recorded "$PWD/session" "$TESTS/caller" handlers
}

@test "a first call in a thread that is cancelled leaves others alone" {
  recorded "$PWD/session" "$TESTS/caller" cancel
}

@test "a child of a fork has a file of its own" {
  recorded "$PWD/session" "$TESTS/caller" fork
  session session | cut -d ' ' -f 5 | diff - <(printf '0801\n0803\n')
  session session.* | cut -d ' ' -f 5 | diff - <(echo 0802)
}

@test "%p in the file's name is the process" {
  recorded "$PWD/session-%p" "$TESTS/caller" fork
  [ "$(find . -name 'session-*' | grep -cxE './session-[0-9]+')" -eq 2 ]
}

@test "the session before is kept beside the new one" {
  recorded "$PWD/session" "$TESTS/caller" many 1
  recorded "$PWD/session" "$TESTS/caller" many 2
  [ "$(session session.old | wc -l) $(session session | wc -l)" = '1 2' ]
}

@test "a process that is killed at any moment leaves a whole file" {
  export QEL_TRACE_SIZE=64K
  for _ in $(seq 10); do
    KILL_AFTER=${EMULATOR:+2}.$((RANDOM % 400 + 200)) run -137 recorded "$PWD/session" "$TESTS/caller" threads
    last_ones session
    rm session
  done
}

# in_trouble TEXT COMMAND...: all goes on but the recording, of which one line tells.
in_trouble() {
  DLOG_STANDIN_PRIORITY=E run -0 --separate-stderr "${@:2}"
  diff <(grep -v 'from LD_PRELOAD' <<<"$stderr" | sed -E 's/^[0-9:.]+ E //; s/ P[0-9]+ T[0-9]+//') \
    <(echo "QEL_TRACE: nothing is recorded: $1")
}

@test "trouble with the file is told in one line, and calls go on" {
  mkdir folder
  mkfifo fifo
  in_trouble 'no/session: No such file or directory' recorded no/session "$TESTS/caller" many 10
  in_trouble "folder: File exists" recorded folder "$TESTS/caller" many 10
  in_trouble "fifo: File exists" recorded fifo "$TESTS/caller" many 10
  in_trouble "/dev/full: File exists" recorded /dev/full "$TESTS/caller" many 10
  in_trouble "/proc/session: No such file or directory" recorded /proc/session "$TESTS/caller" many 10
  QEL_TRACE_SIZE=big in_trouble 'QEL_TRACE_SIZE: 64K to 32M' recorded session "$TESTS/caller" many 10
  QEL_TRACE_SIZE=63K in_trouble 'QEL_TRACE_SIZE: 64K to 32M' recorded session "$TESTS/caller" many 10
  QEL_TRACE_SIZE=33M in_trouble 'QEL_TRACE_SIZE: 64K to 32M' recorded session "$TESTS/caller" many 10
  [ ! -e session ]
}

@test "a limit of file sizes does not end the process" {
  ulimit -f 100
  in_trouble "session: File too large" recorded session "$TESTS/caller" many 10
  [ ! -e session ]
}

@test "a full disk does not end the process, and has no piece of a file" {
  unshare -rm true || skip 'no file systems can be mounted here'
  mkdir full
  full() { unshare -rm bash -c 'mount -t tmpfs -o size=1M none full && "$@" && ! ls full | grep .' bash "$@"; }
  export -f recorded full
  export TRACE EMULATOR
  in_trouble "full/session: No space left on device" full bash -c 'recorded "$@"' bash full/session "$TESTS/caller" many 10
}

@test "without a name nothing is recorded, which is told unless the name is empty" {
  # shellcheck disable=SC2016 # it is a text here
  in_trouble 'QEL_TRACE_FILE names no file' env -u QEL_TRACE_FILE bash -c "
    $(declare -f recorded | sed 's/QEL_TRACE_FILE="$1" //'); $(declare -p TRACE EMULATOR)
    recorded - '$TESTS/caller' many 10"
  DLOG_STANDIN_PRIORITY=E recorded '' "$TESTS/caller" many 10 2>&1 | none
}

@test "a plug-in and a library in a scope of their own are recorded" {
  recorded "$PWD/session" "$TESTS/loader" "$TESTS/libplugin.so" plugin_answer
  recorded "$PWD/session2" "$TESTS/loader" "$LIBRARY" client_echo_reply_serialize
  diff <(session session session2) <(yes '1 sent done client_echo_reply_serialize 0807' | head -n 2)
}

@test "where there is no library, programs find what they found before" {
  LD_LIBRARY_PATH=${LIBRARY%/*} recorded "$PWD/session" "$TESTS/loader" # nor do they load the library
  recorded "$PWD/session" /bin/true || [ -n "$EMULATOR" ]
  [ ! -e session ]
}

@test "a call leaves errno as it was" { recorded "$PWD/session" "$TESTS/caller" errno; }

@test "the recorder may be linked instead of preloaded" {
  "$CC" "${C_FLAGS[@]}" -I "$SOURCE/proto-lib" "$SOURCE/qel-trace/tests/caller.c" -pthread \
    -L "$TRACE" -Wl,--no-as-needed -lqel-trace "$LIBRARY" \
    -Wl,-rpath,"$TRACE:${LIBRARY%/*}:${DLOG%/*}:$PROTOBUF/lib" -Wl,--allow-shlib-undefined -o caller
  QEL_TRACE_FILE=session ${EMULATOR:+"$EMULATOR"} ./caller many 3
  [ "$(session session | wc -l)" -eq 3 ]
}

@test "its page shows what happens" {
  [ -z "$EMULATOR" ] || skip "this machine's"
  awk '/^```/ { on = $0 == "```c"; next } on' "$SOURCE/README.md" >first.c
  "$CC" "${C_FLAGS[@]}" first.c -I "$SOURCE/proto-lib" "$LIBRARY" -Wl,-rpath,"${LIBRARY%/*}" -o first
  mkdir build
  ln -s "$BUILD" build/release
  PATH=$BUILD/qel-wire:$PATH
  awk '/^```/ { on = $0 == "```console"; next } on' "$SOURCE/docs/recorder.md" >shown
  sed -n 's/^[$] //p' shown >commands
  while IFS= read -r command; do
    echo "\$ $command"
    eval "$command"
  done <commands >printed
  diff shown printed
}

@test "it shows the functions that carry a message, and one of the C library's" {
  diff <("$NM" -D --defined-only "$TRACE/libqel-trace.so" | awk '{ print $3 }' | sort) \
    <({ echo dlsym && functions | grep -v forward_stored; } | sort)
  "$READELF" -d "$TRACE/libqel-trace.so" | grep NEEDED | grep -E 'qel-message|stdc|protobuf|dlog' | none
}
