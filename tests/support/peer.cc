#include "support/peer.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace support {
namespace {

std::string read_file(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

// Runs protoc with the given input and returns its output.
std::string run_peer(const std::string& mode, const std::string& message,
                     const std::string& input) {
  std::string base = testing::TempDir() + "peer-XXXXXX";
  if (mkdtemp(base.data()) == nullptr) {
    throw std::runtime_error("no temporary folder " + base);
  }
  std::ofstream(base + "/in", std::ios::binary) << input;
  const std::string command = "'" QEL_PEER_PROTOC "' --proto_path='" QEL_SCHEMA_FOLDER "' --" +
                              mode + "=" + message + " msgspec_frontend.proto <'" + base +
                              "/in' >'" + base + "/out' 2>'" + base + "/messages'";
  const int status = std::system(command.c_str());
  std::string output = read_file(base + "/out");
  const std::string messages = read_file(base + "/messages");
  for (const char* name : {"/in", "/out", "/messages"}) {
    unlink((base + name).c_str());
  }
  rmdir(base.c_str());
  if (status != 0) {
    throw std::runtime_error(command + ": " + messages);
  }
  return output;
}

}  // namespace

std::string peer_encode(const std::string& message, const std::string& text) {
  return run_peer("encode", message, text);
}

std::string peer_decode(const std::string& message, const std::string& bytes) {
  return run_peer("decode", message, bytes);
}

}  // namespace support
