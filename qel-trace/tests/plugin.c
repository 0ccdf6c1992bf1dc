/* A plug-in, which is linked with the library. */
#include "qel-message-serialize.h"

int plugin_answer(int64_t request_id, unsigned char** serialized_data, int* size);

int plugin_answer(int64_t request_id, unsigned char** serialized_data, int* size) {
  return client_echo_reply_serialize(request_id, serialized_data, size);
}
