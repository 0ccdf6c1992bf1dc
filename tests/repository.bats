#!/usr/bin/env bats
# What the repository says about itself: the list of the exported functions, which has them in the
# interface's order, against what has to name them; numbers; the picture. Doxygen looks at links.
# shellcheck disable=SC2016 # backticks of Markdown
load build

setup() {
  cd "$SOURCE" || exit
  list=proto-lib/exported-functions.txt
}

declared() { sed -nE 's/^(int|void) ([a-z_]+_(de)?serialize)\(.*/\2/p' "$1"; }

# All but those that do nothing.
working() { grep -v '^forward_stored_message_' "$list"; }

@test "the header has the functions of the list, in its order" {
  diff "$list" <(declared proto-lib/qel-message-serialize.h)
}

@test "the module has the functions of the list, in its order" {
  diff "$list" <(declared proto-lib/qel-message-serialize.cc)
}

@test "the table of docs/interface.md has a row for each function" {
  diff "$list" <(sed -nE 's/^\| `([a-z_]+serialize)` \|.*/\1/p' docs/interface.md)
}

@test "the diagrams of docs/interface.md show each function" {
  diff <(working | sort) \
    <(sed -nE 's/^ *P->>L: ([a-z_]+serialize).*/\1/p' docs/interface.md | sort -u)
}

@test "the tables of README.md show each function" {
  diff <(sort "$list") <(grep '^|' README.md | grep -oE '`[a-z_]+serialize`' | tr -d '`' | sort)
}

@test "each deserializer has a fuzz target" {
  # It has the name of its folder of seeds; three are for all functions or messages, or the tool.
  diff <((working | grep '_deserialize$' && printf '%s\n' qel_wire round_trip serializers) | sort) \
    <(find fuzz/seeds -mindepth 1 -maxdepth 1 -printf '%f\n' | sort)
}

@test "fuzzing calls each serializer" {
  diff <(working | grep -v '_deserialize$' | sort) \
    <(grep -oE '\<[a-z_]+_serialize\>' fuzz/serializers.cc | sort -u)
}

@test "pages say how many functions and messages there are" {
  diff <(printf '%s\n' "$(wc -l <"$list") functions" \
    "$(grep -c '^message ' proto-lib/msgspec_frontend.proto) messages" | sort) \
    <(grep -ohE '\<[0-9]{2,} (functions|messages)\>' README.md docs/*.dot \
      docs/{architecture,interface,qel-wire}.md | sort -u)
}

@test "the newest version in CHANGELOG.md is the project's" {
  diff <(echo "$VERSION") \
    <(grep -m 1 -oP '^## \[\K[\d.]+(?=\] - \d{4}-\d\d-\d\d$)' CHANGELOG.md)
}

@test "unreleased changes come first in CHANGELOG.md" {
  [ "$(grep -m 1 '^## ' CHANGELOG.md)" = '## [Unreleased]' ]
}

# Of the picture and of its source: the labels, a line of them a line here.
labels_of_source() {
  grep -oP 'label="\K[^"]*' docs/architecture.dot | sed 's/\\n/\n/g' | sed -E 's/^ +| +$//g'
}
labels_of_picture() {
  sed -nE "s/&#39;/'/g; s/&#45;/-/g; s|^<text [^>]*> *(.*[^ ]) *</text>$|\1|p" docs/architecture.svg
}

@test "the picture of docs/architecture.md has every folder" {
  diff <(find -- * -maxdepth 0 -type d -not -name build -printf '%f/\n' | sort) \
    <(labels_of_source | grep '/$' | sort)
}

@test "the picture of docs/architecture.md is that of its source" { # but for fonts and places
  diff <(labels_of_source | sort) <(labels_of_picture | sort)
}
