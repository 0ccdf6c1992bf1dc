// What the exported functions share: the end of a serializer, the beginning of a deserializer, and
// copies for the caller. Which function checks a limit or a range, and which outputs it leaves
// alone, differs from one to the next and stands in their bodies.
#ifndef QEL_CALL_FRAME_H
#define QEL_CALL_FRAME_H

#include <google/protobuf/io/coded_stream.h>
#include <google/protobuf/message_lite.h>
#include <stdlib.h>
#include <string.h>

#include <new>
#include <string>

#include "log-line.h"
#include "msgspec_frontend.pb.h"

// LeakSanitizer's and AddressSanitizer's: NULL in a process that has neither.
extern "C" [[gnu::weak]] void __lsan_ignore_object(const void* block);

namespace {

using google::protobuf::MessageLite;
using google::protobuf::io::CodedInputStream;

// A block of count elements, or nullptr if there is no memory: for the caller, who frees it. Which
// lists are zeroed is part of the interface. Elements may be pointers to records.
template <typename T>
T* allocate(int count) {
  // NOLINTNEXTLINE(bugprone-sizeof-expression)
  return static_cast<T*>(malloc(static_cast<size_t>(count) * sizeof(T)));
}
template <typename T>
T* allocate_zeroed(int count) {
  // NOLINTNEXTLINE(bugprone-sizeof-expression)
  return static_cast<T*>(calloc(static_cast<size_t>(count), sizeof(T)));
}

// Hands the message's encoding to the caller, who frees it. What the outputs hold after a failure
// is part of the interface: the length is stored before it is checked, and so is the buffer.
//
// Inlined, and so is parse(), because the message's class is known where they are called: a short
// call saves a thirtieth of its instructions, for a hundredth more code.
[[gnu::always_inline]] inline int encode(const MessageLite& message,
                                         unsigned char** serialized_data, int* size,
                                         CallSite site = here()) {
  *size = message.ByteSize();
  if (*size < 1) {
    QEL_LOG_AT(kLogError, site, "Invalid serialized data size : %d", *size);
    return -1;
  }
  *serialized_data = allocate_zeroed<unsigned char>(*size);
  if (*serialized_data == nullptr) {
    QEL_LOG_AT(kLogError, site, "Could not allocate memory for serialized data");
    return -1;
  }
  message.SerializeWithCachedSizesToArray(*serialized_data);
  QEL_LOG_AT(kLogDebug, site, "%s: exit", site.function);
  return 0;
}

// Tells LeakSanitizer that the stream is kept on purpose. It takes what such a block points to for
// kept, too: so that a leak of the received bytes is reported, the stream no longer points to them.
[[gnu::cold, gnu::noinline]] void mark_as_kept(CodedInputStream* stream) {
  new (stream) CodedInputStream(nullptr, 0);
  __lsan_ignore_object(stream);
}

// At the end of the parse, also by an exception.
struct KeptOnPurpose {
  CodedInputStream* stream;

  ~KeptOnPurpose() {
    if (__lsan_ignore_object != nullptr) {
      mark_as_kept(stream);
    }
  }
};

// Fills the message from the received bytes. Returns the input stream, or nullptr after a failure.
//
// The stream is on the heap and stays allocated, by contract: only the functions that say so in the
// public header delete it, and only after a success.
[[gnu::always_inline]] inline const CodedInputStream* parse(const unsigned char* data, int size,
                                                            MessageLite* message,
                                                            CallSite site = here()) {
  auto* stream = new CodedInputStream(data, size);
  const KeptOnPurpose kept = {stream};
  const bool parsed = message->ParseFromCodedStream(stream);
  if (!parsed) {
    QEL_LOG_AT(kLogError, site, "merge error : Could not parse the received data!");
  }
  // Tested even so: a parse can fail at a clean end, and succeed short of one.
  if (!stream->ConsumedEntireMessage()) {
    QEL_LOG_AT(kLogError, site, "ConsumedEntireMessage error :Could not parse the received data");
    return nullptr;
  }
  return parsed ? stream : nullptr;
}

// A copy that the caller frees.
char* copy_text(const std::string& text) {
  return strdup(text.c_str());
}

// A result's text, if there is one and the caller asks for it.
void copy_result_msg(const Result& result, char** resultMsg) {
  if (resultMsg != nullptr && result.has_msg()) {
    *resultMsg = copy_text(result.msg());
  }
}

// A reply's outcome, if there is one, as far as the caller asks for it.
template <typename Reply>
void copy_result(const Reply& reply, int* resultCode, char** resultMsg) {
  if (!reply.has_result()) {
    return;
  }
  if (resultCode != nullptr) {
    *resultCode = reply.result().code();
  }
  copy_result_msg(reply.result(), resultMsg);
}

}  // namespace

#endif
