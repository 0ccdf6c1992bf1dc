#include "run.h"

#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <utility>

#include "log_statement.h"
#include "support/address_sanitizer.h"

namespace contract {
namespace {

const std::map<std::string, int> kPriorities = {
    {"debug", 3}, {"info", 4}, {"warn", 5}, {"error", 6}};
const std::map<std::string, Allocator> kAllocators = {
    {"calloc", Allocator::kCalloc}, {"malloc", Allocator::kMalloc}, {"strdup", Allocator::kStrdup}};
const std::map<int, std::string> kColours = {
    {3, "\033[32m"}, {4, "\033[34m"}, {5, "\033[33m"}, {6, "\033[31m"}};

// Exit codes of a child that is meant to die otherwise.
constexpr int kProblem = 97;
constexpr int kReturned = 98;

// The common end of a serializer. If there is no memory, most log this error and return -1.
void add_encode(const Json& encode, std::vector<Step>* steps) {
  const std::string hex = encode.at("bytes");
  const auto length = static_cast<int>(hex.size() / 2);
  Json block = {{"for", "serialized_data"}, {"count", length}, {"size", 1}};
  if (encode.contains("refused")) {
    block["refused"] = encode["refused"];
  } else {
    block["refused"] = {{"does", {{{"error", "Could not allocate memory for serialized data"}}}},
                        {"returns", -1}};
  }
  steps->push_back({Step::kWrite, {{"size", length}}});
  steps->push_back({Step::kBlock, block});
  steps->push_back({Step::kWrite, {{"serialized_data", hex}}});
}

std::string replaced(std::string text, const std::string& from, const std::string& to) {
  for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size())) {
    text.replace(at, from.size(), to);
  }
  return text;
}

std::vector<Step> steps_of(const Json& does) {
  std::vector<Step> steps;
  for (const Json& entry : does) {
    const std::string& key = entry.begin().key();
    const Json& what = entry.begin().value();
    if (kPriorities.count(key) > 0) {
      Step step = {Step::kLine, what.is_array() ? what : Json::array({what})};
      step.priority = kPriorities.at(key);
      steps.push_back(step);
    } else if (kAllocators.count(key) > 0) {
      Step step = {Step::kBlock, what};
      step.allocator = kAllocators.at(key);
      steps.push_back(step);
    } else if (key == "encode") {
      add_encode(what, &steps);
    } else if (key == "write") {
      steps.push_back({Step::kWrite, what});
    } else if (key == "meanwhile") {
      steps.push_back({Step::kSet, what});
    } else {  // parse, copy
      steps.push_back({Step::kNews, what});
    }
  }
  return steps;
}

// Whether the path leads into the output of the root: "members[0].name" into "members".
bool leads_into(const std::string& path, const std::string& root) {
  return path.compare(0, root.size(), root) == 0 &&
         (path.size() == root.size() || path[root.size()] == '[' || path[root.size()] == '.');
}

bool writes_into(const Step& step, const std::string& root) {
  const auto keys = step.what.items();
  return step.kind == Step::kWrite && std::any_of(keys.begin(), keys.end(), [&](const auto& item) {
           return leads_into(item.key(), root);
         });
}

void merge(Json* into, const Json& value) {
  if (into->is_object() && value.is_object()) {
    for (const auto& [name, element] : value.items()) {
      merge(&(*into)[name], element);
    }
  } else if (into->is_array() && value.is_array() && into->size() == value.size()) {
    for (size_t i = 0; i < value.size(); ++i) {
      merge(&(*into)[i], value[i]);
    }
  } else {
    *into = value;
  }
}

Json::json_pointer pointer_of(const std::string& path) {
  return Json::json_pointer("/" + replaced(replaced(replaced(path, "[", "/"), "]", ""), ".", "/"));
}

size_t bytes_in(const Json& block) {
  const Json& size = block.at("size");
  return block.value("count", size_t{1}) * (size == "pointer" ? sizeof(void*) : size.get<size_t>());
}

std::string shown(const LogLine& line) {
  return "priority " + std::to_string(line.priority) + ", " + Json(line.format).dump() + " " +
         line.arguments.dump();
}

