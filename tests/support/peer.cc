#include "support/peer.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <map>
#include <sstream>
#include <stdexcept>

#include "support/wire.h"

namespace support {
namespace {

std::string read_file(const std::string& path) {
  std::ostringstream content;
  content << std::ifstream(path, std::ios::binary).rdbuf();
  return content.str();
}

void write_file(const std::string& path, const std::string& content) {
  std::ofstream(path, std::ios::binary) << content;
}

// Runs protoc with the given schema and input and returns its output.
std::string run_peer(const std::string& schema, const std::string& mode, const std::string& message,
                     const std::string& input) {
  std::string base = testing::TempDir() + "peer-XXXXXX";
  if (mkdtemp(base.data()) == nullptr) {
    throw std::runtime_error("no temporary folder " + base);
  }
  write_file(base + "/schema.proto", schema);
  write_file(base + "/in", input);
  const std::string command = "'" QEL_REFERENCE_PROTOC "' --proto_path='" + base + "' --" + mode +
                              "=" + message + " schema.proto <'" + base + "/in' >'" + base +
                              "/out' 2>'" + base + "/messages'";
  const int status = std::system(command.c_str());
  std::string output = read_file(base + "/out");
  const std::string messages = read_file(base + "/messages");
  for (const char* name : {"/schema.proto", "/in", "/out", "/messages"}) {
    unlink((base + name).c_str());
  }
  rmdir(base.c_str());
  if (status != 0) {
    throw std::runtime_error(command + ": " + messages);
  }
  return output;
}

// Many messages travel as one, PeerBatch: each as the only field of an item. Items keep their
// order, whatever messages they are.
class Batch {
 public:
  Batch(const std::string& schema, const std::vector<PeerItem>& items) : items_(items) {
    std::ostringstream definition;
    definition << schema << "\nmessage PeerBatch { repeated PeerItem item = 1; }\n"
               << "message PeerItem {\n";
    for (const PeerItem& item : items) {
      const int number = static_cast<int>(field_numbers_.size()) + 1;
      if (field_numbers_.emplace(item.message, number).second) {
        definition << "  optional ." << item.message << " " << item.message << " = " << number
                   << ";\n";
      }
    }
    definition << "}\n";
    schema_ = definition.str();
  }

  const std::string& schema() const { return schema_; }

  std::string as_text() const {
    std::string text;
    for (const PeerItem& item : items_) {
      text += "item { " + item.message + " {\n" + item.content + "} }\n";
    }
    return text;
  }

  std::string as_bytes() const {
    std::string bytes;
    for (const PeerItem& item : items_) {
      bytes +=
          Wire().message(1, Wire().text(field_numbers_.at(item.message), item.content)).bytes();
    }
    return bytes;
  }

  std::vector<std::string> from_text(const std::string& text) const {
    std::vector<std::string> contents;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
      if (line.substr(0, 4) != "    ") {  // braces of an item and of its field
        if (line == "item {") {
          contents.emplace_back();
        }
      } else {
        contents.back().append(line, 4).append("\n");
      }
    }
    return checked(contents);
  }

  std::vector<std::string> from_bytes(const std::string& bytes) const {
    std::vector<std::string> contents;
    WireReader batch(bytes);
    while (!batch.at_end()) {
      WireReader item(batch.text());
      contents.push_back(item.text());
    }
    return checked(contents);
  }

 private:
  std::vector<std::string> checked(std::vector<std::string> contents) const {
    if (contents.size() != items_.size()) {
      throw std::runtime_error("the peer answered " + std::to_string(contents.size()) + " of " +
                               std::to_string(items_.size()) + " messages");
    }
    return contents;
  }

  const std::vector<PeerItem>& items_;
  std::map<std::string, int> field_numbers_;
  std::string schema_;
};

}  // namespace

std::string peer_encode(const std::string& message, const std::string& text) {
  return run_peer(library_schema(), "encode", message, text);
}

std::string peer_decode(const std::string& message, const std::string& bytes) {
  return run_peer(library_schema(), "decode", message, bytes);
}

std::vector<std::string> peer_encode_all(const std::string& schema,
                                         const std::vector<PeerItem>& texts) {
  const Batch batch(schema, texts);
  return batch.from_bytes(run_peer(batch.schema(), "encode", "PeerBatch", batch.as_text()));
}

std::vector<std::string> peer_decode_all(const std::string& schema,
                                         const std::vector<PeerItem>& encodings) {
  const Batch batch(schema, encodings);
  return batch.from_text(run_peer(batch.schema(), "decode", "PeerBatch", batch.as_bytes()));
}

std::string library_schema() {
  return read_file(QEL_SCHEMA_FOLDER "/msgspec_frontend.proto");
}

}  // namespace support
