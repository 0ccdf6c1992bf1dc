// Times the parts of a chat request of 100 bytes, each step together with those before it, and two
// things that the library adds to the generated classes: the thread id of a log line, and the
// stream that parsers keep. The arguments are those of Google Benchmark.

#include <benchmark/benchmark.h>
#include <google/protobuf/io/coded_stream.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "calls.h"
#include "inputs.h"
#include "msgspec_frontend.pb.h"
#include "qel-message-serialize.h"

namespace {

enum Step { kObject, kFields, kLength, kBlock, kEncoding };

template <Step last>
void chat_request(benchmark::State& state) {
  const std::string text = text_of(100);
  for (auto _ : state) {
    ChatRequest request;
    benchmark::DoNotOptimize(&request);
    if (last >= kFields) {
      request.set_requestid(kRequestId);
      request.set_chatroomid(kChatroomId);
      ChatMessageParam* param = request.add_chatmessageparams();
      param->set_msgid(kMessageId);
      param->set_msgttl(kMessageTtl);
      param->set_msgtype(static_cast<MsgType>(kMessageType));
      param->set_chatmsg(text.c_str(), strlen(text.c_str()));
    }
    int size = 0;
    if (last >= kLength) {
      size = request.ByteSize();
      benchmark::DoNotOptimize(size);
    }
    unsigned char* block = nullptr;
    if (last >= kBlock) {
      block = static_cast<unsigned char*>(calloc(static_cast<size_t>(size), 1));
      benchmark::DoNotOptimize(block);
    }
    if (last >= kEncoding) {
      request.SerializeWithCachedSizesToArray(block);
      benchmark::ClobberMemory();
    }
    free(block);
  }
}

void thread_id(benchmark::State& state) {
  for (auto _ : state) {
    benchmark::DoNotOptimize(syscall(SYS_gettid));
  }
}

void kept_stream(benchmark::State& state) {
  const unsigned char bytes[] = {0x08, 0x07};
  for (auto _ : state) {
    benchmark::DoNotOptimize(new google::protobuf::io::CodedInputStream(bytes, sizeof bytes));
  }
}

void whole(benchmark::State& state) {
  const std::string text = text_of(100);
  for (auto _ : state) {
    unsigned char* block = nullptr;
    int size = 0;
    chat_request_serialize(kRequestId, kChatroomId, kMessageId, kMessageType, text.c_str(),
                           kMessageTtl, 0, &block, &size);
    free(block);
  }
}

BENCHMARK(chat_request<kObject>)->Name("object");
BENCHMARK(chat_request<kFields>)->Name("fields");
BENCHMARK(chat_request<kLength>)->Name("length");
BENCHMARK(chat_request<kBlock>)->Name("block");
BENCHMARK(chat_request<kEncoding>)->Name("encoding");
BENCHMARK(whole);
BENCHMARK(thread_id);
BENCHMARK(kept_stream);

}  // namespace

BENCHMARK_MAIN();
