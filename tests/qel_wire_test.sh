#!/usr/bin/env bash
# qel_wire_test.sh CASE SOURCE QEL-WIRE: the program as it is called: where its input comes from, what
# it prints where, what it exits with.
set -euo pipefail
export LC_ALL=C
unset NO_COLOR
source=$2
tool=$3
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

fail() {
  printf '%s\n' "$*" >&2
  head -n 50 "$scratch"/* >&2
  exit 1
}

# exits STATUS ARGUMENT...: so does the tool; what it prints goes to files.
exits() {
  local wanted=$1 status=0
  shift
  "$tool" "$@" >"$scratch/out" 2>"$scratch/err" </dev/null || status=$?
  [ "$status" -eq "$wanted" ] || fail "exit status $status of: $*"
}

says() { diff <(printf '%s\n' "$@") "$scratch/err" >&2 || fail 'another complaint'; }

# completed WORD...: what the last word may become. Bash makes "=" a word of its own.
completed() {
  bash -c '
    PATH=$1:$PATH
    . "$2"
    shift 2
    COMP_WORDS=(qel-wire "$@") COMP_CWORD=$#
    _qel_wire
    printf "%s\n" "${COMPREPLY[@]}"' - "$(dirname "$tool")" "$source/tools/qel-wire/completion.bash" "$@"
}

printf '\x08\x07' >"$scratch/echo"
case $1 in
  input_is_a_file)
    exits 0 decode ClientEcho "$scratch/echo"
    grep -qx 'requestId: 7' "$scratch/out" || fail 'another message'
    ;;
  input_is_standard_input)
    for file in '' -; do
      "$tool" decode ClientEcho $file <"$scratch/echo" >"$scratch/out"
      grep -qx 'requestId: 7' "$scratch/out" || fail 'another message'
    done
    ;;
  input_is_hex)
    exits 0 decode ClientEcho --hex='08 07'
    grep -qx 'requestId: 7' "$scratch/out" || fail 'another message'
    echo 0807 >"$scratch/hex"
    exits 0 decode ClientEcho --hex "$scratch/hex"
    grep -qx 'requestId: 7' "$scratch/out" || fail 'another message of a file'
    ;;
  input_is_base64)
    exits 0 decode ClientEcho --base64=CAc=
    grep -qx 'requestId: 7' "$scratch/out" || fail 'another message'
    ;;
  options_may_come_first)
    exits 0 --json decode --hex=0807 ClientEcho
    grep -q '"requestId": "7"' "$scratch/out" || fail 'no JSON'
    ;;
  encode_writes_bytes)
    for as in '' --hex --base64; do
      echo 'requestId: 7' | "$tool" encode ClientEcho $as >"$scratch/out$as"
    done
    cmp "$scratch/echo" "$scratch/out" || fail 'other bytes'
    grep -qx 0807 "$scratch/out--hex" || fail 'other hex'
    grep -qx CAc= "$scratch/out--base64" || fail 'other base64'
    ;;
  encode_writes_what_the_peer_reads)
    # The seeds are the peer's encodings, behind a byte that chooses the message.
    for message in ChannelAuthRequest AllowChatReply InviteReply; do
      tail -c +2 "$source/fuzz/seeds/round_trip/$message" >"$scratch/bytes"
      "$tool" decode --show-token "$message" "$scratch/bytes" | "$tool" encode "$message" >"$scratch/out"
      cmp "$scratch/bytes" "$scratch/out" || fail "$message"
    done
    ;;
  json_is_the_peers)
    /usr/bin/python3 "$source/tests/qel_wire_json.py" "$tool" "$source" || fail 'another JSON form'
    ;;
  json_says_what_it_leaves_out)
    exits 0 decode ClientEcho --json --hex=08071001
    says 'qel-wire: without 1 unknown field, which JSON has no place for'
    ;;
  two_messages_in_one)
    exits 0 decode ClientEcho --hex=08070808
    says "qel-wire: 1 field again or out of order, the first at offset 2: these may be two messages, of which the later one's values are kept ('qel-wire explain' marks them)"
    ;;
  broken_bytes)
    exits 1 decode ClientEcho --hex=080750
    says "qel-wire: broken at offset 3: the input ends within the number of field 10 ('qel-wire explain' shows what comes before)"
    [ ! -s "$scratch/out" ] || fail 'decoded all the same'
    exits 1 explain ClientEcho --hex=080750
    grep -q '^000000  08 07 .*requestId' "$scratch/out" || fail 'not what comes before'
    ;;
  broken_text)
    echo 'requestId: 7 nothing: 8' >"$scratch/text"
    exits 1 encode ClientEcho "$scratch/text"
    says 'qel-wire: the text is no ClientEcho: 1:21: Message type "ClientEcho" has no field named "nothing".'
    ;;
  complaints_have_nothing_that_terminals_obey)
    exits 2 $'--\033[2J'
    says "qel-wire: there is no option '--\\033[2J', or it takes another value ('qel-wire --help')"
    exits 3 decode ClientEcho $'\033[2J'
    says 'qel-wire: cannot read '"'\\033[2J'"': No such file or directory'
    exits 2 decode $'\033[2J'
    says "qel-wire: there is no message '\\033[2J'; 'qel-wire schema' lists them"
    ;;
  complaints_have_no_bytes)
    for call in '--hx=0801320a7365' '--hex 0801320a7365' 'explain --hex 0801320a7365' \
      'decode ClientEcho --hex 0801320a7365' 'decode ClientEcho 0801320a7365' 'schema 0801320a7365'; do
      # shellcheck disable=SC2086
      "$tool" $call 2>"$scratch/err" >"$scratch/out" </dev/null && fail "taken: $call"
      [ -s "$scratch/err" ] || fail "no complaint: $call"
      ! grep -q 0801 "$scratch/err" || fail "the bytes: $call"
    done
    ;;
  broken_hex)
    exits 1 decode ClientEcho --hex=080
    says 'qel-wire: the input is no hex'
    exits 1 decode ClientEcho --base64=CAc,
    says 'qel-wire: the input is no base64'
    ;;
  guess_of_what_no_message_takes)
    exits 1 guess --hex=0f
    head -n 1 "$scratch/out" | grep -q '  broken$' || fail 'the best is not broken'
    ;;
  guess_is_ten_ranks_unless_all_are_asked_for)
    exits 0 guess --hex=580760016a020801
    [ "$(tail -n 1 "$scratch/out" | awk '{print $1}')" -le 10 ] || fail 'more'
    exits 0 guess --all --hex=580760016a020801
    [ "$(wc -l <"$scratch/out")" -eq 81 ] || fail 'not all'
    ;;
  options_that_the_command_has_not)
    exits 2 guess --json --hex=0807
    says 'qel-wire: guess has no option --json'
    exits 2 schema --all
    says 'qel-wire: schema has no option --all'
    ;;
  wrong_calls)
    for call in '' nothing 'decode' 'explain' 'decode Nothing' 'schema Nothing' 'schema A B' \
      'decode --hex=08 ClientEcho file' '--color=maybe guess' '--nothing' 'encode ClientEcho --hex=08'; do
      # shellcheck disable=SC2086
      exits 2 $call
      [ -s "$scratch/err" ] || fail "no complaint: $call"
      [ ! -s "$scratch/out" ] || fail "output: $call"
    done
    ;;
  input_without_end)
    for call in 'decode ClientEcho' 'explain ClientEcho' guess 'encode ClientEcho' 'decode ClientEcho --hex'; do
      # shellcheck disable=SC2086
      exits 1 $call /dev/zero
      says 'qel-wire: the input has more than 64 MiB'
    done
    ;;
  without_memory)
    head -c 60000000 /dev/zero >"$scratch/zeros"
    (ulimit -v 100000 && exits 3 decode ClientEcho "$scratch/zeros")
    says 'qel-wire: there is not enough memory'
    rm "$scratch/zeros"
    ;;
  unreadable_input)
    exits 3 decode ClientEcho "$scratch/nothing"
    says "qel-wire: cannot read '$scratch/nothing': No such file or directory"
    exits 3 decode ClientEcho --hex 0807
    says 'qel-wire: there is no such file; bytes in the call itself are written --hex=BYTES, --base64=BYTES'
    exits 3 decode ClientEcho "$scratch"
    says "qel-wire: cannot read '$scratch': Is a directory"
    ;;
  output_that_cannot_be_written)
    status=0
    "$tool" schema >/dev/full 2>"$scratch/err" || status=$?
    [ "$status" -eq 3 ] || fail "exit status $status"
    says 'qel-wire: the output cannot be written'
    ;;
  help_and_version)
    exits 0 --help
    grep -q '^usage: qel-wire COMMAND' "$scratch/out" || fail 'no usage'
    exits 0 decode ClientEcho --help
    grep -q '^usage: qel-wire COMMAND' "$scratch/out" || fail 'no usage in a call of something else'
    exits 0 --version
    grep -Eqx 'qel-wire [0-9]+\.[0-9]+\.[0-9]+' "$scratch/out" || fail 'no version'
    ;;
  colours_are_for_terminals)
    exits 0 explain ClientEcho --hex=0807
    ! grep -q $'\033' "$scratch/out" || fail 'colours in a file'
    script -qec "'$tool' explain ClientEcho --hex=0807" /dev/null >"$scratch/terminal" </dev/null
    grep -q $'\033\\[36mrequestId' "$scratch/terminal" || fail 'no colours on a terminal'
    NO_COLOR=1 script -qec "'$tool' explain ClientEcho --hex=0807" /dev/null >"$scratch/terminal" </dev/null
    ! grep -q $'\033' "$scratch/terminal" || fail 'colours in spite of NO_COLOR'
    for call in 'explain ClientEcho --hex=0807' 'decode ClientEcho --hex=0807' \
      'decode ClientEcho --json --hex=0807' 'guess --hex=0807' 'schema ClientEcho'; do
      # shellcheck disable=SC2086
      exits 0 --color=always $call
      grep -q $'\033\\[36m' "$scratch/out" || fail "no colours that were asked for: $call"
    done
    ;;
  access_token_is_shown_if_asked_for)
    bytes=3208612d736563726574
    for command in 'decode ChannelAuthRequest' 'decode ChannelAuthRequest --json' \
      'explain ChannelAuthRequest' guess; do
      # shellcheck disable=SC2086
      exits 0 $command --hex=$bytes
      ! grep -Eq 'a-secret|61 2d 73' "$scratch/out" "$scratch/err" || fail "$command"
      [ "$command" != guess ] || break
      # shellcheck disable=SC2086
      exits 0 $command --show-token --hex=$bytes
      grep -q a-secret "$scratch/out" || fail "$command --show-token"
    done
    ;;
  access_token_that_is_hidden_is_not_encoded)
    exits 0 decode ChannelAuthRequest --hex=3208612d736563726574
    mv "$scratch/out" "$scratch/text"
    exits 1 encode ChannelAuthRequest "$scratch/text"
    says 'qel-wire: the text has (not shown) for what was hidden: decode the bytes with --show-token'
    [ ! -s "$scratch/out" ] || fail 'encoded all the same'
    ;;
  page_shows_what_happens)
    # The sessions of the page, one after the other.
    awk '/^```/ {on = $0 == "```console"; next} on' "$source/docs/qel-wire.md" >"$scratch/page"
    PATH=$(dirname "$tool"):$PATH
    while IFS= read -r command; do
      printf '%s\n' "$ $command"
      bash -c "$command" 2>&1 || true
    done < <(sed -n 's/^\$ //p' "$scratch/page") >"$scratch/happens"
    [ -s "$scratch/page" ] || fail 'no sessions'
    diff "$scratch/page" "$scratch/happens" >&2 || fail 'the page shows something else'
    ;;
  command_of_the_readme_works)
    mkdir -p "$scratch/build/release/tools/qel-wire"
    ln -s "$tool" "$scratch/build/release/tools/qel-wire/qel-wire"
    command=$(grep '^build/release/tools/qel-wire/qel-wire ' "$source/README.md")
    (cd "$scratch" && bash -euc "$command") >"$scratch/out"
    grep -q '^000000  08 07 .*requestId' "$scratch/out" || fail 'another message'
    ;;
  page_has_every_option)
    diff <("$tool" --help | grep -oE -- '--[a-z0-9-]+' | grep -Evx -- '--(help|version)' | sort -u) \
      <(grep -oE -- '`--[a-z0-9-]+' "$source/docs/qel-wire.md" | tr -d '`' | sort -u) >&2
    ;;
  completion_knows_commands)
    diff <(printf '%s\n' decode) <(completed d) >&2
    ;;
  completion_knows_messages)
    diff <(printf '%s\n' ChatRequest ChatReply) <(completed explain --all ChatR) >&2
    diff <(echo) <(completed decode MsgT) >&2
    diff <(echo) <(completed guess ChatR) >&2
    diff <(printf '%s\n' MsgType) <(completed schema MsgT) >&2
    ;;
  completion_goes_on_behind_values)
    diff <(printf '%s\n' explain) <(completed --color = never exp) >&2
    diff <(printf '%s\n' ChatRequest ChatReply) <(completed explain --hex = 0807 ChatR) >&2
    diff <(printf '%s\n' always auto) <(completed --color = a) >&2
    diff <(printf '%s\n' always never auto) <(completed --color =) >&2
    diff <(echo) <(completed --hex = a) >&2
    ;;
  completion_knows_every_option)
    diff <(completed --) <("$tool" --help | grep -oE '^  --[a-z0-9-]+(, --version)?(=WHEN)?' |
      sed 's/^ *//; s/=WHEN/=/; s/, /\n/') >&2
    ;;
  *)
    fail "no such case: $1"
    ;;
esac
