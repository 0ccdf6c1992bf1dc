// What a plug-in must not send, as far as the service knows.
#ifndef TESTKIT_RULES_H
#define TESTKIT_RULES_H

#include <google/protobuf/message.h>

#include <string>
#include <vector>

#include "state.h"

namespace testkit {

// What is wrong with a request, in words.
std::vector<std::string> mistakes_in(const google::protobuf::Message& request, const State& state);

// The names of fields whose texts are not UTF-8, also in the messages inside it.
std::vector<std::string> broken_texts(const google::protobuf::Message& message);

}  // namespace testkit

#endif
