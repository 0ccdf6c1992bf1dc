#!/usr/bin/env bats
# The API reference, web pages and man pages.
load build

docs=$BUILD/docs
header=$SOURCE/proto-lib/qel-message-serialize.h

setup() { cd "$docs/html" || exit; }

are_all_functions() { diff <(functions | sort) <(sort -u); }

# entries_have PATTERN: every function's entry on a web page has such a line.
entries_have() {
  awk -v text="$1" '/"memname">(int|void) / { name = $3 } $0 ~ text { print name }' group*.html |
    are_all_functions
}

# man_pages_with SECTION PATTERN: the functions whose man page has such a line in the section.
man_pages_with() {
  awk -v name="$1" -v text="$2" \
    '/^[.]SH/ { inside = index($0, name) } inside && $0 ~ text { print FILENAME }' \
    "$docs"/man/man3/*serialize.3 | sed 's|.*/||; s/[.]3$//' | sort -u
}

@test "every function has an entry: what to include, who frees what, what to see also" {
  entries_have '#include &lt;<a [^>]*"qel-message-serialize_8h.html"'
  entries_have 'Who frees what.*The caller frees .*"qel-message-serialize_8h.html"'
  entries_have 'See also.*"qel-message-serialize_8h.html"'
}

@test "every function has a man page: what to include, who frees what, what to see also" {
  man_pages_with SYNOPSIS '#include <qel.*[.]h>' | are_all_functions
  man_pages_with 'WHO FREES WHAT' '^The caller frees .*[.]h.*[(]3[)]' | are_all_functions
  man_pages_with 'SEE ALSO' '[.]h.*[(]3[)]' | are_all_functions
  # Each is named by the other one of its exchange.
  sed -sn '/^\.SH "SEE ALSO"/,$p' "$docs"/man/man3/*serialize.3 | grep -oE '[a-z_]+serialize' |
    are_all_functions
}

@test "every function is in the table of owners, from which man pages have what is freed" {
  grep -oP '^<td class="markdownTableBody\w*"><a [^>]*>\K[a-z_]+serialize(?=<)' \
    page_docs_interface.html | are_all_functions
  [ "$(man_pages_with 'WHO FREES WHAT' '[*]state')" = typing_updated_deserialize ]
}

@test "every function of qel-message.h has a man page, which names the function that it stands on" {
  cd "$docs/man/man3"
  mapfile -t pages < <(printf '%s\n' qel_*_{read,write,release}.3 | grep -v '^qel_test')
  diff <(grep -oE '\bqel_[a-z_]+_(read|write|release)\(' "$SOURCE/proto-lib/qel-message.h" |
    grep -v internal | tr -d '(' | sort -u) <(printf '%s\n' "${pages[@]%.3}" | sort)
  grep -LF '#include <qel\-message.h>' "${pages[@]}" | none
  sed -sn '/^\.SH "SEE ALSO"/,$p' qel_*_{read,write}.3 | grep -oE '[a-z_]+serialize' | sort -u |
    diff <(functions | grep -v '^forward_stored_message_' | sort) -
}

@test "every function of the test kit has a man page" {
  cd "$docs/man/man3"
  for name in testkit testlog; do
    diff <(grep -oE "\bqel_${name}_\w+\(" "$SOURCE/testkit/qel-$name.h" | tr -d '(' | sort -u) \
      <(grep -lF "#include <qel\-$name.h>" "qel_$name"_*.3 | grep -v '_t[.]3$' | sed 's/[.]3$//')
  done
}

@test "the man page of a header includes it" {
  cd "$docs/man/man3"
  for page in qel-*.h.3; do
    name=${page%.3}
    grep -qxF ".B #include <${name//-/\\-}>" "$page" || echo "$page"
  done | none
}

@test "every value and macro of qel-message.h has an entry and is on a man page" {
  grep -oE '(^ *|[#]define |enum \{ )QEL_[A-Z0-9_]+( |,|\()' "$SOURCE/proto-lib/qel-message.h" |
    grep -oE 'QEL_[A-Z0-9_]+' | grep -vE 'QEL_(INTERNAL_|MUST_USE)' | sort -u >"$BATS_TEST_TMPDIR/values"
  for page in group__qel__common.html ../man/man3/qel_common.3; do
    tr -d "\\\\" <"$page" | grep -oE 'QEL_[A-Z0-9_]+' | grep -v INTERNAL | sort -u |
      diff "$BATS_TEST_TMPDIR/values" -
  done
}

@test "an argument has the words of the function below, unless qel-message.h has others" {
  cd "$docs/man/man3"
  grep -A 1 'chatroomId\\fP' qel_chat_request_write.3 | grep -q 'the chatroom'
  grep -A 1 'msgType\\fP' qel_chat_request_write.3 | grep -q 'any other number is refused'
  grep -A 1 'fInumber\\fP' qel_is_msg_type.3 | grep -q 'any number'
}

@test "every record has an entry" {
  diff <(sed -nE 's/^\} (qel_[a-z_]+_t);/\1/p' "$header" "$SOURCE"/{proto-lib/qel-message,testkit/qel-testkit}.h |
    grep -vE '^qel_(status|result_code|chat_type|msg_type|content_type)_t' | sort) \
    <(sed -nE 's/.*<title>.*: (.*) Struct Reference<.*/\1/p' struct*.html | sort)
}