// The name of the module's source, in any language.
bool is_source(const std::string& name) {
  const std::string stem = "qel-message-serialize.";
  return name.size() > stem.size() && name.compare(0, stem.size(), stem) == 0 &&
         name.find_first_not_of("abcdefghijklmnopqrstuvwxyz+", stem.size()) == std::string::npos;
}

// The frame that all lines share.
bool is_in_frame(const LogLine& line, const std::string& function) {
  const Json& arguments = line.arguments;
  return line.log_id == 0 && line.tag == "MESSAGE_PLUGIN" && arguments.size() >= 4 &&
         is_source(arguments[0].get<std::string>()) && arguments[1] == function &&
         arguments[2].get<int>() > 0 && line.fresh_thread_id != 0 &&
         arguments[3] == line.fresh_thread_id;
}

// Whether that is all that the process has said. Compilers name a function's types in two ways.
bool says_assertion_alone(std::string said, const Json& aborts) {
  const std::string expected = ": " + aborts.at("in").get<std::string>() + ": Assertion `" +
                               aborts.at("assertion").get<std::string>() + "' failed.\n";
  const size_t qualified = said.find("(::");
  if (qualified != std::string::npos) {
    said.erase(qualified + 1, 2);
  }
  return said.find(": proto-lib/msgspec_frontend.pb.h:") != std::string::npos &&
         said.find('\n') == said.size() - 1 && said.size() > expected.size() &&
         said.compare(said.size() - expected.size(), expected.size(), expected) == 0;
}

}  // namespace

Course course_of(const Json& contract_case) {
  Course course;
  course.steps = steps_of(contract_case.at("does"));
  for (const char* end : {"returns", "aborts", "faults", "throws"}) {
    if (contract_case.contains(end)) {
      course.end[end] = contract_case[end];
    }
  }
  for (const Json& entry : contract_case["does"]) {
    if (entry.contains("parse")) {
      course.keeps_stream = entry["parse"].at("stream") == "kept";
    }
  }
  return course;
}

bool ends_process(const Course& course) {
  return course.end.contains("aborts") || course.end.contains("faults");
}

int blocks_of(const Course& course) {
  return static_cast<int>(std::count_if(course.steps.begin(), course.steps.end(),
                                        [](const Step& s) { return s.kind == Step::kBlock; }));
}

Course course_without_block(const Course& course, int n) {
  Course rest = course;
  auto step = rest.steps.begin();
  while (step->kind != Step::kBlock || n-- > 0) {
    ++step;
  }
  step->is_refused = true;
  const Json block = step->what;
  if (block.contains("refused")) {
    const Json& refused = block["refused"];
    rest.steps.erase(step + 1, rest.steps.end());
    for (const Step& follows : steps_of(refused.at("does"))) {
      rest.steps.push_back(follows);
    }
    rest.end = refused;
    rest.end.erase("does");
    return rest;
  }
  if (step->allocator == Allocator::kStrdup) {
    return rest;  // NULL is handed out
  }
  // Otherwise what is missing is written to.
  const std::string path = block.at("for");
  for (++step; step != rest.steps.end(); ++step) {
    const bool is_slot = step->kind == Step::kBlock && step->what.at("for") != path &&
                         leads_into(step->what["for"], path);
    if (is_slot || writes_into(*step, path)) {
      rest.steps.erase(is_slot ? step + 1 : step, rest.steps.end());
      rest.steps.push_back({Step::kFault});
      rest.end = {{"faults", "what could not be allocated is written to"}};
      return rest;
    }
  }
  return rest;
}

CaseRun::CaseRun(const Json& contract_case, Course course, int refused_new)
    : case_(contract_case),
      course_(std::move(course)),
      refused_new_(refused_new),
      call_(contract_case.value("given", Json::object()),
            bytes_of(contract_case.value("received", Json::object()).value("bytes", ""))),
      progress_(static_cast<Progress*>(mmap(nullptr, sizeof(Progress), PROT_READ | PROT_WRITE,
                                            MAP_SHARED | MAP_ANONYMOUS, -1, 0)),
                [](Progress* progress) { munmap(progress, sizeof *progress); }) {}

void CaseRun::problem(const std::string& text) {
  ++progress_->problems;
  problems_.push_back(text);
}

Reader CaseRun::reader() const {
  return Reader([this](const void* block) {
    const auto found = blocks_.find(block);
    return found == blocks_.end() ? std::nullopt : std::optional<size_t>(found->second);
  });
}

