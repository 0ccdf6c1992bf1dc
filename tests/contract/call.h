// The arguments and outputs of one call, made from what a case of the contract gives.
#ifndef TESTS_CONTRACT_CALL_H
#define TESTS_CONTRACT_CALL_H

#include <cstring>
#include <functional>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include "doubles.h"
#include "qel-message-serialize.h"

namespace contract {

using Json = nlohmann::json;

// Bytes spelled in hexadecimal, two digits each, and the other way round.
std::string bytes_of(const std::string& hex);
std::string hex_of(const std::string& bytes);

// A text as the contract writes it: as it is, or {hex: ...} where it is no UTF-8.
std::string text_of(const Json& value);
Json json_of_text(const std::string& text);

// A bool as the byte that it is: true and false, or a byte that is neither.
unsigned char byte_of(const Json& flag);

// The size of a block of calloc, malloc or strdup that is in use, if it is one.
using SizeOf = std::function<std::optional<size_t>(const void* block)>;

// Shows what memory holds as the contract writes it. Blocks that are pointed to are looked up.
class Reader {
 public:
  explicit Reader(SizeOf size_of) : size_of_(std::move(size_of)) {}

  // "unwritten" if every byte is as it was handed out; elements of a record that are so, are left
  // out.
  template <typename T>
  Json read(const T& value) {
    if (is_fresh(&value, sizeof value)) {
      return kUnwritten;
    }
    if constexpr (std::is_same_v<T, bool>) {
      unsigned char byte = 0;
      std::memcpy(&byte, &value, 1);
      return byte > 1 ? Json(byte) : Json(byte == 1);
    } else if constexpr (std::is_arithmetic_v<T>) {
      return value;
    } else if constexpr (std::is_pointer_v<T>) {
      return value == nullptr ? Json() : read_block(value);
    } else {
      return read_record(value);
    }
  }

  // The elements that a block of this size has room for.
  template <typename T>
  Json elements(const T* first, size_t bytes) {
    Json list = Json::array();
    for (size_t i = 0; i < bytes / sizeof(T); ++i) {
      list.push_back(read(first[i]));
    }
    return list;
  }

  // A block that is in no output yet: the list itself, or the record of one of its elements.
  template <typename T>
  Json read_new_block(const T* block, size_t size, bool is_element) {
    if constexpr (std::is_same_v<T, unsigned char>) {
      return hex_of(std::string(reinterpret_cast<const char*>(block), size));
    } else if constexpr (std::is_pointer_v<T>) {
      return is_element ? read(*reinterpret_cast<const std::remove_pointer_t<T>*>(block))
                        : elements(block, size);
    } else {
      return elements(block, size);
    }
  }

  // Every block that was come across, once for each time.
  const std::vector<const void*>& seen() const { return seen_; }

  static constexpr const char* kUnwritten = "unwritten";

 private:
  static bool is_fresh(const void* memory, size_t size);

  template <typename T>
  Json read_block(T* block) {
    seen_.push_back(block);
    const std::optional<size_t> size = size_of_(block);
    if (!size) {
      return "a pointer to no block of calloc, malloc or strdup";
    }
    if constexpr (std::is_same_v<T, char>) {
      return json_of_text(std::string(block, strnlen(block, *size)));
    } else if constexpr (std::is_same_v<T, unsigned char>) {
      return hex_of(std::string(reinterpret_cast<const char*>(block), *size));
    } else if constexpr (std::is_same_v<T, qel_message_watermarkentry_t> ||
                         std::is_same_v<T, qel_message_chatroommember_t> ||
                         std::is_same_v<T, qel_message_inboxentry_t>) {
      return read(*block);  // of these each is a block of its own
    } else {
      return elements(block, *size);
    }
  }

  Json read_record(const qel_message_didviolationuser_t& pair);
  Json read_record(const qel_message_watermarkentry_t& mark);
  Json read_record(const qel_message_chatroommember_t& member);
  Json read_record(const qel_message_inboxentry_t& entry);

  const SizeOf size_of_;
  std::vector<const void*> seen_;
};

class Call {
 public:
  // What is not given is 0, false or NULL, but for outputs, which are all there unless null is
  // given.
  Call(const Json& given, const std::string& received);

  // As the parameter of this type and name.
  template <typename T>
  T argument(const std::string& name);

  // An output that is kept elsewhere.
  template <typename T>
  void place(const std::string& name, T* output);

  // What every output holds. Those that were not written are left out. The blocks handed out are
  // noted in the reader.
  Json outputs(Reader* reader) const;

  // What a new block for an output or an element of it shows, if all its bytes are this one.
  Json blank(const std::string& path, size_t size, unsigned char byte) const;

  // As the log service might do it while the call logs a line.
  void set(const std::string& output, int value) const;

  // Names that were given and that no parameter has.
  std::vector<std::string> unknown_names() const;

 private:
  // An output between bytes that nobody may write.
  template <typename T>
  struct Output {
    unsigned char before[16];
    T value;
    unsigned char after[16];
  };

