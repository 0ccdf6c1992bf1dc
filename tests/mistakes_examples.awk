# The C blocks of a Markdown page as one C file, each with its line in the page for the compiler to
# name. A block that is neither under "Wrong:" nor under "Right:" is an error.
BEGIN {
  print "#include <stdlib.h>"
  print "#include <string.h>"
  print ""
  print "#include \"mistakes_examples.h\""
}

on && /^```$/ { on = 0; label = ""; next }
on { print; next }
/^```c$/ {
  if (label == "") {
    print "#error a block that is neither wrong nor right"
  }
  on = 1
  printf "\n#line %d \"%s\"\n", FNR + 1, FILENAME
  next
}
/^(Wrong|Right):$/ { label = $0; next }
/[^[:space:]]/ { label = "" }
