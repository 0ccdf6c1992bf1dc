#!/usr/bin/env bats
# qel-message.h in a user's source: the mistakes that the compiler refuses, with the warnings that most
# projects ask for, and what the header brings along.
load build

# compiles LANGUAGE BODY: a function with that body, which has received some bytes.
compiles() {
  local body=$2 compiler=$CC
  [ "$1" = c ] || { compiler=$CXX && body=${body//'{0}'/'{}'}; }
  cat >code <<CODE
#include "qel-message.h"
int take(const unsigned char* data, int size);
int take(const unsigned char* data, int size) { $body }
CODE
  "$compiler" "${C_FLAGS[@]}" -O1 -Wall -Wextra -Werror -I "$SOURCE/proto-lib" -x "$1" -c code -o code.o
}

# is_refused TEXT BODY: in both languages, for this reason.
is_refused() {
  refused "$1" compiles c "$2"
  refused "$1" compiles c++ "$2"
}

@test "a record that is zeroed, read, looked at and released compiles" {
  for language in c c++; do
    compiles "$language" 'qel_chat_reply_t chat = {0}; int count = 0;
      if (qel_chat_reply_read(&chat, data, size) == QEL_OK) { count = chat.count; }
      qel_chat_reply_release(&chat); return count;'
  done
}

@test "the header brings neither data nor functions that others see" {
  compiles c 'qel_chat_reply_t chat = {0}; return qel_chat_reply_read(&chat, data, size) == QEL_OK;'
  diff <("$NM" -g --defined-only code.o | awk '{ print $3 }') <(echo take)
  "$NM" code.o | grep -i ' [bcdgs] ' | none
}

@test "each call that has a status asks for somebody to look at it" {
  calls='qel_[a-z_]+_(read|write)\('
  [ "$(grep -cE "^QEL_MUST_USE static inline qel_status_t $calls" "$SOURCE/proto-lib/qel-message.h")" -eq 32 ]
  grep -E "^static inline .*$calls" "$SOURCE/proto-lib/qel-message.h" | none
}

@test "a status of reading that nobody looks at is refused" {
  is_refused 'ignoring return value' \
    'qel_client_echo_t echo = {0}; qel_client_echo_read(&echo, data, size); return 0;'
}

@test "a status of writing that nobody looks at is refused" {
  is_refused 'ignoring return value' \
    'qel_buffer_t buffer = {0}; (void)data; qel_client_echo_reply_write(&buffer, size); return 0;'
}

@test "a record that is not zeroed is refused" {
  [[ $("$CC" --version) != *clang* ]] || skip "clang does not see it"
  is_refused 'uninitialized' \
    'qel_chat_reply_t chat; return qel_chat_reply_read(&chat, data, size) == QEL_OK;'
}

@test "a record of another message is refused" {
  is_refused 'qel_chat_reply_t' \
    'qel_invite_reply_t invited = {0}; return qel_chat_reply_read(&invited, data, size) == QEL_OK;'
}

@test "two outputs in place of a buffer are refused" {
  is_refused 'argument' \
    'unsigned char* message = 0; (void)data;
     return qel_client_echo_reply_write(&message, &size, 7) == QEL_OK;'
}