Json CaseRun::outputs() const {
  Reader shows = reader();
  return comparable(call_.outputs(&shows));
}

// If the recorder stands before the library, a requestId is written when the call ends.
Json CaseRun::comparable(Json outputs) const {
  static const bool is_recorded = std::getenv("QEL_TRACE_FILE") != nullptr;
  if (is_recorded && is_under_way_) {
    outputs.erase("requestId");
  }
  return outputs;
}

void CaseRun::store(const std::string& path, const Json& value) {
  merge(&model_[pointer_of(path)], value);
}

void CaseRun::apply(const Step& step) {
  for (const auto& [path, value] : step.what.items()) {
    if (step.kind == Step::kSet) {
      call_.set(path, value);
    }
    store(path, value);
  }
}

void CaseRun::compare_outputs(const std::string& when) {
  const Json got = outputs();
  if (got != comparable(model_)) {
    problem(when + ", the outputs hold\n  " + got.dump() + "\ninstead of\n  " + model_.dump());
  }
}

// Until the next line or block, the outputs are written as the case says.
void CaseRun::apply_writes() {
  for (; !is_done(); ++next_) {
    const Step& step = course_.steps[next_];
    if (step.kind == Step::kWrite) {
      apply(step);
    } else if (step.kind != Step::kNews) {
      return;
    }
  }
}

// The step that comes next, if it is of this kind. After the first problem nothing more is
// compared.
const Step* CaseRun::take(Step::Kind kind, const std::string& what) {
  if (!problems_.empty() || !is_called_) {
    return nullptr;
  }
  if (next_ == 0) {
    begin();
  }
  apply_writes();
  if (is_done() || course_.steps[next_].kind != kind) {
    // An exception takes blocks too, and so does what a dying process says.
    const bool is_ending = is_done() ? !course_.end.contains("returns") && !course_.end.empty()
                                     : course_.steps[next_].kind == Step::kFault;
    if (kind != Step::kBlock || !is_ending) {
      problem("unexpected: " + what);
    }
    return nullptr;
  }
  const Step& step = course_.steps[next_];
  compare_outputs("when it comes to: " + what);
  ++next_;
  ++progress_->steps;
  return &step;
}

void CaseRun::on_line(const LogLine& line) {
  const Step* step = take(Step::kLine, shown(line));
  if (step == nullptr) {
    return;
  }
  const std::string text = step->what[0];
  const Json arguments(step->what.begin() + 1, step->what.end());
  const std::string format =
      "%s: %s(%d) > " + kColours.at(step->priority) + "[%d]" + text + "\033[0m";
  if (line.priority != step->priority || line.format != format || !is_in_frame(line, function()) ||
      Json(line.arguments.begin() + 4, line.arguments.end()) != arguments) {
    problem("the line is " + shown(line) + "\ninstead of " + step->what.dump() + " of priority " +
            std::to_string(step->priority));
    return;
  }
  const std::string other = other_statement(function(), text, line.arguments[2]);
  if (!other.empty()) {
    problem(other);
  }
  while (!is_done() && course_.steps[next_].kind == Step::kSet) {
    apply(course_.steps[next_++]);
  }
}

// Whether there is an output, and if the block is an element's, a list that it belongs to.
bool CaseRun::has_place_for(const std::string& path) const {
  const std::string output = path.substr(0, path.find_first_of("[."));
  const Json given = case_.value("given", Json::object());
  const bool is_missing = (given.contains(output) && given[output].is_null()) ||
                          (output != path && model_.value(output, Json()).is_null());
  return !is_missing;
}

