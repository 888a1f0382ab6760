// A sync against a server whose answers turn hostile: the local service
// behind a proxy that rewrites one item ("HOSTILE.txt") or the group in every
// JSON answer. Whatever the sync makes of it, it ends (with success or an
// error), writes nothing outside the registered folder but its own cache file
// and backups, keeps the local file, and a clean sync afterwards passes.

#include <gtest/gtest.h>

#include <httplib.h>

#include <atomic>
#include <functional>
#include <regex>
#include <set>

#include "ServiceStage.h"
#include "server/AssetRecord.h"
#include "support/LoopbackHttpServer.h"

namespace {

namespace fs = std::filesystem;
using namespace reliability;
using synctest::RunResult;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

// Framing and the Host header are each hop's own business; httplib's header
// map compares names without regard to case.
void DropHopByHop(httplib::Headers& headers)
{
    for (const char* name : {"Content-Length", "Transfer-Encoding", "Connection", "Keep-Alive", "Host"})
        headers.erase(name);
}

// A hostile server made of a well-behaved one: `request` passed on to the
// local service on `port`, and its answer with each JSON body as `rewrite`
// makes it (the bytes of a download pass untouched); `changed` counts the
// answers it changed. Runs on the proxy's connection threads.
testsupport::HttpAnswer Forward(int port, const testsupport::HttpRequest& request,
                                const std::function<std::string(const std::string&)>& rewrite,
                                std::atomic<int>& changed)
{
    httplib::Client service("127.0.0.1", port);
    service.set_url_encode(false);  // the target goes on exactly as the client sent it
    httplib::Request passed;
    passed.method = request.mMethod;
    passed.path = request.mTarget;
    passed.body = request.mBody;
    passed.headers.insert(request.mHeaders.begin(), request.mHeaders.end());
    DropHopByHop(passed.headers);
    testsupport::HttpAnswer answer;
    const httplib::Result result = service.send(passed);
    answer.mStatus = result ? result->status : 502;
    if (!result) return answer;
    httplib::Headers headers = result->headers;
    DropHopByHop(headers);
    answer.mHeaders.assign(headers.begin(), headers.end());
    const bool json = result->get_header_value("Content-Type").find("json") != std::string::npos;
    answer.mBody = json ? rewrite(result->body) : result->body;
    if (answer.mBody != result->body) ++changed;
    return answer;
}

struct Ids {
    std::string mKeep;   // the group's collection
    std::string mInner;  // a collection inside it, when the case asks for one
};

struct HostileCase {
    const char* mName;  // also the test's name
    bool mInner;
    std::function<std::string(const std::string& body, const Ids& ids)> mRewrite;
};

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
    Name("NameWithASlash", "\"a/evil.txt\""),
    Name("NameGoingUp", "\"../evil.txt\""),
    Name("NameThatIsDotDot", "\"..\""),
    Name("AbsoluteName", "\"/evil.txt\""),
    Name("NameWithNUL", "\"evil\\u0000.txt\""),
    Name("NameOf10000Characters", "\"" + std::string(10000, 'e') + ".txt\""),
    Name("NameOfInvalidUTF8",
         "\"\xff\xfe"
         "evil.txt\""),
    Name("NameWithALoneSurrogate", "\"\\ud800evil.txt\""),
    Name("EmptyName", "\"\""),
    Name("NameThatIsANumber", "42"),
    Field("SizeAsText", "size", "\"seven\""),
    Field("NegativeSize", "size", "-7"),
    Field("SizeBeyondAnyInteger", "size", "1e300"),
    Field("ModifiedAsANumber", "modified", "12345"),
    Field("ModifiedNotADate", "modified", "\"yesterday\""),
    Field("ItemClaimingToBeACollection", "type", std::string("\"") + tolmonetsync::server::kMediaCollection + "\""),
    Field("GroupClaimingToBeAnItem", "type", "\"text/plain\"", true),
    {"GroupThatContainsItself", true,
     [](const std::string& body, const Ids& ids) {
         return ReplaceAll(ReplaceAll(body, ids.mInner, ids.mKeep), "\"name\":\"Inner\"", "\"name\":\"Keep\"");
     }},
};

// Every file under the stage's folders and its preference directory.
std::set<fs::path> Everything(Stage& stage)
{
    std::set<fs::path> files;
    for (const fs::path& root : {stage.Keep().parent_path(), stage.PrefDir()})
        for (const auto& entry : fs::recursive_directory_iterator(root))
            if (!entry.is_directory()) files.insert(entry.path());
    return files;
}

// A file the sync may make: one directly in the registered folder, the cache
// file, or a backup copy.
bool MayAppear(Stage& stage, const fs::path& file)
{
    return file.parent_path() == stage.Keep() || file == stage.PrefDir() / "tolmonetsynccache.json" ||
           file.parent_path().parent_path() == stage.PrefDir() / "SyncBackup";
}

class HostileServer : public ::testing::TestWithParam<HostileCase> {
protected:
    static void SetUpTestSuite() { UseStageHost(); }
    static void TearDownTestSuite() { RestoreTimeouts(); }
};

TEST_P(HostileServer, SyncEndsAndWritesNothingOutsideTheFolder)
{
    const HostileCase& hostile = GetParam();
    testsupport::TestService service;
    Stage stage(service, "matrix");
    WriteFileBytes(stage.Keep() / "mine.txt", "mine");
    ASSERT_TRUE(stage.Sync(false).Ok());
    stage.PutOnServer("Keep", "ok.txt", "ok from the server");
    stage.PutOnServer("Keep", "HOSTILE.txt", "hostile payload");
    Ids ids{stage.GroupId("Keep"), std::string()};
    if (hostile.mInner) ids.mInner = stage.Seed().Collection(ids.mKeep, "Inner");
    const std::set<fs::path> before = Everything(stage);

    std::atomic<int> changed{0};  // none: the case never met the client
    const auto rewrite = [&](const std::string& body) { return hostile.mRewrite(body, ids); };
    const testsupport::LoopbackHttpServer proxy(
        [&](const testsupport::HttpRequest& request) { return Forward(service->Port(), request, rewrite, changed); });
    stage.SendTo(proxy.Url("/api"));
    const RunResult run = stage.Sync(false);
    EXPECT_GT(changed.load(), 0) << hostile.mName << ": no answer was rewritten";
    EXPECT_TRUE(run.mFinished || run.mErrorCount > 0) << hostile.mName << ": the sync neither ended nor failed";
    for (const fs::path& file : Everything(stage))
        EXPECT_TRUE(before.count(file) || MayAppear(stage, file))
            << hostile.mName << ": wrote " << file.string().substr(0, 200);
    EXPECT_FALSE(fs::exists("/evil.txt"));
    EXPECT_EQ(ReadFileBytes(stage.Keep() / "mine.txt"), "mine");

    stage.SendTo(std::string());
    const RunResult clean = stage.Sync(false);
    EXPECT_TRUE(clean.Ok()) << hostile.mName << ": the clean sync after failed: " << clean.mError;
}

INSTANTIATE_TEST_SUITE_P(Answers, HostileServer, ::testing::ValuesIn(kCases),
                         [](const ::testing::TestParamInfo<HostileCase>& info) { return info.param.mName; });

}  // namespace
