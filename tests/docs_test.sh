#!/usr/bin/env bash
# docs_test.sh CASE SOURCE: the Markdown pages as they are read in the repository, and the picture of
# the architecture.
set -euo pipefail
cd "$2"

# Of the repository, not of what is built in it.
pages() { find . -name '*.md' -not -path './build/*' -not -path './.*/*' -printf '%P\n' | sort; }

# text PAGE: the page without its blocks of code.
text() { awk '/^```/ {code = !code; next} !code' "$1"; }

# anchors PAGE: those that viewers give to its headings.
anchors() {
  text "$1" | sed -nE 's/^#+ //p' | sed -E 's/\]\([^)]*\)//g' | perl -C -pe '$_ = lc; s/[^\w\- \n]//g; s/ /-/g' |
    awk '{print $0 (seen[$0]++ ? "-" seen[$0] - 1 : "")}'
}

# links PAGE: the targets of its relative links and images.
links() { text "$1" | grep -oP '\]\(\K[^()\s]+(?=\))' | grep -vE '^[a-z]+:' || true; }

broken_links() {
  local page target file
  while IFS= read -r page; do
    while IFS= read -r target; do
      file=$page
      [ -z "${target%%#*}" ] || file=$(dirname "$page")/${target%%#*}
      if [ ! -e "$file" ]; then
        echo "$page: $target: no such file"
      elif [[ $target == *'#'* ]] && ! anchors "$file" | grep -qxF -- "${target#*#}"; then
        echo "$page: $target: no such heading"
      fi
    done < <(links "$page")
  done < <(pages)
}

# Of the picture's source: every label, a line of it a line here.
labels_of_source() { grep -oE 'label="[^"]*"' docs/architecture.dot | sed -E 's/^label="//; s/"$//; s/\\n/\n/g'; }

labels_of_picture() { sed -nE 's/^<text [^>]*>(.*)<\/text>$/\1/p' docs/architecture.svg | sed "s/&#39;/'/g; s/&#45;/-/g"; }

trim() { sed -E 's/^ +| +$//g' | sort; }

case $1 in
  links_lead_somewhere)
    [ "$(pages | wc -l)" -gt 1 ]
    found=$(broken_links)
    [ -z "$found" ] || { echo "$found" >&2 && exit 1; }
    ;;
  picture_has_every_folder)
    diff <(find . -mindepth 1 -maxdepth 1 -type d -not -name '.*' -not -name build -printf '%P/\n' | sort) \
      <(labels_of_source | grep '/$' | sort) >&2
    ;;
  picture_is_that_of_its_source) # the fonts differ from machine to machine
    diff <(labels_of_source | trim) <(labels_of_picture | trim) >&2
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
