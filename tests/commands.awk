# The commands of Markdown pages, a line each: those of shell blocks, without comments and with
# continued lines joined; in console blocks those behind a prompt; and those in backticks that call
# ./dev, cmake, ctest, cpack or pkg-config with an argument.

function command(text) {
  sub(/(^|[ \t])#.*/, "", text)
  gsub(/[ \t]+/, " ", text)
  gsub(/^ | $/, "", text)
  if (text != "") {
    print text
  }
}

function end_of_paragraph(words, n, i) {
  n = split(paragraph, words, "`")
  for (i = 2; i <= n; i += 2) {
    if (words[i] ~ /^([A-Z_]+=[^ ]+ )*(\.\/dev|cmake|ctest|cpack|pkg-config) /) {
      command(words[i])
    }
  }
  paragraph = ""
}

FNR == 1 { end_of_paragraph(); fence = "" }
/^[ \t]*```/ {
  end_of_paragraph()
  fence = fence != "" ? "" : ($0 ~ /```(sh|bash|shell)$/ ? "shell" : $0 ~ /```console$/ ? "console" : "other")
  next
}
fence == "shell" && sub(/\\$/, "") { joined = joined $0; next }
fence == "shell" { command(joined $0); joined = ""; next }
fence == "console" && sub(/^\$ /, "") { command($0) }
fence == "console" || fence == "other" { next }
/^[ \t]*$/ { end_of_paragraph(); next }
{ paragraph = paragraph " " $0 }
END { end_of_paragraph() }
