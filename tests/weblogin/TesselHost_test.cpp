// The in-process extension host itself: where listeners run, what a
// dispatched event carries, and what it refuses.

#include <gtest/gtest.h>

#include <mutex>
#include <string>
#include <vector>

#include "foundation/tessel/Tessel.h"
#include "foundation/tessel/TesselHost.h"
#include "foundation/tessel/TesselScriptedExtension.h"

namespace {

struct Heard {
    std::mutex mMutex;
    std::vector<std::string> mData;
    bool mAllOnHostThread = true;
};

void Listen(const ruvex::event::Event* event, void* context)
{
    Heard& heard = *static_cast<Heard*>(context);
    const bool onHost = tessel::TesselHost::Get().OnHostThread();
    std::lock_guard<std::mutex> lock(heard.mMutex);
    heard.mData.push_back(event->data ? event->data : "(null)");
    heard.mAllOnHostThread = heard.mAllOnHostThread && onHost;
}

TEST(TesselHost, ListenersHearCopiesOnTheHostsThreadUntilRemoved)
{
    Heard heard;
    ASSERT_EQ(TesselAddEventListener("test.event", &Listen, &heard), kTesselOK);
    {
        std::string data = "first";
        const ruvex::event::Event event{"test.event", 1, nullptr, nullptr, data.c_str()};
        ASSERT_EQ(TesselDispatchEvent(&event), kTesselOK);
        data.assign("overwritten at once");  // the record had to last for the call only
    }
    const ruvex::event::Event other{"other.event", 1, nullptr, nullptr, "not for us"};
    TesselDispatchEvent(&other);
    ASSERT_TRUE(tessel::FlushHost(10000));
    ASSERT_EQ(TesselRemoveEventListener("test.event", &Listen, &heard), kTesselOK);
    const ruvex::event::Event late{"test.event", 1, nullptr, nullptr, nullptr};
    TesselDispatchEvent(&late);
    ASSERT_TRUE(tessel::FlushHost(10000));

    std::lock_guard<std::mutex> lock(heard.mMutex);
    EXPECT_EQ(heard.mData, std::vector<std::string>{"first"});
    EXPECT_TRUE(heard.mAllOnHostThread);
}

TEST(TesselHost, AnExtensionIsReadyAfterLoadingAndTheHostSaysWhenItHasGone)
{
    Heard ready, unloaded;
    TesselAddEventListener("test.ready", &Listen, &ready);
    TesselAddEventListener(ruvex::event::EVENT_TYPE_RUVEX_EXTENSION_UNLOADED, &Listen, &unloaded);
    tessel::ExtensionScript script;
    script.mReadyEventType = "test.ready";
    script.mUnloadDelay = std::chrono::milliseconds(50);  // ending takes a while
    const auto extension = tessel::ScriptedExtension::Register("com.example.page", script);

    ASSERT_EQ(TesselLoadExtension("com.example.page"), kTesselOK);
    ASSERT_EQ(TesselUnloadExtension("com.example.page"), kTesselOK);
    ASSERT_TRUE(extension->WaitForUnloadedEvents(1, 10000));
    EXPECT_EQ(extension->Loads(), 1);

    TesselRemoveEventListener("test.ready", &Listen, &ready);
    TesselRemoveEventListener(ruvex::event::EVENT_TYPE_RUVEX_EXTENSION_UNLOADED, &Listen, &unloaded);
    tessel::UnregisterExtension("com.example.page");
    EXPECT_EQ(ready.mData, std::vector<std::string>{"(null)"});
    EXPECT_EQ(unloaded.mData,
              std::vector<std::string>{"<ExtensionUnloaded><Id>com.example.page</Id></ExtensionUnloaded>"});
}

}  // namespace
