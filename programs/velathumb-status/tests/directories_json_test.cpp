// The report about directories in JSON.
#include "status_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;

const std::vector<std::string> kCountKeys = {"failure_markers", "incomplete_photos",
                                             "missing_thumbs",  "photos",
                                             "present_thumbs",  "videos_needing_work"};

std::vector<std::string> With(std::vector<std::string> keys, const std::vector<std::string>& more) {
  keys.insert(keys.end(), more.begin(), more.end());
  return keys;
}

std::string Decoded(const Json::Value& base64) {
  const std::string alphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  const std::string text = base64.asString();
  EXPECT_EQ(text.size() % 4, 0U) << text;
  std::string bytes;
  unsigned bits = 0;
  int bitCount = 0;
  for (const char c : text.substr(0, text.find('='))) {
    const size_t value = alphabet.find(c);
    EXPECT_NE(value, std::string::npos) << text;
    bits = bits << 6 | static_cast<unsigned>(value & 63);
    bitCount += 6;
    if (bitCount >= 8) {
      bitCount -= 8;
      bytes += static_cast<char>(bits >> bitCount & 0xff);
    }
  }
  return bytes;
}

using JsonDirectories = StatusTest;

TEST_F(JsonDirectories, HaveTheDocumentedMembers) {
  MakePhotoWith("a.jpg", 0);
  const Json::Value answer = QueryJson({kTop});
  EXPECT_THAT(answer.getMemberNames(),
              UnorderedElementsAre("format", "directories", "totals", "errors"));
  EXPECT_EQ(answer["format"], Json::Value(1));
  EXPECT_EQ(answer["errors"], Json::Value(Json::arrayValue));
  ASSERT_TRUE(answer["directories"].isArray());
  ASSERT_EQ(answer["directories"].size(), 1U);
  EXPECT_THAT(answer["directories"][0].getMemberNames(),
              UnorderedElementsAreArray(With(kCountKeys, {"path", "queued"})));
  EXPECT_THAT(
      answer["totals"].getMemberNames(),
      UnorderedElementsAreArray(With(kCountKeys, {"directories", "queued_directories", "queued"})));
  EXPECT_THAT(answer["totals"]["queued"].getMemberNames(), UnorderedElementsAreArray(kCountKeys));
}

TEST_F(JsonDirectories, HaveTheCountsAsNumbers) {
  MakePhotoWith("complete.jpg", kAllSizes);
  MakePhotoWith("lacking.jpg", kBitS | kBitM);
  SetFileTime(Derived("lacking.jpg", "VELAPHOTO_THUMB_M.jpg"), kMediaTime - 1);
  WriteFile(Derived("lacking.jpg", "VELAPHOTO_THUMB_B.fail"), "");
  EXPECT_EQ(QueryJson({kTop})["directories"][0],
            ReadJson(R"({"path": "/tmp/photos", "queued": false, "photos": 2,
                         "incomplete_photos": 1, "present_thumbs": 7, "missing_thumbs": 5,
                         "failure_markers": 1, "videos_needing_work": null})"));
}

TEST_F(JsonDirectories, TotalsCountTheQueuedOnesSeparately) {
  MakePhoto("/tmp/free/a.jpg");
  MakePhoto("/tmp/waiting/a.jpg");
  MakePhoto("/tmp/waiting/b.jpg");
  MakeThumbs("/tmp/waiting", "b.jpg", kAllSizes);
  WriteFile("/tmp/waiting/@eaDir/a.jpg/VELAPHOTO_THUMB_S.fail", "");
  WriteFile(kPhotoQueue, "/tmp/waiting\n");
  const Json::Value answer = QueryJson({"/tmp/free", "/tmp/waiting"});
  EXPECT_EQ(answer["directories"][0]["queued"], Json::Value(false));
  EXPECT_EQ(answer["directories"][1]["queued"], Json::Value(true));
  ExpectMembers(answer["totals"], R"({"directories": 2, "queued_directories": 1, "photos": 3,
                                      "incomplete_photos": 2, "present_thumbs": 6,
                                      "missing_thumbs": 12, "failure_markers": 1})");
  ExpectMembers(answer["totals"]["queued"], R"({"photos": 2, "incomplete_photos": 1,
                                                "present_thumbs": 6, "missing_thumbs": 6,
                                                "failure_markers": 1})");
}

TEST_F(JsonDirectories, PhotosAreListedWithTheStateOfEachSize) {
  MakePhotoWith("complete.jpg", kAllSizes);
  MakePhotoWith("a.jpg", kBitXL | kBitSM | kBitB);
  SetFileTime(Derived("a.jpg", "VELAPHOTO_THUMB_B.jpg"), kMediaTime - 1);
  WriteFile(Derived("a.jpg", "VELAPHOTO:THUMB_L.fail"), "");
  const Json::Value list = QueryJson({"--photos", kTop})["directories"][0]["photo_list"];
  ASSERT_TRUE(list.isArray());
  ASSERT_EQ(list.size(), 1U);
  EXPECT_EQ(list[0], ReadJson(R"({"name": "a.jpg", "present": ["SM", "XL"],
                                  "missing": ["S", "M", "L"], "outdated": ["B"],
                                  "failed": ["L"]})"));
}

