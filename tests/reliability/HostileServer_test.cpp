// A sync against a server whose answers turn hostile: the local service
// behind a proxy that rewrites one item ("HOSTILE.txt") or the group in every
// JSON answer. Item names with "/", "..", NUL, 10,000 characters or invalid
// UTF-8; sizes and dates of the wrong type; an item that claims to be a
// collection and the reverse; a group that contains itself. Whatever the
// sync makes of it, it ends (with success or an error), writes nothing
// outside the registered folder but its own cache file and backups, keeps the
// local file, and a clean sync afterwards passes.

#include <gtest/gtest.h>

#include <cctype>
#include <cstdio>
#include <functional>
#include <ostream>
#include <regex>
#include <set>

#include "ServiceStage.h"
#include "TamperingProxy.h"
#include "server/AssetRecord.h"

namespace {

namespace fs = std::filesystem;
using namespace reliability;
using synctest::RunResult;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

struct Ids {
    std::string mKeep;   // the group's collection
    std::string mInner;  // a collection inside it, when the case asks for one
};

struct HostileCase {
    const char* mName;
    bool mInner;
    std::function<std::string(const std::string& body, const Ids& ids)> mRewrite;
};

// Names the case in test listings, instead of its bytes.
void PrintTo(const HostileCase& hostile, std::ostream* out)
{
    *out << hostile.mName;
}

std::string ReplaceAll(std::string text, const std::string& from, const std::string& to)
{
    for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
        text.replace(at, from.size(), to);
    return text;
}

// The hostile item's name as this JSON text (quotes included).
HostileCase Name(const char* label, const std::string& json)
{
    return {label, false,
            [json](const std::string& body, const Ids&) { return ReplaceAll(body, "\"HOSTILE.txt\"", json); }};
}

// The value of one field of the hostile item (or of the group, for "type"
// with `ofGroup`) as this JSON text.
HostileCase Field(const char* label, const std::string& field, const std::string& json, bool ofGroup = false)
{
    const std::string name = ofGroup ? "Keep" : "HOSTILE\\.txt";
    const std::regex pattern("(\"name\":\"" + name + "\"[^{}]*\"" + field + "\":)(\"[^\"]*\"|-?[0-9.e+]+|true|false)");
    return {label, false, [pattern, json](const std::string& body, const Ids&) {
                return std::regex_replace(body, pattern, "$1" + json);
            }};
}

const HostileCase kCases[] = {
    Name("name with a slash", "\"a/evil.txt\""),
    Name("name with an escaped slash", "\"a\\/evil.txt\""),
    Name("name going up", "\"../evil.txt\""),
    Name("name that is ..", "\"..\""),
    Name("absolute name", "\"/evil.txt\""),
    Name("name with NUL", "\"evil\\u0000.txt\""),
    Name("name of 10,000 characters", "\"" + std::string(10000, 'e') + ".txt\""),
    Name("name of invalid UTF-8",
         "\"\xff\xfe"
         "evil.txt\""),
    Name("name with a lone surrogate", "\"\\ud800evil.txt\""),
    Name("empty name", "\"\""),
    Name("name that is a number", "42"),
    Field("size as text", "size", "\"seven\""),
    Field("size as an object", "size", "{\"n\":7}"),
    Field("negative size", "size", "-7"),
    Field("size beyond any integer", "size", "1e300"),
    Field("size null", "size", "null"),
    Field("modified as a number", "modified", "12345"),
    Field("modified not a date", "modified", "\"yesterday\""),
    Field("created null", "created", "null"),
    Field("item claiming to be a collection", "type",
          std::string("\"") + tolmonetsync::server::kMediaCollection + "\""),
    Field("group claiming to be an item", "type", "\"text/plain\"", true),
    {"group that contains itself", true,
     [](const std::string& body, const Ids& ids) {
         return ReplaceAll(ReplaceAll(body, ids.mInner, ids.mKeep), "\"name\":\"Inner\"", "\"name\":\"Keep\"");
     }},
};

// Every file under the stage's folders ("stage/...", the service's data
// left out) and its preference directory ("prefs/...").
std::set<std::string> Everything(Stage& stage)
{
    std::set<std::string> files;
    const auto gather = [&](const fs::path& root, const std::string& prefix) {
        for (auto it = fs::recursive_directory_iterator(root); it != fs::recursive_directory_iterator(); ++it) {
            if (it->is_directory() && it->path().filename() == "service") it.disable_recursion_pending();
            if (!it->is_directory()) files.insert(prefix + fs::relative(it->path(), root).generic_string());
        }
    };
    gather(stage.Keep().parent_path(), "stage/");
    gather(stage.PrefDir(), "prefs/");
    return files;
}

// A file the sync may make: one directly in the registered folder, the cache
// file, or a backup copy.
bool MayAppear(const std::string& file)
{
    const auto directlyIn = [&](const std::string& folder) {
        return file.rfind(folder, 0) == 0 && file.find('/', folder.size()) == std::string::npos;
    };
    if (directlyIn("stage/Keep/") || file == "prefs/tolmonetsynccache.json") return true;
    if (file.rfind("prefs/SyncBackup/", 0) != 0) return false;
    const std::size_t dir = file.find('/', std::string("prefs/SyncBackup/").size());
    return dir != std::string::npos && file.find('/', dir + 1) == std::string::npos;
}

class HostileServer : public ::testing::TestWithParam<HostileCase> {
protected:
    static void SetUpTestSuite() { UseStageHost(); }
    static void TearDownTestSuite() { RestoreTimeouts(); }
};

TEST_P(HostileServer, SyncEndsAndWritesNothingOutsideTheFolder)
{
    const HostileCase& hostile = GetParam();
    Stage stage;
    WriteFileBytes(stage.Keep() / "mine.txt", "mine");
    ASSERT_TRUE(stage.Sync(false).Ok());
    stage.PutOnServer("Keep", "ok.txt", "ok from the server");
    stage.PutOnServer("Keep", "HOSTILE.txt", "hostile payload");
    Ids ids{stage.GroupId("Keep"), std::string()};
    if (hostile.mInner) ids.mInner = stage.Seed().Collection(ids.mKeep, "Inner");
    const std::set<std::string> before = Everything(stage);

    TamperingProxy proxy(stage.Service().Port(), [&](const std::string& body) { return hostile.mRewrite(body, ids); });
    stage.SendTo(proxy.ApiUrl());
    const RunResult run = stage.Sync(false);
    EXPECT_GT(proxy.Changed(), 0) << hostile.mName << ": no answer was rewritten";
    EXPECT_TRUE(run.mFinished || run.mErrorCount > 0) << hostile.mName << ": the sync neither ended nor failed";
    std::string made;
    for (const std::string& file : Everything(stage)) {
        if (before.count(file)) continue;
        EXPECT_TRUE(MayAppear(file)) << hostile.mName << ": wrote " << file.substr(0, 200);
        made += " " + file.substr(0, 40);
    }
    EXPECT_FALSE(fs::exists("/evil.txt"));
    EXPECT_EQ(ReadFileBytes(stage.Keep() / "mine.txt"), "mine");
    const std::string outcome = run.mErrorCount > 0 ? "failed: " + run.mError.substr(0, 90) : "passed";
    std::printf("%-34s %s; new files:%s\n", hostile.mName, outcome.c_str(), made.c_str());

    stage.SendTo(std::string());
    const RunResult clean = stage.Sync(false);
    EXPECT_TRUE(clean.Ok()) << hostile.mName << ": the clean sync after failed: " << clean.mError;
}

std::string CaseName(const ::testing::TestParamInfo<HostileCase>& info)
{
    std::string name;
    bool upper = true;
    for (const char* c = info.param.mName; *c; ++c) {
        if (std::isalnum(static_cast<unsigned char>(*c))) {
            name += upper ? static_cast<char>(std::toupper(static_cast<unsigned char>(*c))) : *c;
            upper = false;
        } else {
            upper = true;
        }
    }
    return name;
}

INSTANTIATE_TEST_SUITE_P(Answers, HostileServer, ::testing::ValuesIn(kCases), CaseName);

}  // namespace
