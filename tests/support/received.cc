#include "support/received.h"

#include <algorithm>
#include <cstdlib>

#include "support/heap.h"

namespace support {

Received::Received(const std::string& bytes) : size_(static_cast<int>(bytes.size())) {
  const HeapPause pause;
  data_ = static_cast<unsigned char*>(std::malloc(bytes.size()));
  std::copy(bytes.begin(), bytes.end(), data_);
}

Received::~Received() {
  std::free(data_);
}

}  // namespace support