TEST_F(JsonDirectories, ThePhotoListIsEmptyWithoutIncompletePhotos) {
  MakePhotoWith("complete.jpg", kAllSizes);
  MakePhoto("/tmp/first/a.jpg");
  const Json::Value directories = QueryJson({"--photos", "/tmp/first", kTop})["directories"];
  EXPECT_EQ(directories[0]["photo_list"].size(), 1U);
  EXPECT_EQ(directories[1]["photo_list"], Json::Value(Json::arrayValue));
}

TEST_F(JsonDirectories, ValidUtf8IsKeptWhateverItMeansInJson) {
  const std::string names[] = {"quote\" back\\ new\nline tab\t bell\x07 \x7f <b>&.jpg",
                               "gr\xc3\xbc\xc3\x9f \xe2\x82\xac \xf0\x9f\x93\xb7.jpg"};
  const std::string dir = "/tmp/odd \"\\\n\x01";
  MakePhotoWith(names[0], 0);
  MakePhoto(dir + "/" + names[1]);
  const Json::Value directories = QueryJson({"-p", kTop, dir})["directories"];
  EXPECT_EQ(directories[1]["path"].asString(), dir);
  EXPECT_FALSE(directories[1].isMember("path_base64"));
  for (const Json::ArrayIndex i : {0U, 1U}) {
    const Json::Value photo = directories[i]["photo_list"][0];
    EXPECT_EQ(photo["name"].asString(), names[i]);
    EXPECT_FALSE(photo.isMember("name_base64"));
  }
}

TEST_F(JsonDirectories, NamesThatAreNotUtf8AreAddedExactlyInBase64) {
  const std::string dir = "/tmp/\xff\xfe dir";
  const std::string names[] = {"cut \xc3.jpg", "surrogate \xed\xa0\x80.jpg",
                               "overlong \xc0\xaf.jpg", "latin \xe4\xf6\"\n.jpg"};
  for (const std::string& name : names) {
    MakePhoto(dir + "/" + name);
  }
  const Json::Value directory = QueryJson({"-p", dir})["directories"][0];
  EXPECT_EQ(Decoded(directory["path_base64"]), dir);
  EXPECT_EQ(directory["path"], Json::Value("/tmp/\xef\xbf\xbd\xef\xbf\xbd dir"));
  std::vector<std::string> decoded;
  for (const Json::Value& photo : directory["photo_list"]) {
    decoded.push_back(Decoded(photo["name_base64"]));
    EXPECT_THAT(photo["name"].asString(), HasSubstr("\xef\xbf\xbd"));
  }
  EXPECT_THAT(decoded, UnorderedElementsAreArray(names));
}

TEST_F(JsonDirectories, AreOneWholeObjectWithTheErrorWhenADirectoryIsMissing) {
  const std::string missing = "/tmp/none \xff\"\n";
  const ProgramResult result = RunStatus({"--json", missing, kTop});
  EXPECT_EQ(result.exitCode, 2);
  const Json::Value answer = ReadJson(result.out);
  ASSERT_EQ(answer["errors"].size(), 1U);
  EXPECT_THAT(answer["errors"][0].getMemberNames(),
              UnorderedElementsAre("path", "path_base64", "message"));
  EXPECT_EQ(Decoded(answer["errors"][0]["path_base64"]), missing);
  EXPECT_EQ(answer["errors"][0]["message"], Json::Value("No such file or directory"));
  ASSERT_EQ(answer["directories"].size(), 1U);
  EXPECT_EQ(answer["directories"][0]["path"], Json::Value(kTop));
}

TEST_F(JsonDirectories, AreEmptyWhenNoDirectoryCouldBeScanned) {
  const Json::Value answer = QueryJson({"/tmp/none"});
  EXPECT_EQ(answer["directories"], Json::Value(Json::arrayValue));
  ExpectMembers(answer["totals"], R"({"directories": 0, "photos": 0})");
}

TEST_F(JsonDirectories, ShareOneObjectWithTheOtherReports) {
  const Json::Value answer = QueryJson({"--queue", "--progress", "--resume-time", kTop});
  EXPECT_THAT(answer.getMemberNames(),
              UnorderedElementsAre("format", "directories", "totals", "queues", "progress",
                                   "resume", "errors"));
}

TEST_F(JsonDirectories, AreTheSameEachTime) {
  MakePhotoWith("a.jpg", kBitS);
  MakePhotoWith("b.jpg", kBitM);
  const ProgramResult first = RunStatus({"--json", "-p", "-r", kTop});
  EXPECT_EQ(first.out, RunStatus({"--json", "-p", "-r", kTop}).out);
  EXPECT_EQ(first.exitCode, 1);
}

}  // namespace
}  // namespace vela_test
