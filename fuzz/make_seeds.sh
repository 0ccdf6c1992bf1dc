#!/usr/bin/env bash
# make_seeds.sh FOLDER [PROTOC]: makes FOLDER, which must not be there yet, and writes the seeds of
# every target into FOLDER/TARGET. The bytes are those of the independent peer, Debian's protoc.
set -euo pipefail
folder=$1
protoc=${2:-protoc}
here=$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd -P)
schema=$here/../proto-lib
table=$here/../tests/schema_table.txt

# Without its warning that the schema does not state the syntax that it means.
encode() {
  "$protoc" --proto_path="$schema" --encode="$1" msgspec_frontend.proto 2> >(grep -v 'No syntax specified' >&2)
}

# seed TARGET NAME MESSAGE TEXT
seed() {
  mkdir -p "$folder/$1"
  encode "$3" <<<"$4" >"$folder/$1/$2"
}

# reply TARGET MESSAGE FIELDS: a whole one, and what every target has besides: no bytes at all, some
# that end in the middle of a field, a field that is unknown, and an end of a group that never began.
reply() {
  seed "$1" whole "$2" "$3"
  : >"$folder/$1/empty"
  head -c -1 "$folder/$1/whole" >"$folder/$1/cut_short"
  { cat "$folder/$1/whole" && printf '\xc0\x3e\x07'; } >"$folder/$1/unknown_field"
  { cat "$folder/$1/whole" && printf '\x0c'; } >"$folder/$1/end_of_group"
}

# Every field of a message in its text form, lists with two elements, from the schema's table.
all_fields() {
  awk -v message="$1" '
    $1 == "message" { current = $2; known[current] = 1; next }
    $1 == "enum" { current = ""; next }
    current != "" && NF == 4 {
      n = ++count[current]
      name[current, n] = $2; times[current, n] = $3 == "repeated" ? 2 : 1; type[current, n] = $4
    }
    function print_all(m, n, t) {
      for (n = 1; n <= count[m]; n++) {
        for (t = 0; t < times[m, n]; t++) {
          if (type[m, n] in known) {
            print name[m, n] " {"
            print_all(type[m, n])
            print "}"
          } else if (type[m, n] ~ /^(string|bytes)$/) print name[m, n] ": \"text\""
          else if (type[m, n] == "bool") print name[m, n] ": true"
          else if (type[m, n] ~ /^int/) print name[m, n] ": " n * 100 + t
          else print name[m, n] ": 0" # an enumeration
        }
      }
    }
    END { print_all(message) }' "$table"
}

mkdir -p "$(dirname "$folder")"
mkdir "$folder" # nothing is deleted, and no seed of an earlier time stays

refused='wrongReceiverDetail { invalidReceivers: [1, 2] interruptedReceivers: 3 disabledReceivers: [4, -5]
  existing: 6 notExisting: 7 invitationDenied: [8, 9] didViolationUsers { userA: 10 userB: 11 }
  didViolationUsers { userB: 12 } didViolationUsers { } }'
result='result { code: -3 msg: "text" subCode: 4 }'

reply channel_auth_reply_deserialize ChannelAuthReply "requestId: 7 $result"
seed channel_auth_reply_deserialize result_without_text ChannelAuthReply 'result { code: 1 }'
reply client_echo_deserialize ClientEcho 'requestId: -7'
for code in 1000 1001 3009 2000; do
  seed create_chatroom_reply_deserialize "refused_$code" CreateChatroomReply "result { code: $code $refused }"
done
reply create_chatroom_reply_deserialize CreateChatroomReply "requestId: 7 chatroomId: 8 msgTtl: 9 $result"
reply chat_reply_deserialize ChatReply "requestId: 7 chatroomId: 8 $result
  processedMessageEntries { msgId: 1 sentTime: 2 } processedMessageEntries { sentTime: -3 } processedMessageEntries { }"
