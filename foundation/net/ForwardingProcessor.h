#pragma once
// A processor that hands every operation, unchanged, to another one. Derive
// from it to change a few operations and keep the rest.

#include "foundation/net/RequestProcessor.h"

namespace tolmonet {
namespace http {

class ForwardingProcessor : public RequestProcessor {
public:
    explicit ForwardingProcessor(const boost::shared_ptr<RequestProcessor>& target);
    ~ForwardingProcessor() override;

    void TryToCancelRequest(const Guid& requestUID) override;
    bool GET(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
             const HeaderList& headers, const Configuration& configuration) override;
    bool HEAD(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
              const HeaderList& headers, const Configuration& configuration) override;
    bool PUT(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url, const Body& body,
             const HeaderList& headers, const Configuration& configuration) override;
    bool PUTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                 const FormList& form, const HeaderList& headers, const Configuration& configuration) override;
    bool POST(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url, const Body& body,
              const HeaderList& headers, const Configuration& configuration) override;
    bool POSTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                  const FormList& form, const HeaderList& headers, const Configuration& configuration) override;
    bool PATCH(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
               const Body& body, const HeaderList& headers, const Configuration& configuration) override;
    bool DEL(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
             const HeaderList& headers, const Configuration& configuration) override;
    void CallAsynchronously(const boost::function<void()>& function, const int& delayMilliseconds) const override;
    bool CurrentThreadIsCompletionThread() const override;
    // Shutdown stays the base class's: the target is not ours to stop.
    Guid GetProcessUniqueID() const override;

protected:
    const boost::shared_ptr<RequestProcessor>& Target() const { return mTarget; }

private:
    boost::shared_ptr<RequestProcessor> mTarget;
};

}  // namespace http
}  // namespace tolmonet