bool CaseRun::on_request(Allocator allocator, size_t count, size_t size, const char* text) {
  if (!is_called_) {
    return true;
  }
  if (allocator == Allocator::kNew) {
    return on_new();
  }
  static const char* const kNames[] = {"calloc", "malloc", "strdup"};
  const std::string asked =
      std::string(kNames[static_cast<int>(allocator)]) + "(" +
      (text != nullptr ? json_of_text(text).dump()
                       : std::to_string(count) + ", " + std::to_string(size)) +
      ")";
  const Step* step = take(Step::kBlock, asked);
  if (step == nullptr) {
    return true;
  }
  const std::string path = step->what.at("for");
  const bool is_same =
      allocator == step->allocator &&
      (allocator == Allocator::kStrdup ? json_of_text(text) == step->what.at("text")
       : allocator == Allocator::kMalloc
           ? size == bytes_in(step->what)
           : count == step->what.value("count", size_t{1}) && count * size == bytes_in(step->what));
  if (!is_same) {
    problem("asked for " + asked + " instead of " + step->what.dump());
    return true;
  }
  if (!has_place_for(path)) {
    return !step->is_refused;
  }
  if (step->is_refused) {
    store(path, Json());
  } else if (allocator == Allocator::kStrdup) {
    store(path, step->what["text"]);
  } else {
    store(path, call_.blank(path, bytes_in(step->what),
                            allocator == Allocator::kCalloc ? 0 : kFreshByte));
  }
  return !step->is_refused;
}

// A deserializer allocates where its message is parsed or copied. A serializer fills its message
// after its first line and before anything is written; or where it copies something, if the case
// says so.
bool CaseRun::on_new() {
  ++news_;
  if (!problems_.empty() || !case_.value("flags", Json::array()).empty()) {
    return true;
  }
  const Json got = outputs();
  const Json before = model_;
  const bool fills_anywhere =
      next_ > 0 && std::none_of(course_.steps.begin(), course_.steps.end(),
                                [](const Step& step) { return step.kind == Step::kNews; });
  bool fits = fills_anywhere && got == comparable(model_);
  for (size_t i = next_; i < course_.steps.size() && !fits; ++i) {
    const Step& step = course_.steps[i];
    if (step.kind == Step::kNews) {
      fits = got == comparable(model_);
      has_copied_ = has_copied_ || (fits && step.is_copy());
    } else if (step.kind == Step::kWrite) {
      apply(step);
    } else {
      break;
    }
  }
  const Json now = model_;
  model_ = before;
  if (!fits && !(is_done() && course_.end.contains("throws"))) {
    problem("operator new is called where nothing is parsed or copied, the outputs being\n  " +
            got.dump());
  }
  if (news_ == refused_new_) {
    thrown_at_ = now;
    return false;
  }
  return true;
}

void CaseRun::on_block(Allocator allocator, void* block, size_t size) {
  if (!is_called_) {
    return;
  }
  if (allocator == Allocator::kNew) {
    objects_.insert(block);
  } else {
    blocks_[block] = size;
  }
}

void CaseRun::on_release(Allocator allocator, void* block) {
  if (allocator == Allocator::kNew) {
    objects_.erase(block);
  } else {
    blocks_.erase(block);
  }
}

void CaseRun::check_thrown(const std::string& thrown) {
  if (thrown_at_) {
    if (thrown != std::bad_alloc().what()) {
      problem("std::bad_alloc did not come through, but " + thrown);
    }
    if (outputs() != *thrown_at_) {
      problem("outputs were written after operator new had refused:\n  " + outputs().dump());
    }
    return;
  }
  if (thrown != course_.end.value("throws", "")) {
    problem(thrown.empty() ? "nothing is thrown" : "thrown: " + thrown);
  }
  check_end();
}

std::optional<int> CaseRun::expected_return(Json* /*model*/) {
  const Json returns = course_.end.value("returns", Json());
  return returns.is_null() ? std::nullopt : std::optional<int>(returns);
}

void CaseRun::check_return(std::optional<int> status) {
  apply_writes();
  if (status != expected_return(&model_)) {
    problem("it returned " + (status ? std::to_string(*status) : "nothing"));
  }
  check_end();
}

// Nothing is left to be done but to write.
void CaseRun::check_end() {
  apply_writes();
  if (!is_done() && course_.steps[next_].kind != Step::kFault) {
    problem("it ended before " + course_.steps[next_].what.dump());
  }
  compare_outputs("in the end");
}

