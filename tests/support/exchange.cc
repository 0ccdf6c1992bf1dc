#include "support/exchange.h"

#include <algorithm>

namespace support {

Received::Received(const std::string& bytes)
    : data_(static_cast<unsigned char*>(std::malloc(bytes.size()))),
      size_(static_cast<int>(bytes.size())) {
  std::copy(bytes.begin(), bytes.end(), data_);
}

Received::~Received() {
  std::free(data_);
}

}  // namespace support
