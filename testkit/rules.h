// What a plug-in must not send, as far as the service knows.
#ifndef TESTKIT_RULES_H
#define TESTKIT_RULES_H

#include <google/protobuf/message.h>

#include <string>
#include <vector>

#include "state.h"

namespace testkit {

// What is wrong with a message whatever the service knows, in words.
std::vector<std::string> mistakes_in_form(const google::protobuf::Message& message);

// What is wrong with a request.
std::vector<std::string> mistakes_in(const google::protobuf::Message& request, const State& state);

}  // namespace testkit

#endif
