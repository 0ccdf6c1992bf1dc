// check_calls: checks in every case that the implementation's call hands out what it should.

#include <cstdio>

#include "calls.h"
#include "cases.h"

int main() {
  int wrong = 0;
  int checked = 0;
  for (const std::string& name : case_names()) {
    ++checked;
    if (!make_case(name).is_right()) {
      ++wrong;
      std::printf("%s: %s is wrong\n", implementation.name, name.c_str());
    }
  }
  std::printf("%s: %d cases, %d wrong\n", implementation.name, checked, wrong);
  return wrong != 0 || checked == 0;
}
