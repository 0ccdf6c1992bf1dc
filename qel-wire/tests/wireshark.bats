#!/usr/bin/env bats
# Wireshark, with our plug-in and without, as its page says. SOURCE is the repository, BUILT the folder
# of qel-wire, EXAMPLES the folder of the demo's programs. What the demo prints is what Wireshark has to show.
bats_require_minimum_version 1.5.0
load frames

# A program on the way records the demo's connection: to capture it takes privileges.
setup_file() {
  export LC_ALL=C.UTF-8 HOME=$BATS_FILE_TMPDIR
  PATH=$BUILT:$PATH
  unset XDG_CONFIG_HOME XDG_DATA_HOME WIRESHARK_CONFIG_DIR WIRESHARK_DATA_DIR
  cd "$SOURCE" || exit
  bash -euc "$(grep '^install ' docs/wireshark.md)"
  cd "$HOME" || exit
  DLOG_STANDIN_PRIORITY=S RECORD=record "$SOURCE/examples/run_demo.sh" "$EXAMPLES" \
    --emulator "$SOURCE/qel-wire/tests/relay.py" >said
  capture chat.pcap <record
}

setup() {
  cd "$HOME" || exit
  PATH=$BUILT:$PATH
  ports=$(sed -n '/^mkdir/,/^qel-wire export --ports/p' "$SOURCE/docs/wireshark.md")
}

# session FILE: makes a session file of records on standard input.
session() { "$SOURCE/qel-wire/tests/session_file.py" "$1"; }

# plain_shark FILE OPTION...: tshark without the plug-in, as the page says, on the messages of a session
# file.
plain_shark() {
  export HOME=$BATS_TEST_TMPDIR
  bash -euc "$(grep '^install .*[.]proto$' "$SOURCE/docs/wireshark.md" | sed "s#proto-lib#$SOURCE/&#"; echo "$ports")"
  qel-wire export "$1" >"$HOME/exported.pcapng"
  tshark -r "$HOME/exported.pcapng" -o protobuf.preload_protos:TRUE -o protobuf.pbf_as_hf:TRUE "${@:2}" 2>/dev/null
}

# capture FILE [PORT]: makes one of a connection's pieces on standard input, a packet of each line.
capture() { packets "$1" "45000,${2:-40000}"; }

# shark FILE OPTION...: tshark, without what it says to root. It fails if the plug-in does, which
# stands on standard error at first, and later in a field of the packet.
shark() {
  ! tshark -r "$@" -Y _ws.lua.error 2>&1 | grep -v '^Running as user' >&2 || return
  tshark -r "$@" 2>/dev/null
}

# one_way DIRECTION: the lines of its messages. Of two that cross each other either may come first.
one_way() { awk -v way="$1" '/ -> / { on = index($0, way) == 1 } on'; }

