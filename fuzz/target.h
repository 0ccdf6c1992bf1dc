// What a fuzz target is: a property of the library that has to hold for any bytes.
#ifndef FUZZ_TARGET_H
#define FUZZ_TARGET_H

#include <google/protobuf/message.h>

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace fuzz {

struct Target {
  std::string name;
  std::function<void(const std::string& bytes)> check;
};

std::vector<Target> deserializer_targets();  // each named after its function
void check_serializers(const std::string& bytes);
void check_round_trip(const std::string& bytes);
void check_qel_wire(const std::string& bytes);
void check_qel_wire_input(const std::string& bytes);
void check_testkit(const std::string& bytes);

// Of the schema's message that a byte of the input chooses, or of the one of that name.
std::unique_ptr<google::protobuf::Message> new_message(unsigned char choice);
std::unique_ptr<google::protobuf::Message> new_message(const std::string& name);

// Ends the program, as a finding of libFuzzer's.
[[noreturn]] void fail(const std::string& finding);

}  // namespace fuzz

#endif
