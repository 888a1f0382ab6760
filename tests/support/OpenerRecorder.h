#pragma once
// Records the URLs that would have been opened in the browser, on whichever
// thread, while it lives.

#include <string>

#include "foundation/core/Opener.h"
#include "foundation/core/Strings.h"
#include "support/CallRecorder.h"

namespace testsupport {

class OpenerRecorder {
public:
    OpenerRecorder()
        : mPrevious(tolmocore::utility::SetOpener([opened = mOpened](const UTF16String& url) {
              opened.Add(tolmocore::utility::ToNarrow(url));
              return true;
          }))
    {
    }
    ~OpenerRecorder() { tolmocore::utility::SetOpener(mPrevious); }
    OpenerRecorder(const OpenerRecorder&) = delete;
    OpenerRecorder& operator=(const OpenerRecorder&) = delete;

    std::vector<std::string> Opened() const { return mOpened.All(); }

private:
    CallRecorder<std::string> mOpened;
    tolmocore::utility::Opener mPrevious;
};

}  // namespace testsupport
