#!/usr/bin/env bats
# The program as it is called, and the page that describes it. SOURCE is the repository, BUILT the
# folder of the program.
bats_require_minimum_version 1.5.0
load frames

setup() {
  export LC_ALL=C
  unset NO_COLOR
  PATH=$BUILT:$PATH
  export tests=$SOURCE/qel-wire/tests
  page=$SOURCE/docs/qel-wire.md
  cd "$BATS_TEST_TMPDIR" || exit
}

# repeat: the commands of the sessions on standard input, each followed by what it prints and by its
# exit status. Empty lines do not matter.
repeat() {
  local line status
  grep -E '^(###|[$]) ' | while IFS= read -r line; do
    printf '%s\n' "$line"
    [[ $line == '$ '* ]] || continue
    status=0
    bash -c "${line#\$ }" </dev/null 2>&1 || status=$?
    [ "$status" -eq 0 ] || echo "[$status]"
  done | grep .
}

# agree_on CHECK: qel-wire and the reference encoder.
agree_on() {
  [ -z "$SANITIZERS" ] || skip 'the fuzz target has the same messages as seeds'
  /usr/bin/python3 "$tests/reference.py" "$1" "$SOURCE" "$CONTRACT" 2>errors || { cat errors && false; }
}

# capture FILE [PORTS]: makes a capture of lines with a direction, the name of a message and its text
# form.
capture() {
  local way name text
  while read -r way name text; do
    printf '%s %s\n' "$way" "$(frame "$name" "$(qel-wire encode "$name" --hex <<<"$text")")"
  done | packets "$1" "${2:-9000,40000}"
}

# holds SESSIONS: repeated, they are the same. Of what differs, the session's title is shown.
holds() { [ -s "$1" ] && diff -u -F '^### ' <(grep -E '^(###|[$]) ' -A 9999 "$1" | grep .) <(repeat <"$1"); }

@test "it prints what its sessions show" { holds "$tests/sessions.txt"; }

@test "it hides what its sessions hide" { holds "$tests/access_token.txt"; }

@test "it reads session files as their sessions show" { holds "$tests/session_files.txt"; }

# follow FILE: session --follow, whose lines next_line reads. A line that does not come fails.
follow() { exec {followed}< <(exec qel-wire session --follow "$1" 2>&1); }
next_line() { read -r -t 60 -u "$followed" line; }

# turn_into FILE: the file becomes that one while nobody looks at it.
turn_into() {
  kill -STOP $!
  mv "$1" growing
  kill -CONT $!
}

# lines_up_to NUMBER: up to that message's.
lines_up_to() {
  while next_line; do
    echo "$line"
    [[ $line != "$1 "* ]] || return 0
  done
  return 1
}

# The session of the page grows in a ring, which turns every few messages.
@test "a session file is followed while it grows and turns" {
  local line followed end
  head -n 2 "$tests/session" | "$tests/session_file.py" growing 512
  follow growing
  for end in 2 3 4 5; do
    head -n "$end" "$tests/session" | "$tests/session_file.py" growing 512
    lines_up_to "$end" >>shown # before there is more
  done
  kill -INT $!
  cat <&"$followed" >>shown
  "$tests/session_file.py" whole <"$tests/session"
  qel-wire session whole | head -n 5 | sed 's/^ *//' | diff - <(head -n 5 shown)
  diff <(tail -n +6 shown) - <<<$'no answer to 2, CurrentTimeRequest\nno answer to 4, ReadMessageRequest\nno answer to 5, ClientEcho'
}

@test "what a session file lost while it was followed is noted, and that it begins anew" {
  local line followed
  head -n 1 "$tests/session" | "$tests/session_file.py" growing
  follow growing
  next_line
  { echo 'at 4' && echo '< ClientEcho 1 0807'; } | "$tests/session_file.py" growing
  next_line
  [ "$line" = 'qel-wire: messages 2 to 3 are not in the file' ]
  next_line
  echo '< ClientEcho 1 0808' | "$tests/session_file.py" growing
  next_line
  [ "$line" = 'qel-wire: the file was begun anew' ]
  next_line
  [[ $line == '5 '*', requestId 8, taken' ]]
  kill -INT $!
}