@test "every page is in the navigation" {
  diff <(printf '%s\n' page_*.html) \
    <(grep -oP '@ref \Kpage_\w+' "$SOURCE/docs/layout.xml" | sed 's/$/.html/' | sort -u)
}

@test "every diagram is drawn" {
  mapfile -t drawn < <(grep -ohP 'data="\K[^"]*umlgraph[^"]*\.svg' ./*.html | sort -u)
  in_pages=$(grep -rhx '```mermaid' --include='*.md' --exclude-dir={build,'.?*'} "$SOURCE" | wc -l)
  [ "${#drawn[@]}" -eq "$in_pages" ] || fail "$in_pages in the pages, drawn:" "${drawn[@]}"
  grep -L '</text>' "${drawn[@]}" | none
}

@test "links and pictures lead somewhere" {
  # Those of pages, and those of the tree beside them, whose index names a list of pages even where
  # there is none.
  {
    grep -ohP '(href|src|data)="\K[^"#?]+' ./*.html | grep -vE '^[a-z]+:'
    sed -E '/":\[\],?$/d' ./*.js | grep -oP '"\K[^" ]+\.html(?=(#[^"]*)?")'
  } | sort -u | while IFS= read -r file; do
    [ -e "$file" ] || echo "$file"
  done | none
}

@test "an argument without a comment is refused" {
  cd "$BATS_TEST_TMPDIR"
  mkdir proto-lib
  cp -r "$SOURCE/docs" docs
  sed '/@param callId /d' "$header" >proto-lib/qel-message-serialize.h
  cp "$SOURCE/proto-lib/qel-message.h" proto-lib
  ln -s "$SOURCE/testkit" testkit
  touch doxygen-awesome.css
  QEL_VERSION='' QEL_PLANTUML='' QEL_DOXYGEN_THEME=$PWD QEL_DOCS_PAGES='' QEL_DOCS_FOLDER=$PWD \
    run ! doxygen docs/Doxyfile
  grep -A1 'of save_call_log_request_serialize' <<<"$output" | grep -q "parameter 'callId'"
}

@test "web pages and man pages are installed with the documentation" {
  cmake --install "$BUILD" --prefix "$BATS_TEST_TMPDIR" --component documentation
  cd "$BATS_TEST_TMPDIR/share"
  [ -s doc/qel-message-protosvc/html/index.html ]
  [ -s doc/qel-message-protosvc/html/doxygen-awesome.css ]
  [ -s man/man3/chat_request_serialize.3 ]
}
