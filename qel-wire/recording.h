// Session files: what a plug-in and the service said to each other, as a recorder wrote it down.
#ifndef QEL_WIRE_RECORDING_H
#define QEL_WIRE_RECORDING_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "qel-trace/record.h"
#include "schema.h"

namespace qel_wire {

using session_file::Outcome;

struct Record {
  uint32_t number = 0;  // from 1, but the file may have lost the first ones
  Use use = Use::kNone;
  Outcome outcome = Outcome::kNotEnded;
  std::chrono::nanoseconds time = {};  // since 1970
  std::string name;                    // of a function of the C interface, or of a message
  std::string bytes;
  size_t missing = 0;  // bytes behind these that were not recorded
};

struct Recording {
  std::vector<Record> records;     // by their numbers
  std::vector<std::string> notes;  // what cannot be read
};

// Whether a file of pcap or pcapng may be a session file, by the kind of its packets. Throws a
// Failure if it breaks off before it says what they are.
bool is_recording(const std::string& file);

// Of a file that is broken or being written, it has all that can be read. Throws a Failure if there
// are packets and none is a record, or if there is no such file.
Recording read_recording(const std::string& file);

}  // namespace qel_wire

#endif