@test "a call that has not ended is listed a moment later, if it has ended then or not" {
  local line followed
  printf '%s\n' '< ClientEcho 1 0807' '< ClientEcho 0 0808' | "$tests/session_file.py" growing
  printf '%s\n' '< ClientEcho 1 0807' '< ClientEcho 1 0808' '< ClientEcho 0 0809' '< ClientEcho 1 080a' |
    "$tests/session_file.py" grown
  follow growing
  next_line
  turn_into grown # before that moment is over
  next_line
  [[ $line == '2 '*', taken' ]]
  next_line
  [[ $line == '3 '*', not ended' ]]
  next_line
  [[ $line == '4 '*', taken' ]]
  kill -INT $!
}

@test "a record that is not there may come a moment later" {
  local line followed
  printf '%s\n' '< ClientEcho 1 0807' 'at 3' '< ClientEcho 1 0809' | "$tests/session_file.py" growing
  printf '< ClientEcho 1 %s\n' 0807 0808 0809 | "$tests/session_file.py" grown
  follow growing
  next_line
  turn_into grown
  next_line
  [[ $line == '2 '*', taken' ]]
  kill -INT $!
}

@test "following ends when nobody reads it" {
  local line followed
  head -n 1 "$tests/session" | "$tests/session_file.py" growing
  exec {followed}< <(exec timeout 20 qel-wire session --follow growing)
  next_line
  exec {followed}<&-
  wait $! || [ $? -ne 124 ]
}

@test "its page shows what happens" {
  capture chat.pcap <<'end'
> ChatRequest requestId: 7 chatroomId: 42 chatMessageParams { msgId: 1 chatMsg: "hi" }
> CurrentTimeRequest requestId: 8
< ChatReply requestId: 7 chatroomId: 42 result { code: 0 }
> ReadMessageRequest requestId: 9 chatroomId: 42
< ClientEcho requestId: 700001
> ClientEchoReply requestId: 700001
< CurrentTimeReply requestId: 8 result { code: 0 } currentTimeMillis: 1795430406000
end
  "$tests/session_file.py" session.pcapng <"$tests/session"
  awk '/^```/ { on = $0 == "```console"; next } on' "$page" >page.txt
  holds page.txt
}

@test "which end is the plug-in is learnt from the messages, whatever the ports" {
  capture chat.pcap 45000,40000 <<'end'
> ChatRequest requestId: 7
< ChatReply requestId: 7
end
  qel-wire session --frames=example chat.pcap 2>/dev/null | cut -c 37-57 >listed
  diff listed - <<<$'sent      ChatRequest\nreceived  ChatReply, '
}

