#!/usr/bin/env bash
# reference_test.sh CASE SOURCE DOCS DOXYGEN: the API reference that was built in the folder DOCS.
set -euo pipefail
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
source=$2
docs=$3
doxygen=$4
html=$docs/html
header=$source/proto-lib/qel-message-serialize.h
functions=$source/proto-lib/exported-functions.txt

records() { sed -nE 's/^\} (qel_message_[a-z]+_t);/\1/p' "$header"; }

# Targets of links and pictures, and of the tree beside the pages. Its index names a list of pages
# even where there is none, at no place in the tree.
targets() {
  grep -ohE '(href|src|data)="[^"]+"' "$html"/*.html | sed -E 's/^[a-z]+="//; s/"$//' | grep -vE '^[a-z]+:'
  sed -E '/":\[\],?$/d' "$html"/*.js | grep -oE '"[^" ]+\.html(#[^"]*)?"' | tr -d '"'
}

# complete FOLDER: there are its pages.
complete() {
  [ -s "$1/share/doc/qel-message-protosvc/html/index.html" ]
  [ -s "$1/share/doc/qel-message-protosvc/html/doxygen-awesome.css" ]
  [ -s "$1/share/man/man3/chat_request_serialize.3" ]
}

# entries_with PATTERN: the functions whose entry on a web page has such a line.
entries_with() {
  awk -v text="$1" '/"memname">(int|void) / { name = $3 } $0 ~ text { print name }' \
    "$html"/group*.html | sort -u
}

# man_pages_with SECTION PATTERN: the functions whose man page has such a line in the section.
man_pages_with() {
  awk -v name="$1" -v text="$2" \
    '/^[.]SH/ { inside = index($0, name) } inside && $0 ~ text { print FILENAME }' \
    "$docs"/man/man3/*serialize.3 | sed 's|.*/||; s/[.]3$//' | sort -u
}

are_all_functions() { diff <(sort "$functions") - >&2; }

case $1 in
  is_installed)
    cmake --install "${docs%/docs}" --prefix "$scratch" --component development >/dev/null
    complete "$scratch"
    ;;
  is_packaged)
    cpack --config "${docs%/docs}/CPackConfig.cmake" -G DEB -D CPACK_COMPONENTS_ALL=development \
      -B "$scratch" >"$scratch/messages"
    dpkg-deb -x "$scratch"/libqel-message-protosvc-dev_*.deb "$scratch"
    complete "$scratch/usr"
    ;;
  every_function_has_an_entry)
    diff <(sort "$functions") \
      <(grep -ohE '<td class="memname">(int|void) [a-z_]+' "$html"/group*.html | sed 's/.* //' | sort) >&2
    ;;
  every_function_has_a_man_page)
    diff <(sort "$functions") <(find "$docs/man/man3" -name '*serialize.3' -printf '%f\n' | sed 's/\.3$//' | sort) >&2
    ;;
  every_record_has_an_entry)
    [ "$(records | wc -l)" -eq 5 ]
    diff <(records | sort) \
      <(sed -nE 's/.*<title>.*: (.*) Struct Reference<.*/\1/p' "$html"/struct*.html | sort) >&2
    ;;
  every_function_is_in_the_table_of_owners)
    diff "$functions" \
      <(sed -nE 's/^<td class="markdownTableBody[A-Za-z]*"><a [^>]*>([a-z_]+serialize)<.*/\1/p' \
        "$html/page_docs_interface.html") >&2
    ;;
  every_page_is_in_the_navigation)
    diff <(find "$html" -name 'page_*.html' -printf '%f\n' | sort) \
      <(grep -oE '@ref page_\w+' "$source/docs/layout.xml" | sed 's/@ref //; s/$/.html/' | sort -u) >&2
    ;;
  every_function_says_who_frees_what)
    entries_with 'Who frees what.*The caller frees .*"qel-message-serialize_8h.html"' |
      are_all_functions
    man_pages_with 'WHO FREES WHAT' '^The caller frees .*[.]h.*[(]3[)]' | are_all_functions
    ;;
  what_is_freed_is_as_in_the_table)
    [ "$(man_pages_with 'WHO FREES WHAT' '[*]state')" = typing_updated_deserialize ]
    ;;
  every_function_says_what_to_include)
    entries_with '#include &lt;<a [^>]*"qel-message-serialize_8h.html"' | are_all_functions
    man_pages_with SYNOPSIS '#include <qel.*[.]h>' | are_all_functions
    ;;
  every_function_says_what_to_see_also)
    entries_with 'See also.*"qel-message-serialize_8h.html"' | are_all_functions
    man_pages_with 'SEE ALSO' '[.]h.*[(]3[)]' | are_all_functions
    # Each is named by the other one of its exchange.
    sed -sn '/^\.SH "SEE ALSO"/,$p' "$docs"/man/man3/*serialize.3 | grep -oE '[a-z_]+serialize' |
      sort -u | are_all_functions
    ;;
  every_diagram_is_drawn)
    in_pages=$(cd "$source" && find . -name '*.md' -not -path './build/*' -not -path './.*/*' -exec cat {} + |
      grep -cx '```mermaid')
    drawn=$(grep -ohE 'data="[^"]*umlgraph[^"]*\.svg"' "$html"/*.html | sed 's/data="//; s/"//' | sort -u)
    [ "$(wc -l <<<"$drawn")" -eq "$in_pages" ] || { echo "$in_pages in the pages, drawn: $drawn" >&2 && exit 1; }
    while IFS= read -r file; do
      grep -q '</text>' "$html/$file" || { echo "$file is empty" >&2 && exit 1; }
    done <<<"$drawn"
    ;;
  links_lead_somewhere)
    missing=$(cd "$html" && targets | sed 's/[#?].*//' | sort -u | while IFS= read -r file; do
      [ -z "$file" ] || [ -e "$file" ] || echo "$file"
    done)
    [ -z "$missing" ] || { echo "no such file: $missing" >&2 && exit 1; }
    ;;
  argument_without_comment_is_refused)
    mkdir "$scratch/proto-lib"
    cp -r "$source/docs" "$scratch/docs"
    sed '/@param callId /d' "$header" >"$scratch/proto-lib/${header##*/}"
    touch "$scratch/doxygen-awesome.css"
    cd "$scratch"
    if QEL_VERSION='' QEL_PLANTUML='' QEL_DOXYGEN_THEME=$scratch QEL_DOCS_PAGES='' \
      QEL_DOCS_FOLDER=$scratch "$doxygen" docs/Doxyfile 2>out; then
      echo "accepted" >&2
      exit 1
    fi
    cat out >&2
    grep -A1 'of save_call_log_request_serialize' out | grep -q "parameter 'callId'"
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