  template <typename T>
  T* keep(std::vector<T> values);
  char* keep_text(const Json& text);
  template <typename T>
  T* input(const std::string& name);
  template <typename T>
  T* output(const std::string& name);
  qel_message_inboxentry_t inbox_entry(const Json& fields);
  Json given(const std::string& name);
  void expect_guards(const std::string& name, const unsigned char (&guard)[16], Json* shown) const;

  Json given_;
  std::string received_;
  std::vector<std::string> names_;
  std::vector<std::shared_ptr<void>> kept_;
  std::vector<std::pair<std::string, std::function<void(Reader*, Json*)>>> outputs_;
  std::map<std::string, int*> numbers_;  // of the outputs
  std::map<std::string, std::function<Json(const void* block, size_t size, bool is_element)>>
      blanks_;
};

template <typename T>
T* Call::keep(std::vector<T> values) {
  auto kept = std::make_shared<std::vector<T>>(std::move(values));
  kept_.push_back(kept);
  return kept->data();
}

template <typename T>
void Call::place(const std::string& name, T* output) {
  names_.push_back(name);
  if constexpr (std::is_pointer_v<T>) {
    blanks_[name] = [](const void* block, size_t size, bool is_element) {
      return Reader(nullptr).read_new_block(static_cast<const std::remove_pointer_t<T>*>(block),
                                            size, is_element);
    };
  }
  if constexpr (std::is_same_v<T, int>) {
    numbers_[name] = output;
  }
  if (output != nullptr) {
    outputs_.emplace_back(name, [name, output](Reader* reader, Json* shown) {
      Json value = reader->read(*output);
      if (value != Reader::kUnwritten) {
        (*shown)[name] = std::move(value);
      }
    });
  }
}

template <typename T>
T* Call::output(const std::string& name) {
  if (given_.contains(name) && given_[name].is_null()) {
    place<T>(name, nullptr);
    return nullptr;
  }
  const auto output = std::make_shared<Output<T>>();
  std::memset(output.get(), kFreshByte, sizeof *output);
  kept_.push_back(output);
  place(name, &output->value);
  outputs_.emplace_back(name, [this, name, output](Reader* /*reader*/, Json* shown) {
    expect_guards(name, output->before, shown);
    expect_guards(name, output->after, shown);
  });
  return &output->value;
}

// Values that callers pass by pointer, and lists of them.
template <typename T>
T* Call::input(const std::string& name) {
  const Json value = given(name);
  if (value.is_null()) {
    return nullptr;
  }
  std::vector<T> values;
  for (const Json& element : value.is_array() ? value : Json::array({value})) {
    if constexpr (std::is_same_v<T, qel_message_inboxentry_t>) {
      values.push_back(inbox_entry(element));
    } else if constexpr (std::is_same_v<T, qel_message_endchatentry_t>) {
      qel_message_endchatentry_t entry = {element.value("chatroomId", int64_t{0}), false};
      const unsigned char flag = byte_of(element.value("denyInvitation", Json(false)));
      std::memcpy(&entry.denyInvitation, &flag, 1);
      values.push_back(entry);
    } else if constexpr (std::is_same_v<T, unsigned char>) {
      values.push_back(byte_of(element));
    } else {
      values.push_back(element.get<T>());
    }
  }
  values.shrink_to_fit();  // so that reading beyond it shows
  return keep(std::move(values));
}

template <typename T>
T Call::argument(const std::string& name) {
  if constexpr (std::is_same_v<T, const unsigned char*>) {  // what was received
    names_.push_back(name);
    std::vector<unsigned char> bytes(received_.begin(), received_.end());
    return keep(std::move(bytes));
  } else if constexpr (std::is_same_v<T, int> || std::is_same_v<T, int64_t>) {
    const Json value = given(name);
    return !value.is_null() ? value.get<T>()
           : name == "size" ? static_cast<T>(received_.size())
                            : T{0};
  } else if constexpr (std::is_same_v<T, unsigned char>) {
    const Json value = given(name);
    return value.is_null() ? T{0} : byte_of(value);
  } else if constexpr (std::is_same_v<T, const char*>) {
    const Json value = given(name);
    return value.is_null() || value.contains("to") ? nullptr : keep_text(value);
  } else if constexpr (std::is_same_v<T, const char**>) {
    // {to: null} is a pointer to NULL.
    const bool is_given = !given(name).is_null();
    return is_given ? keep(std::vector<const char*>{argument<const char*>(name)}) : nullptr;
  } else if constexpr (std::is_same_v<T, const bool*>) {
    return reinterpret_cast<const bool*>(input<unsigned char>(name));
  } else if constexpr (std::is_const_v<std::remove_pointer_t<T>>) {
    return input<std::remove_const_t<std::remove_pointer_t<T>>>(name);
  } else {
    return output<std::remove_pointer_t<T>>(name);
  }
}

// A record that the caller brings, as the one output of this type.
template <>
qel_message_inboxentry_t** Call::argument<qel_message_inboxentry_t**>(const std::string& name);

}  // namespace contract

#endif