reply allow_chat_reply_deserialize AllowChatReply "requestId: 7 chatroomId: 8 $result
  lastReadAckTimestamp: 1 lastDeliveryAckTimestamp: 2 title: 'room' msgTtl: 3 profileUrl: 'url' ownerUserId: 4
  orderedChatroomMemberList { userId: 5 available: true name: 'a' } orderedChatroomMemberList { }
  readAckEntries { userId: 5 msgId: 6 timestamp: 7 } readAckEntries { }
  deliveryAckEntries { userId: 8 msgId: 9 timestamp: 10 chatroomId: 11 } deliveryAckEntries { }"
reply get_all_unread_message_reply_deserialize GetAllUnreadMessageReply "requestId: 7 $result"
reply forward_online_message_get_deserialize ForwardOnlineMessage "requestId: 7 chatroomId: 8 chatType: GROUP
  inboxEntry { msgId: 1 msgType: UNSEAL sender: 2 receiver: 3 sentTime: 4 chatMsg: 'hello' msgTtl: 5
  chatroomId: 6 chatType: SECURE secureChatMsg: 'sealed' } skipReply: true"
seed forward_online_message_get_deserialize sparse ForwardOnlineMessage 'inboxEntry { } skipReply: false'
reply forward_unread_message_deserialize ForwardUnreadMessage "requestId: 7 nextPaginationKey: 'key'
  inboxEntries { msgId: 1 msgType: VOIP_CALL_SETUP sender: 2 receiver: 3 sentTime: 4 chatMsg: 'hello' msgTtl: 5
  chatroomId: 6 chatType: MONOLOGUE } inboxEntries { } inboxEntries { chatMsg: 'a\\0b' }"
reply read_message_reply_deserialize ReadMessageReply "requestId: 7 chatroomId: 8 $result"
reply end_chat_reply_deserialize EndChatReply "requestId: 7 $result"
for code in 1000 1001 3003 3009 2000; do
  seed invite_reply_deserialize "refused_$code" InviteReply "result { code: $code $refused }"
done
reply invite_reply_deserialize InviteReply "requestId: 7 chatroomId: 8 sentTime: 9 $result"
reply current_time_deserialize CurrentTimeReply "requestId: 7 currentTimeMillis: 1700000000000 $result"
reply unseal_message_reply_deserialize UnsealMessageReply "requestId: 7 chatroomId: 8 $result"
reply save_call_log_reply_deserialize SaveCallLogReply "requestId: 7 $result"
reply typing_updated_deserialize TypingUpdated "requestId: 7 chatroomId: 8 sender: 9 state: 'on'
  contentType: CONTENT_VIDEO refresh: 10"
reply change_chatroom_meta_reply_deserialize ChangeChatroomMetaReply "requestId: 7 chatroomId: 8 $result"

# The first byte is the message's place in the schema.
mkdir -p "$folder/round_trip" "$folder/qel_wire"
place=0
while read -r message; do
  # shellcheck disable=SC2059 # an escape that is put together
  { printf "\\x$(printf %02x $place)" && all_fields "$message" | encode "$message"; } >"$folder/round_trip/$message"
  # What encoders do not write: a packed list or a number where a text is (field 11), unknown fields and
  # groups, an enumeration's number that is no member, a length behind the end.
  # shellcheck disable=SC2059
  printf "\\x$(printf %02x $place)\\x5a\\x02\\x00\\x63\\x30\\x07\\xc3\\x3e\\x08\\x01\\xc4\\x3e\\x70\\x63\\x6a\\x03\\x08" \
    >"$folder/qel_wire/$message"
  place=$((place + 1))
done < <(sed -n 's/^message //p' "$table")

# The first byte is the function. Then come its arguments: a number is its length and so many bytes,
# a text is its length and so many bytes, a flag is the lowest bit of a byte.
mkdir -p "$folder/serializers"
for place in {0..15}; do
  # shellcheck disable=SC2059
  {
    printf "\\x$(printf %02x "$place")"
    printf '\1\7\1\10\1\3\4text\1\4text\1\1\1\1\3\1\1\1\2\1\3\0\1\1\1\4abcd\1\2\1\1\2'
  } >"$folder/serializers/function_$place"
done
