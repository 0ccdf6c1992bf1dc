# The C blocks of a Markdown page as one C file, each with its line in the page for the compiler to
# name; with -v header=1 the declarations of their functions. A block that is neither under "Wrong:"
# nor under "Right:" is an error.
BEGIN {
  print "#include \"qel-message-serialize.h\""
  if (header) {
    print "#ifdef __cplusplus\nextern \"C\" {\n#endif"
  } else {
    print "#include <stdlib.h>\n#include <string.h>\n#include \"mistakes_examples.h\""
  }
}
END {
  if (header) {
    print "#ifdef __cplusplus\n}\n#endif"
  }
}

on && /^```$/ { on = 0; label = ""; next }
on && header && /^[a-z].*\(/ && !/^static / { head = 1 }
on && header && head && sub(/ \{$/, ";") { print; head = 0 }
on && header && head { print }
on { if (!header) print; next }
/^```c$/ {
  if (label == "") {
    print "#error a block that is neither wrong nor right"
  }
  on = 1
  if (!header) {
    printf "\n#line %d \"%s\"\n", FNR + 1, FILENAME
  }
  next
}
/^(Wrong|Right):$/ { label = $0; next }
/[^[:space:]]/ { label = "" }
