#include "server/ConnectionQueue.h"

#include <algorithm>

namespace tolmonetsync {
namespace server {

ConnectionQueue::ConnectionQueue(std::size_t workers, std::size_t maxConnections)
    : mPool(std::max<std::size_t>(workers, 1)), mMaxConnections(std::max<std::size_t>(maxConnections, 1))
{
}

void ConnectionQueue::enqueue(std::function<void()> connection)
{
    {
        std::unique_lock<std::mutex> lock(mMutex);
        mSlotFree.wait(lock, [this] { return mOpen < mMaxConnections; });
        ++mOpen;
    }
    mPool.enqueue([this, connection = std::move(connection)] {
        connection();  // serves the socket to its end and closes it
        Closed();
    });
}

void ConnectionQueue::shutdown()
{
    mPool.shutdown();
}

void ConnectionQueue::Closed()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        --mOpen;
    }
    mSlotFree.notify_one();
}

}  // namespace server
}  // namespace tolmonetsync
