// Replaces the index library's registration. For test programs with a single source file.
#pragma once

#include <json/value.h>

#include <vector>

#include "platform/velaindex.h"

namespace vela_test {

/// One call of VELAIDX_IndexConvertAdd.
struct Registration {
  VELA_MEDIA_INFO photo;
  VELA_MEDIA_INFO thumbnail;
  Json::Value extra;
};

/// Records the calls while the object exists and returns `result` from each; without one they
/// succeed and are not recorded.
class IndexFake {
 public:
  explicit IndexFake(int result = 0) : result_(result) { Current() = this; }
  ~IndexFake() { Current() = nullptr; }
  IndexFake(const IndexFake&) = delete;
  IndexFake& operator=(const IndexFake&) = delete;

  const std::vector<Registration>& Calls() const { return calls_; }

  int Take(const Registration& call) {
    calls_.push_back(call);
    return result_;
  }

  static IndexFake*& Current() {
    static IndexFake* current = nullptr;
    return current;
  }

 private:
  int result_;
  std::vector<Registration> calls_;
};

}  // namespace vela_test

int VELAIDX_IndexConvertAdd(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail,
                            const Json::Value& extra) {
  vela_test::IndexFake* index = vela_test::IndexFake::Current();
  return index == nullptr ? 0 : index->Take({photo, thumbnail, extra});
}