@test "where a stream may begin within a message, the first frame is looked for" {
  printf '> %s\n' 0a436c69 "$(frame ClientEcho 0807)" | packets chat.pcap 9000,40000
  run -0 --separate-stderr qel-wire decode auto --frames=example chat.pcap
  # shellcheck disable=SC2154
  [[ $stderr == *', without 4 bytes before the first frame' ]]
  [ "$output" = "# message 1: 2026-11-23 10:00:01.000 UTC, 10.0.0.1:40000 -> 10.0.0.2:9000, offset 19, 2 bytes, ClientEcho
requestId: 7" ]
}

@test "a frame of an unknown message, and bytes that are none, are not left out" {
  printf '> %s\n' "$(frame NewMessage 0807)" "$(frame ClientEcho 0807)" | packets named.pcap 9000,40000
  run -1 --separate-stderr qel-wire decode auto --frames=example named.pcap
  [[ $output == *requestId* && $stderr == *'its frame or its record has a name that no message has' ]]
  printf '> 0a436c69\n' | packets cut.pcap 9000,40000
  run -1 --separate-stderr qel-wire decode auto --frames=example cut.pcap
  [[ $stderr == *'the frame at offset 0 cannot be read'* ]]
}

@test "a connection that was reset is noted" {
  printf '> %s\n' "$(frame ClientEcho 0807)" 00 | packets chat.pcapng 9000,40000
  editcap -F pcap chat.pcapng chat.pcap
  # The flags of the last packet, which has 60 bytes: behind 14 of Ethernet, 20 of IP and 13 of TCP.
  printf '\x04' | dd of=chat.pcap bs=1 conv=notrunc seek=$(($(stat -c %s chat.pcap) - 60 + 47))
  run -0 --separate-stderr qel-wire decode ClientEcho --frames=example chat.pcap
  [[ $stderr == *', of a connection that was reset' ]]
}

@test "a message does not answer one of its own end, of another connection, or with another requestId" {
  capture own.pcap <<<$'> ChatRequest requestId: 7\n> ChatReply requestId: 7'
  capture other.pcap <<<$'> ChatRequest requestId: 7\n< ChatReply requestId: 8'
  capture one.pcap <<<'> ChatRequest requestId: 7'
  capture two.pcap <<<'< ChatReply requestId: 7'
  for files in own.pcap other.pcap 'one.pcap two.pcap'; do
    # shellcheck disable=SC2086
    qel-wire session --frames=example $files 2>/dev/null | grep 'no answer to 1, ChatRequest'
  done
}

@test "an empty message has its own place and time" {
  capture chat.pcap <<<$'> ClientEcho\n< ClientEchoReply\n> ClientEcho requestId: 1'
  qel-wire session --frames=example chat.pcap 2>/dev/null | grep -oE '0[0-9]\.000.*' | head -n 3 >listed
  diff listed - <<'end'
00.000 UTC  received  ClientEcho, 0 bytes
01.000 UTC  sent      ClientEchoReply, 0 bytes
02.000 UTC  received  ClientEcho, 2 bytes, requestId 1
end
}

@test "its page has every option" {
  diff <(qel-wire man | grep -oE -- '^\.B [\]-[\]-[a-z0-9]+([\]-[a-z0-9]+)*' | sed 's/^.B //; s/[\]//g' | sort -u) \
    <(grep -oE -- '`(qel-wire )?--[a-z0-9-]+' "$page" | grep -oE -- '--.*' | grep -vx -- --help | cat - <(echo --version) | sort -u)
}

@test "the command of the repository's README works" {
  mkdir -p build/release
  ln -s "$BUILT" build/release/qel-wire
  run -0 bash -euc "$(grep '^build/release/qel-wire/qel-wire ' "$SOURCE/README.md")"
  [[ $output == '000000  08 07 '*' requestId '* ]]
}

@test "the text form of each message is the reference encoder's" {
  agree_on text
}

@test "the JSON form of each message is the reference encoder's" {
  agree_on json
}

@test "the bytes of each message are the reference encoder's" {
  agree_on bytes
}

@test "each message with unknown fields comes back from its text form" {
  agree_on back
}

@test "conditions choose the messages that jq chooses" {
  agree_on where
}

@test "differences are those that jq sees" {
  agree_on diff
}

@test "its page says of each form of hex whether it is read" {
  agree_on hex
}

@test "it takes little memory" {
  agree_on memory
}

@test "each message is guessed, alone or with those that look alike" {
  agree_on guess
}

@test "it lists the messages and enumerations of the schema" {
  diff <(sed -nE 's/^(message|enum) (\w+) .*/\2/p' "$SOURCE/proto-lib/msgspec_frontend.proto") \
    <(qel-wire schema)
}

@test "complaints go to standard error" {
  run -1 --separate-stderr qel-wire decode ClientEcho --hex=080
  [ -z "$output" ]
}

@test "notes go to standard error" {
  run -0 --separate-stderr qel-wire decode ClientEcho --hex=08070808
  [ "$output" = 'requestId: 8' ]
}

@test "without memory it says so" {
  [ -z "$SANITIZERS" ] || skip 'sanitizers take more memory than there is'
  head -c 60000000 /dev/zero >zeros
  ulimit -v 60000
  run -3 qel-wire decode ClientEcho zeros
  [ "$output" = 'qel-wire: there is not enough memory' ]
}

@test "many messages in one file give what as many calls give, in every framing" {
  agree_on frames
}

# completed WORD...: what the last word may become. Bash makes "=" a word of its own.
completed() {
  (
    # shellcheck source=/dev/null
    source "$BUILT/completion.bash"
    COMP_WORDS=(qel-wire "$@") COMP_CWORD=$#
    _qel_wire
    echo "${COMPREPLY[@]}"
  )
}

@test "Bash completes commands" {
  [ "$(completed d)" = 'decode diff' ]
}

@test "Bash completes messages where a command takes them" {
  [ "$(completed explain --all ChatR)" = 'ChatRequest ChatReply' ]
  [ "$(completed guess ChatR)" = '' ]
}

@test "Bash completes enumerations for schema alone" {
  [ "$(completed schema MsgT)" = MsgType ]
  [ "$(completed decode MsgT)" = '' ]
}

@test "Bash goes on behind values" {
  [ "$(completed --color = never expl)" = explain ]
  [ "$(completed explain --hex = 0807 ChatR)" = 'ChatRequest ChatReply' ]
  [ "$(completed explain --frames u16 ChatR)" = 'ChatRequest ChatReply' ]
}

@test "Bash completes values" {
  [ "$(completed --color =)" = 'always never auto' ]
  [ "$(completed decode --frames = u3)" = 'u32 u32le' ]
  [ "$(completed decode --frames u3)" = 'u32 u32le' ]
  [ "$(completed decode --bytes =)" = hex ]
  [ "$(completed decode --hex = a)" = '' ]
}

@test "Bash completes every option of a command" {
  diff <(completed encode -- | tr ' ' '\n' | sed 's/=//' | sort -u) \
    <({ qel-wire encode --help && qel-wire --help; } | grep -oE -- '^ +(-h,)?--[a-z0-9-]+' | grep -oE -- '--.*' | sort -u)
}

@test "fish completes commands, messages, options and values" {
  for line in 'expl explain' 'explain ChatRep ChatReply' 'decode --part --partial' 'decode --frames=u32l --frames=u32le' \
    'decode --json ChatRep ChatReply' '--color=never decode ChatRep ChatReply' \
    'diff --message=ChatRep --message=ChatReply'; do
    fish -c "source '$BUILT/completion.fish'; complete -C 'qel-wire ${line% *}'" | cut -f1 >completed.txt
    grep -Fx -- "${line##* }" completed.txt
  done
}

# A zsh at a terminal is sent words and a tab, until what they become is there.
@test "zsh completes commands, messages, options and values" {
  cp "$BUILT/completion.zsh" _qel-wire
  cat >type.zsh <<'end'
zmodload zsh/zpty
zpty shell TERM=xterm zsh -f -i
zpty -w shell "PS1='> '; fpath=($PWD \$fpath); autoload -Uz compinit; compinit -u -D; bindkey '^I' complete-word"
for words expected in "$@"; do
  zpty -w -n shell "qel-wire $words"$'\t'
  zpty -r shell out "*$expected*"
  zpty -w -n shell $'\x15' # an empty line again
done
end
  timeout 60 zsh -f type.zsh expl explain 'decode ChatRep' ChatReply 'decode --json ChatRep' ChatReply \
    'decode --part' --partial 'decode --frames=u32l' u32le 'diff --message=ChatRep' ChatReply
}

@test "man shows its page without a complaint" {
  MANROFFSEQ='' man -l --warnings -E UTF-8 <(qel-wire man) >page.txt 2>errors
  diff /dev/null errors
  grep 'qel-wire .* Shows and makes' page.txt
}
