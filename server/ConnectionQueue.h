#pragma once
// The task queue of the HTTP server, with a cap on open connections.
//
// cpp-httplib's accept loop hands every accepted connection to its task
// queue at once and accepts the next; its own pool queues without bound, so
// a greedy client could hold any number of sockets open. Here the hand-over
// blocks while `maxConnections` connections are open (being served or
// waiting for one of the `workers` threads): the accept loop stops
// accepting, and further connections wait in the kernel's listen queue
// until one closes. No connection is refused for being over the cap; one
// may wait long, as long as the read and write time-outs let an open one
// last. The time-outs bound each pause of a client, not a whole request: a
// client that trickles a byte now and then keeps its connection, and its
// slot, until it is done. A stop waits for open connections as long.
//
// Threads: Enqueue from the accept loop; the workers run the connections.

#include <condition_variable>
#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>

#include <httplib.h>

namespace tolmonetsync {
namespace server {

class ConnectionQueue : public httplib::TaskQueue {
public:
    ConnectionQueue(std::size_t workers, std::size_t maxConnections);

    void enqueue(std::function<void()> connection) override;
    void shutdown() override;

private:
    void Closed();

    httplib::ThreadPool mPool;
    std::size_t mMaxConnections;
    std::mutex mMutex;  // guards mOpen
    std::condition_variable mSlotFree;
    std::size_t mOpen = 0;
};

}  // namespace server
}  // namespace tolmonetsync
