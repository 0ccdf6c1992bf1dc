#!/usr/bin/env bats
# What the repository says about itself: the header's functions against what has to name them;
# the picture. Doxygen looks at links.
# shellcheck disable=SC2016 # backticks of Markdown
load build

setup() { cd "$SOURCE" || exit; }

@test "the module has the functions of the header, in its order" {
  diff <(functions) <(functions proto-lib/qel-message-serialize.cc)
}

@test "the table of docs/interface.md has a row for each function" {
  diff <(functions) <(sed -nE 's/^\| `([a-z_]+serialize)` \|.*/\1/p' docs/interface.md)
}

@test "the diagrams of docs/interface.md show each function" {
  diff <(functions | grep -v '^forward_stored_message_' | sort) \
    <(sed -nE 's/^ *P->>L: ([a-z_]+serialize).*/\1/p' docs/interface.md | sort -u)
}

@test "the project's version is the newest in CHANGELOG.md, or a later one with unreleased changes" {
  newest=$(grep -m 1 -oP '^## \[\K[\d.]+(?=\] - \d{4}-\d\d-\d\d$)' CHANGELOG.md)
  [ "$VERSION" = "$newest" ] || {
    dpkg --compare-versions "$VERSION" gt "$newest"
    sed '/^## \[Unreleased\]/,/^## /!d' CHANGELOG.md | grep -q '^- '
  }
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
