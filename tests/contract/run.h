// One call of the library beside what a case of the contract says that it does, step by step.
#ifndef TESTS_CONTRACT_RUN_H
#define TESTS_CONTRACT_RUN_H

#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "adapters.h"
#include "call.h"
#include "doubles.h"

namespace contract {

// What may be seen of a call, in order. Between two lines or blocks, outputs may be written.
struct Step {
  enum Kind {
    kLine,   // is logged
    kBlock,  // is asked for
    kWrite,  // outputs hold this from here on
    kSet,    // an output that somebody else changes while the line before is logged
    kNews,   // the runtime may allocate: the message is parsed, or a part of it is copied
    kFault,  // the process ends
  };
  Kind kind;
  Json what = {};  // as the case has it
  int priority = 0;
  Allocator allocator = Allocator::kCalloc;
  bool is_refused = false;

  // Of kNews: a case names what is copied.
  bool is_copy() const { return kind == kNews && what.is_string(); }
};

struct Course {
  std::vector<Step> steps;
  Json end =
      Json::object();  // the case's returns, aborts, faults and throws, as far as it has them
  std::optional<bool> keeps_stream = {};  // if there is one
};

Course course_of(const Json& contract_case);

// Whether the process ends, with an abort or a fault.
bool ends_process(const Course& course);

// How many blocks of calloc, malloc and strdup the course asks for.
int blocks_of(const Course& course);

// What is left of the course if the n-th of them, from 0, is refused.
Course course_without_block(const Course& course, int n);

class CaseRun : public Observer {
 public:
  // With refused_new, the n-th block of operator new, from 1, is refused. The case must outlive
  // the run.
  CaseRun(const Json& contract_case, Course course, int refused_new = 0);

  // Makes the call in this process and compares.
  void execute();
  // The same for a call that is meant to end the process, in a child.
  void execute_in_child();

  const std::vector<std::string>& problems() const { return problems_; }
  // Whether it has come to the block of operator new that is refused.
  bool has_refused_new() const { return thrown_at_.has_value(); }

  // Whether operator new was called where something is copied.
  bool has_copied() const { return has_copied_; }

 protected:
  // The call, with what the case gives.
  virtual Invocation make_invocation(Call* call) { return invocation_of(function(), call); }
  // When it comes to the first line.
  virtual void begin() {}
  // What the call returns, and what its outputs hold then. The model's are those of the function.
  virtual std::optional<int> expected_return(Json* model);
  // What was asked for is in an output, once, or was freed; but for the stream.
  virtual void check_blocks();

  std::string function() const { return case_.at("call"); }
  Json outputs() const;
  Json comparable(Json outputs) const;
  void set_model(const Json& model) { model_ = model; }
  bool owns_blocks() const { return !blocks_.empty(); }
  void problem(const std::string& text);

 private:
  void on_line(const LogLine& line) override;
  bool on_request(Allocator allocator, size_t count, size_t size, const char* text) override;
  void on_block(Allocator allocator, void* block, size_t size) override;
  void on_release(Allocator allocator, void* block) override;

  bool on_new();
  const Step* take(Step::Kind kind, const std::string& what);
  void apply(const Step& step);
  void apply_writes();
  void store(const std::string& path, const Json& value);
  void compare_outputs(const std::string& when);
  Reader reader() const;
  void check_thrown(const std::string& thrown);
  void check_return(std::optional<int> status);
  void check_end();
  void watch_death();
  bool has_place_for(const std::string& path) const;
  bool is_done() const { return next_ == course_.steps.size(); }

  const Json& case_;
  const Course course_;
  const int refused_new_;
  Call call_;
  std::map<const void*, size_t> blocks_;  // of calloc, malloc and strdup
  std::set<void*> objects_;               // of operator new
  size_t next_ = 0;                       // step
  Json model_;                            // of the outputs
  bool is_called_ = false;
  bool is_under_way_ = false;  // until it returns or throws
  int news_ = 0;
  bool has_copied_ = false;
  std::optional<Json> thrown_at_;  // what the outputs held when operator new refused
  struct Progress {
    int steps;  // lines and blocks that were as they should be
    int problems;
  };
  std::shared_ptr<Progress> progress_;  // with a child
  std::vector<std::string> problems_;
};

}  // namespace contract

#endif
