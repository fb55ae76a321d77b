#include "status_fixture.h"

namespace vela_test {

void StatusTest::SetUp() {
  SandboxTest::SetUp();
  MakeDirectories(kTop);
}

std::string In(const std::string& name) {
  return std::string(kTop) + "/" + name;
}

std::string Derived(const std::string& media, const std::string& name) {
  return In("@eaDir/") + media + "/" + name;
}

void MakePhotoWith(const std::string& name, int sizes) {
  MakePhoto(In(name));
  MakeThumbs(kTop, name, sizes);
}

StatusText QueryText(const std::vector<std::string>& arguments, const ProgramOptions& options) {
  return ReadStatusText(RunStatus(arguments, options).out);
}

void ExpectError(const ProgramResult& result, const std::string& message) {
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err, "velathumb-status: " + message + "\n");
}

void ExpectMembers(const Json::Value& object, const std::string& expected) {
  const Json::Value members = ReadJson(expected);
  for (const std::string& name : members.getMemberNames()) {
    EXPECT_EQ(object[name], members[name]) << name;
  }
}

std::vector<std::string> Texts(const Json::Value& list) {
  std::vector<std::string> texts;
  for (const Json::Value& text : list) {
    texts.push_back(text.asString());
  }
  return texts;
}

}  // namespace vela_test
