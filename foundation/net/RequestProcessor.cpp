#include "foundation/net/RequestProcessor.h"

#include <mutex>

#include "foundation/net/CurlRequestProcessor.h"

namespace tolmonet {
namespace http {

RequestProcessor::~RequestProcessor() = default;

void RequestProcessor::Shutdown() {}

namespace {

// Held through a pointer that is never deleted: the processor outlives every
// static destructor, on purpose (see CurlRequestProcessor.h).
std::mutex& GlobalMutex()
{
    static std::mutex* mutex = new std::mutex;
    return *mutex;
}

boost::shared_ptr<RequestProcessor>*& GlobalSlot()
{
    static boost::shared_ptr<RequestProcessor>* slot = nullptr;
    return slot;
}

}  // namespace

boost::shared_ptr<RequestProcessor> GetGlobalRequestProcessor()
{
    std::lock_guard<std::mutex> lock(GlobalMutex());
    boost::shared_ptr<RequestProcessor>*& slot = GlobalSlot();
    if (!slot) slot = new boost::shared_ptr<RequestProcessor>(CurlRequestProcessor::CreateProcessWide());
    return *slot;
}

boost::shared_ptr<RequestProcessor> SetGlobalRequestProcessor(const boost::shared_ptr<RequestProcessor>& processor)
{
    boost::shared_ptr<RequestProcessor> previous = GetGlobalRequestProcessor();
    std::lock_guard<std::mutex> lock(GlobalMutex());
    *GlobalSlot() = processor;
    return previous;
}

}  // namespace http
}  // namespace tolmonet

namespace tolmonetsync {

boost::shared_ptr<tolmonet::http::RequestProcessor> GetGlobalSyncProcessor()
{
    return tolmonet::http::GetGlobalRequestProcessor();
}

}  // namespace tolmonetsync
