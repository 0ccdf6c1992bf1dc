// What a deserializer is given.
#ifndef TESTS_SUPPORT_RECEIVED_H
#define TESTS_SUPPORT_RECEIVED_H

#include <string>

namespace support {

// A copy of received bytes in a block of exactly their size, so that reading beyond it shows.
class Received {
 public:
  explicit Received(const std::string& bytes);
  ~Received();
  Received(const Received&) = delete;
  Received& operator=(const Received&) = delete;

  const unsigned char* data() const { return data_; }
  int size() const { return size_; }

 private:
  unsigned char* data_ = nullptr;
  int size_;
};

}  // namespace support

#endif