void CaseRun::check_blocks() {
  Reader shows = reader();
  call_.outputs(&shows);
  const std::multiset<const void*> seen(shows.seen().begin(), shows.seen().end());
  for (const auto& [block, size] : blocks_) {
    const auto times = seen.count(block);
    if (times != 1) {
      problem("a block of " + std::to_string(size) + " bytes is in " + std::to_string(times) +
              " outputs");
    }
  }
  size_t kept = course_.keeps_stream.value_or(false) ? 1 : 0;
  if (thrown_at_) {
    kept = course_.keeps_stream && refused_new_ > 1 ? 1 : 0;  // the first is the stream itself
  }
  if (objects_.size() != kept) {
    problem(std::to_string(objects_.size()) + " objects are kept instead of " +
            std::to_string(kept));
  }
}

void CaseRun::execute() {
  const Invocation invocation = make_invocation(&call_);
  for (const std::string& name : call_.unknown_names()) {
    problem(function() + " has no parameter " + name);
  }
  model_ = outputs();
  std::optional<int> status;
  std::string thrown;
  {
    const Observation observation(this);
    is_called_ = true;
    is_under_way_ = true;
    try {
      status = invocation();
      is_called_ = false;
    } catch (const std::exception& exception) {
      is_called_ = false;
      thrown = exception.what();
    }
    is_under_way_ = false;
  }
  if (!problems_.empty()) {
    return;
  }
  if (thrown.empty() && !thrown_at_ && !course_.end.contains("throws")) {
    check_return(status);
  } else {
    check_thrown(thrown);
  }
  check_blocks();
  for (const auto& [block, size] : blocks_) {
    std::free(const_cast<void*>(block));
  }
  for (void* object : objects_) {
    operator delete(object);
  }
}

// Compares the outputs when the call ends the process. Then the signal comes again, and ends it.
void CaseRun::watch_death() {
  static CaseRun* watched = nullptr;
  watched = this;
  struct sigaction action = {};
  action.sa_handler = [](int /*signal*/) {
    if (watched->is_called_) {
      watched->is_called_ = false;
      if (watched->problems_.empty()) {
        watched->check_end();
      }
      for (const std::string& text : watched->problems_) {
        std::fprintf(stderr, "%s\n", text.c_str());
      }
    }
  };
  action.sa_flags = static_cast<int>(SA_RESETHAND);
  sigaction(SIGSEGV, &action, nullptr);
  sigaction(SIGABRT, &action, nullptr);
}

void CaseRun::execute_in_child() {
  std::array<int, 2> ends = {};
  if (pipe(ends.data()) != 0) {
    problem("no pipe");
    return;
  }
  std::fflush(nullptr);
  const pid_t child = fork();
  if (child == 0) {
    dup2(ends[1], STDERR_FILENO);
    watch_death();
    execute();
    for (const std::string& text : problems_) {
      std::fprintf(stderr, "%s\n", text.c_str());
    }
    _exit(problems_.empty() ? kReturned : kProblem);
  }
  close(ends[1]);
  std::string said;
  std::array<char, 4096> buffer = {};
  for (ssize_t n = 0; (n = read(ends[0], buffer.data(), buffer.size())) > 0;) {
    said.append(buffer.data(), static_cast<size_t>(n));
  }
  close(ends[0]);
  int status = 0;
  waitpid(child, &status, 0);

  const size_t emulator = said.find("qemu: uncaught target signal");
  said.erase(std::min(emulator, said.size()));  // its last word

  const auto steps = std::count_if(course_.steps.begin(), course_.steps.end(), [](const Step& s) {
    return s.kind == Step::kLine || s.kind == Step::kBlock;
  });
  const int signal = WIFSIGNALED(status) ? WTERMSIG(status) : 0;
  bool faults = signal == SIGSEGV;
  if (support::has_address_sanitizer()) {  // which ends the process in ways of its own
    faults = signal != 0 || (WEXITSTATUS(status) != kProblem && WEXITSTATUS(status) != kReturned);
  } else if (!course_.end.contains("aborts") && !case_.contains("flags") && !said.empty()) {
    problem("before it faulted, the process said:\n" + said);
  }
  if (course_.end.contains("aborts")
          ? signal != SIGABRT || !says_assertion_alone(said, course_.end["aborts"])
          : !faults) {
    problem("the process did not end as it should, but with status " + std::to_string(status) +
            ", saying:\n" + said);
  } else if (progress_->steps != steps || progress_->problems > 0) {
    problem("the process ended after " + std::to_string(progress_->steps) +
            " lines and blocks, with " + std::to_string(progress_->problems) + " problems");
  }
}

}  // namespace contract
