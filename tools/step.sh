# shellcheck shell=bash
# How ./dev and runtime/get say what they do, and why it failed. They set $log, the file for the
# chatter of the commands.

say() { printf 'dev: %s\n' "$*"; }

fail() {
  say "$*" >&2
  exit 1
}

# The reason of a failure in the chatter on standard input: the full disk, or else the first error.
reason_in() {
  awk -v error='(^|[: ])(fatal )?[Ee]rror: |^E: |^CMake Error|^[^ ]+:[0-9]+:[0-9]+: [A-Z"]|cannot find -l|undefined reference to|multiple definition of' '
    /No space left on device|Disk quota exceeded/ && !full { full = "the disk is full: " $0 }
    $0 ~ error && !first { first = $0; more = 9; next }
    more && /^([ \t]|$)/ { first = first "\n" $0; more--; next }
    { more = 0 }
    END { print full ? full : first }'
}

# step WHAT ADVICE COMMAND...: says what is done; the command's chatter goes to the log. If the
# command fails, the advice and the reason are shown.
step() {
  local what=$1 advice=$2 chatter status reason
  shift 2
  say "$what"
  set +e # not 'if': the functions called here rely on errexit, which a condition switches off
  # Not read from the log, as its disk may be full.
  # shellcheck disable=SC2154
  chatter=$( (set -e; printf '\n== %s: %s\n' "$what" "$*"; "$@") 2>&1 </dev/null |
    tee -a "$log" 2>&1)
  status=$?
  set -e
  [ "$status" -eq 0 ] && return
  reason=$(printf '%s\n' "$chatter" | reason_in)
  [ -n "$reason" ] || reason=$(printf '%s\n' "$chatter" | tail -n 25)
  [[ $reason != 'the disk is full'* ]] || advice=''
  say "$what: failed${advice:+; $advice}" >&2
  printf '%s\n' "$reason" >&2
  fail "whole log: $log"
}
