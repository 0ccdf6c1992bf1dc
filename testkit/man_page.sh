#!/bin/sh
# man_page.sh PROGRAM: the program's help as a man page.
set -eu
cat <<'TXT'
.TH QEL-TESTKIT 1
.SH NAME
qel-testkit \- plays a chat service for tests of message plug-ins
.SH DESCRIPTION
.nf
TXT
"$1" --help | sed 's/-/\\-/g'
