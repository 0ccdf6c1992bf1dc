#!/usr/bin/env bats
# The program as it is called, and the page that describes it. SOURCE is the repository, BUILT the
# folder of the program.
bats_require_minimum_version 1.5.0

setup() {
  export LC_ALL=C
  unset NO_COLOR
  PATH=$BUILT:$PATH
  tests=$SOURCE/qel-wire/tests
  page=$SOURCE/qel-wire/README.md
  cd "$BATS_TEST_TMPDIR" || exit
}

# repeat: the commands of the sessions on standard input, each followed by what it prints and by its
# exit status. Empty lines do not matter.
repeat() {
  local line status
  grep '^[#$] ' | while IFS= read -r line; do
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
  /usr/bin/python3 "$tests/reference.py" "$1" "$SOURCE"
}

# holds SESSIONS: repeated, they are the same. Of what differs, the session's title is shown.
holds() { [ -s "$1" ] && diff -u -F '^# ' <(grep . "$1") <(repeat <"$1"); }

@test "it prints what its sessions show" { holds "$tests/sessions.txt"; }

@test "it hides what its sessions hide" { holds "$tests/access_token.txt"; }

@test "its page shows what happens" {
  awk '/^```/ { on = $0 == "```console"; next } on' "$page" >page.txt
  holds page.txt
}

@test "its page has every option" {
  diff <(qel-wire --help | grep -oE -- '--[a-z0-9-]+' | grep -Evx -- '--(help|version)' | sort -u) \
    <(grep -oE -- '`--[a-z0-9-]+' "$page" | tr -d '`' | sort -u)
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
  ulimit -v 100000
  run -3 qel-wire decode ClientEcho zeros
  [ "$output" = 'qel-wire: there is not enough memory' ]
}

# completed WORD...: what the last word may become. Bash makes "=" a word of its own.
completed() {
  (
    # shellcheck source=/dev/null
    source "$SOURCE/qel-wire/completion.bash"
    COMP_WORDS=(qel-wire "$@") COMP_CWORD=$#
    _qel_wire
    echo "${COMPREPLY[@]}"
  )
}

@test "completion knows commands" {
  [ "$(completed d)" = decode ]
}

@test "completion knows messages where a command takes them" {
  [ "$(completed explain --all ChatR)" = 'ChatRequest ChatReply' ]
  [ "$(completed guess ChatR)" = '' ]
}

@test "completion knows enumerations for schema alone" {
  [ "$(completed schema MsgT)" = MsgType ]
  [ "$(completed decode MsgT)" = '' ]
}

@test "completion goes on behind values" {
  [ "$(completed --color = never exp)" = explain ]
  [ "$(completed explain --hex = 0807 ChatR)" = 'ChatRequest ChatReply' ]
}

@test "completion knows the values of --color alone" {
  [ "$(completed --color =)" = 'always never auto' ]
  [ "$(completed --color = a)" = 'always auto' ]
  [ "$(completed --hex = a)" = '' ]
}

@test "completion knows every option" {
  diff <(completed -- | tr ' ' '\n') \
    <(qel-wire --help | grep -oE '^  --[a-z0-9-]+(, --version)?(=WHEN)?' | sed 's/^ *//; s/=WHEN/=/; s/, /\n/')
}
