#pragma once

#include "stream/b_stream.h"

/// Helpers for classes of workers: filling the table of operations, and seeking.
namespace base {

template <class Member>
struct WorkerCall;

template <class Worker, class Result, class... Args>
struct WorkerCall<Result (Worker::*)(Args...)> {
    template <auto member>
    static Result call(StreamWorker& worker, Args... args) {
        return (static_cast<Worker&>(worker).*member)(args...);
    }
};

template <auto member>
inline constexpr auto workerCall = &WorkerCall<decltype(member)>::template call<member>;

/// Sets every entry of the table for which `Worker` has a member function of that name.
template <class Worker>
void bindOperations(Worker& worker) {
    StreamOperations& table = worker.operations;
    if constexpr (requires { &Worker::map; })
        table.map = workerCall<&Worker::map>;
    if constexpr (requires { &Worker::read; })
        table.read = workerCall<&Worker::read>;
    if constexpr (requires { &Worker::write; })
        table.write = workerCall<&Worker::write>;
    if constexpr (requires { &Worker::setPosition; })
        table.setPosition = workerCall<&Worker::setPosition>;
    if constexpr (requires { &Worker::getPosition; })
        table.getPosition = workerCall<&Worker::getPosition>;
    if constexpr (requires { &Worker::getSize; })
        table.getSize = workerCall<&Worker::getSize>;
    if constexpr (requires { &Worker::setSize; })
        table.setSize = workerCall<&Worker::setSize>;
    if constexpr (requires { &Worker::atEnd; })
        table.atEnd = workerCall<&Worker::atEnd>;
    if constexpr (requires { &Worker::flush; })
        table.flush = workerCall<&Worker::flush>;
    if constexpr (requires { &Worker::close; })
        table.close = workerCall<&Worker::close>;
    if constexpr (requires { &Worker::clone; })
        table.clone = workerCall<&Worker::clone>;
}

/// The three positions that offsets may count from.
struct SeekBases {
    u64 start;
    u64 current;
    u64 end;
};

/// `offset` from the base that `origin` names, kept within 64 bits. Throws `switch_exception`
/// in the name of `function` for any other origin.
u64 seekTarget(i64 offset, StreamOrigin origin, const SeekBases& bases, const char* function);

} // namespace base