# Messages and their fields, a line each. The demo itself hides the token, Wireshark does not.
told_by_demo() {
  grep -Ev '^(plug-in|service): ' said | grep -oE '^[a-z-]+ -> .*|\w+: ("[^"]*"|[^ ,]+)' |
    sed -E 's/: "(.*)"$/: \1/; s/(accessToken: ).*/\1example-access-token/' | one_way "$1"
}
told_by_shark() {
  sed -nE 's/^Chat message: (.*), ([a-z-]+ -> .*)$/\2  \1/p; t; /: \([0-9]+ bytes\) \(Message: /d
    s/ \([0-9]+\)$//; s/: True$/: true/; s/: False$/: false/
    /^ +(Name|Length): |^ +\[/d; s/^ +//p' shown | one_way "$1"
}

# whole FILE OPTION...: all of the demo is in the capture, in full and once.
whole() {
  local way
  shark "$@" -O qel,protobuf >shown
  for way in 'plug-in -> service' 'service -> plug-in'; do
    [ "$(told_by_demo "$way" | wc -l)" -gt 50 ]
    diff <(told_by_demo "$way") <(told_by_shark "$way")
  done
}

@test "each message is shown with its fields, as the demo has them" { whole chat.pcap; }

@test "messages that are cut across two segments are shown in full and once" {
  sed -E 's/^(.) (.{60})(.+)$/\1 \2\n\1 \3/' record | capture cut.pcap
  whole cut.pcap
  whole cut.pcap -2
}

@test "all messages of a segment are shown" {
  awk '$1 == way { bytes = bytes $2; next } way { print way, bytes } { way = $1; bytes = $2 }
    END { print way, bytes }' record | capture joined.pcap
  whole joined.pcap
}

# With the port known: one byte is not enough to recognise a connection.
@test "segments of one byte become messages" {
  sed -E ':next; s/^(.) (..)(.+)$/\1 \2\n\1 \3/; P; D' record | capture bytes.pcap
  whole bytes.pcap -o qel.port:45000
  whole bytes.pcap -d tcp.port==45000,qel
}

@test "a capture that begins later has directions if the port is known" {
  tail -n 2 record | capture late.pcap
  shark late.pcap -T fields -e qel.name -e qel.direction >shown
  diff shown - <<<$'EndChatRequest\tunknown\nEndChatReply\tunknown'
  shark late.pcap -o qel.port:45000 -T fields -e qel.name -e qel.direction >shown
  diff shown - <<<$'EndChatRequest\tplug-in -> service\nEndChatReply\tservice -> plug-in'
}

@test "a broken message, an empty one and one of no name in the schema do not hide the next" {
  {
    printf '> '
    frame ClientEcho 0880
    frame ChatReply 6aff01
    frame ClientEcho ''
    frame Other 0807
    frame ClientEcho 0809
    echo ff # no frame
  } | capture odd.pcap
  shark odd.pcap -T fields -e qel.name -e _ws.col.Info -e pbf.ClientEcho.requestId >shown
  names='ClientEcho ChatReply ClientEcho Other ClientEcho'
  diff shown <(printf '%s\t%s \t9\n' "${names// /,}" "$names")
}

@test "other connections are left alone" {
  local client=40000 bytes
  for bytes in "$(printf 'GET / HTTP/1.1\r\n\r\n' | hex)" \
    16030100c8010000c403030000000000 \
    "$(frame '' 0807)" \
    "$(frame Client-Echo 0807)" \
    "$(frame "$(printf '%064d' 0)" 0807)"; do
    echo "> $bytes" | capture "foreign-$client.pcap" "$client"
    client=$((client + 1))
  done
  mergecap -w foreign.pcap foreign-*.pcap
  for port in 0 45000; do
    shark foreign.pcap -o "qel.port:$port" -Y qel >shown
    diff /dev/null shown
  done
}

@test "what is not a frame in the end does not hide what follows" {
  more_than_1_mib=$(frame ClientEcho '' | sed 's/00000000$/00100001/')
  printf '> %s\n' "$more_than_1_mib" "$(frame ClientEcho 0807)" | capture frame.pcap
  [ "$(shark frame.pcap -T fields -e pbf.ClientEcho.requestId -Y qel)" = 7 ]
  printf '> %s\n' "$(frame ClientEcho '' | head -c 10)" "$(printf 'GET / HTTP/1.1\r\n\r\n' | hex)" |
    capture http.pcap
  [ "$(shark http.pcap -T fields -e http.request.method -Y http)" = GET ]
}

@test "its page shows what happens" {
  cp chat.pcap "$BATS_TEST_TMPDIR"
  cd "$BATS_TEST_TMPDIR" || exit
  bash -euc "$ports"
  session session.pcapng <"$SOURCE/qel-wire/tests/session"
  awk '/^```/ { on = $0 == "```console"; next } on' "$SOURCE/docs/wireshark.md" >page.txt
  grep '^\$ ' page.txt | while IFS= read -r line; do
    printf '%s\n' "$line"
    bash -c "${line#\$ }" 2>errors
  done | grep . | diff page.txt -
}

@test "without the plug-in, Wireshark shows a session's messages, fields, times and directions" {
  session session.pcapng <"$SOURCE/qel-wire/tests/session"
  plain_shark session.pcapng -T fields -E separator=' ' -e frame.time_epoch -e frame.p2p_dir -e _ws.col.Source \
    -e protobuf.message.name -e pbf.ChatMessageParam.chatMsg -e pbf.Result.code -e pbf.ChannelAuthRequest.accessToken |
    sed 's/ *$//' >shown
  diff - shown <<'end'
1795428000.123456789 0 10.0.0.1 ChatRequest,ChatMessageParam hi
1795428001.123456789 0 10.0.0.1 CurrentTimeRequest
1795428002.123456789 1 10.0.0.2 ChatReply,Result  0
1795428003.123456789 0 10.0.0.1 ReadMessageRequest
1795428004.123456789 1 10.0.0.2 ClientEcho
1795428005.123456789 0 10.0.0.1 ClientEchoReply
1795428006.123456789 1 10.0.0.2 CurrentTimeReply,Result  1001
1795428008.123456789 0 10.0.0.1 ChannelAuthRequest   ********
1795428009.123456789 1 10.0.0.2 ChannelAuthReply,Result  0
end
}

@test "without the plug-in, Wireshark shows each message of the schema by its name, in both directions" {
  sed -nE 's/^message (\w+) .*/\1/p' "$SOURCE/proto-lib/msgspec_frontend.proto" >names
  sed 's/.*/> & 1 -/; p; s/>/</' names | session session.pcapng
  plain_shark session.pcapng -T fields -e _ws.col.Protocol | sed 's/^PB(//; s/)$//' | diff <(sed p names) -
}

# text_of SIZE: the record of a message with requestId 7, and behind that a text of so many bytes.
text_of() {
  # shellcheck disable=SC2183
  printf 'requestId: 7 chatMessageParams { chatMsg: "%0*d" }' "$1" | qel-wire encode ChatRequest | hex | sed 's/^/> ChatRequest 1 /'
}

@test "without the plug-in, Wireshark shows a large message whole, and the beginning of a larger one" {
  text_of 260000 | session session.pcapng
  [ "$(plain_shark session.pcapng -T fields -e pbf.ChatMessageParam.chatMsg | tr -d '\n' | wc -c)" -eq 260000 ]
  text_of 262111 | session session.pcapng # with 33 bytes before it, as much as a packet has
  plain_shark session.pcapng -T fields -e pbf.ChatRequest.requestId -e frame.comment >shown
  diff shown - <<<$'7\tmessage 1, sent, written, 262121 bytes, of which 262088 are there'
}

@test "without the plug-in, Wireshark shows the beginning of a message that was not recorded whole" {
  text_of 100 | sed -E 's/(30){20}$/ 20/' | session session.pcapng
  plain_shark session.pcapng -T fields -e pbf.ChatRequest.requestId -e frame.comment >shown
  diff shown - <<<$'7\tmessage 1, sent, written, 106 bytes, of which 86 are there'
}

@test "the access token is shown, as its page says" {
  token=pbf.ChannelAuthRequest.accessToken
  [ "$(shark chat.pcap -T fields -e "$token" -Y "$token")" = example-access-token ]
  grep 'Wireshark shows the access token .* in the clear' "$SOURCE/docs/wireshark.md"
}
