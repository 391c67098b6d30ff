#include "stream/b_stream_workers.h"

#include "b_exception.h"
#include "log_capture.h"

#include <functional>
#include <gtest/gtest.h>
#include <random>

namespace base {
namespace {

string textOf(const std::function<void()>& call) {
    try {
        call();
    } catch (const exception& error) {
        return string(error.function() ? error.function() : "") + "| " + error.what();
    }
    return "nothing thrown";
}

string readText(Stream& stream, u64 count) {
    string text(count, '?');
    text.resize(stream.read(text.data(), count));
    return text;
}

string wholeText(Stream stream) {
    stream.setPosition(0);
    return readText(stream, stream.size());
}

Stream memStreamOf(string_view text) {
    Stream stream = memStream(0);
    stream.write(text.data(), text.size());
    stream.setPosition(0);
    return stream;
}

/// Takes up to `room` bytes in all, keeps each write apart and may fail on closing.
class CountingWorker final : public StreamWorker {
public:
    struct Record {
        vector<string> writes;
        int flushes = 0;
        int closes = 0;
    };

    CountingWorker(Record& record, u64 room, bool failsToClose = false)
        : StreamWorker("sink", streamWritable | streamSeekable), record_(record), room_(room),
          failsToClose_(failsToClose) {
        operations.write = [](StreamWorker& worker, const void* source, u64 count) -> u64 {
            auto& self = static_cast<CountingWorker&>(worker);
            const u64 taken = std::min(count, self.room_);
            self.room_ -= taken;
            self.record_.writes.push_back(string(static_cast<const char*>(source), taken));
            return taken;
        };
        operations.getPosition = [](StreamWorker&) -> u64 { return 0; };
        operations.flush = [](StreamWorker& worker) {
            ++static_cast<CountingWorker&>(worker).record_.flushes;
        };
        operations.close = [](StreamWorker& worker) {
            ++static_cast<CountingWorker&>(worker).record_.closes;
            if (static_cast<CountingWorker&>(worker).failsToClose_)
                throw exception("full");
        };
    }

private:
    Record& record_;
    u64 room_;
    bool failsToClose_;
};

enum Ability : u32 { reads = 1, writes = 2, extends = 4, resizes = 8, everything = 15 };

struct Subject {
    string name;
    Stream stream;
    u32 abilities;
    string content = {};
};

/// Does random operations on a stream and on a plain string with a position, compares after
/// each and returns the string.
string comparedModel(Subject& subject, u32 seed) {
    Stream& stream = subject.stream;
    string model = subject.content;
    i64 at = 0;
    std::mt19937 random(seed);
    const auto can = [&](Ability ability) { return (subject.abilities & ability) != 0; };
    for (int step = 0; step < 2000 && !testing::Test::HasFailure(); ++step) {
        const auto size = static_cast<i64>(model.size());
        const i64 count = random() % 40;
        const i64 within = std::min(count, size - at);
        const auto operation = random() % 5;
        if (operation == 0 && can(reads)) {
            EXPECT_EQ(readText(stream, static_cast<u64>(count)), model.substr(at, within));
            at += within;
        } else if (operation == 1 && can(writes)) {
            const string bytes(static_cast<u64>(count), static_cast<char>('a' + step % 26));
            const i64 taken = can(extends) ? count : within;
            EXPECT_EQ(stream.write(bytes.data(), bytes.size()), static_cast<u64>(taken));
            model.replace(at, taken, bytes, 0, taken);
            at += taken;
        } else if (operation == 2) {
            const auto origin = static_cast<u32>(random() % 3);
            const i64 offset = static_cast<i64>(random() % 200) - 100;
            const i64 bases[] = {0, at, size};
            at = std::clamp<i64>(bases[origin] + offset, 0, size);
            EXPECT_EQ(stream.setPosition(offset, StreamOrigin{origin}), static_cast<u64>(at));
        } else if (operation == 3 && can(resizes) && step % 7 == 0) {
            model.resize(random() % 300, '\0');
            stream.setSize(model.size());
            at = std::min(at, static_cast<i64>(model.size()));
        } else {
            stream.flush();
        }
        EXPECT_EQ(stream.position(), static_cast<u64>(at)) << subject.name << " step " << step;
        EXPECT_EQ(stream.size(), model.size()) << subject.name << " step " << step;
        EXPECT_EQ(stream.atEnd(), at == static_cast<i64>(model.size()))
            << subject.name << " step " << step;
    }
    return model;
}

TEST(Stream, AllWorkersBehaveAsBytesWithAPosition) {
    vector<u8> bytes;
    string text;
    string a = "0123456789", c = "abcdefghijklm", d = "z";
    MemBlock last{d.data(), d.size(), nullptr}, third{c.data(), c.size(), &last},
        second{nullptr, 0, &third}, first{a.data(), a.size(), &second};
    string line;
    for (int i = 0; i < 30; ++i)
        line += std::to_string(i) + " bottles, ";
    Stream parent = memStreamOf("<<<<<" + line + ">>>>>");
    Stream target = memStreamOf(line);
    Stream source = memStreamOf(line);
    Stream plain = memStreamOf(line);
    Subject subjects[] = {
        {"memory", memStream(0), everything},
        {"vector", vectorStream(bytes), everything},
        {"string", stringStream(text), everything},
        {"view", memStreamView(line.data(), line.size(), "view"), reads, line},
        {"blocks", memBlockStream(&first, "blocks"), reads | writes, a + c + d},
        {"window", subStream(parent, 5, line.size()), reads | writes, line},
        {"read buffer", bufferedStream(source, 16, BufferMode::read), reads, line},
        {"no buffer", bufferedStream(plain, 0, BufferMode::read), reads, line},
        {"write buffer", bufferedStream(target, 16, BufferMode::write), writes | extends, line}};
    for (Subject& subject : subjects) {
        const string model = comparedModel(subject, 1);
        Stream result = (subject.abilities & reads) != 0 ? subject.stream : target;
        subject.stream.flush();
        EXPECT_EQ(wholeText(result.clone()), model) << subject.name;
    }
    const string around = wholeText(parent);
    EXPECT_EQ(around.substr(0, 5) + around.substr(line.size() + 5), "<<<<<>>>>>");
}

TEST(Stream, SeekingKeepsWithin64Bits) {
    constexpr i64 low = std::numeric_limits<i64>::min(), high = std::numeric_limits<i64>::max();
    Stream memory = memStreamOf("0123456789");
    Stream window = subStream(memory, 2, ~u64{0});
    EXPECT_EQ(window.size(), 8u);
    for (Stream* stream : {&memory, &window}) {
        for (const u32 origin : {0u, 1u, 2u}) {
            EXPECT_EQ(stream->setPosition(high, StreamOrigin{origin}), stream->size());
            EXPECT_EQ(stream->setPosition(low, StreamOrigin{origin}), 0u);
        }
        EXPECT_THROW(stream->setPosition(0, StreamOrigin{3}), switch_exception);
    }
}

TEST(Stream, FlagsDecideWhetherShortTransfersThrow) {
    string room = "12";
    MemBlock block{room.data(), room.size(), nullptr};
    Stream stream = memBlockStream(&block, "it");
    char bytes[10] = {};
    EXPECT_EQ(stream.flags(), 4u);
    EXPECT_EQ(stream.write(bytes, 10), 2u);
    EXPECT_EQ(stream.read(bytes, 10), 0u);

    stream.setPosition(0);
    Stream strict = stream;
    strict.setFlags(streamThrowOnShortRead);
    EXPECT_EQ(textOf([&] { strict.read(bytes, 10); }),
              "base::Stream::read| stream 'it': trying to read 10 bytes, read 2 bytes");
    EXPECT_EQ(strict.write(bytes, 1), 0u);
    strict.setFlags(streamThrowOnShortWrite);
    EXPECT_EQ(strict.read(bytes, 1), 0u);
    strict.setPosition(1);
    EXPECT_EQ(textOf([&] { strict.write(bytes, 3); }),
              "base::Stream::write| stream 'it': trying to write 3 bytes, written 1 bytes");
    EXPECT_EQ(Stream(strict).flags(), 2u);
}

TEST(Stream, HandlesOfOneMemoryHavePositionsOfTheirOwn) {
    struct Coder final : StreamCoder {
        StreamCoder* clone() const override { return new Coder; }
    };
    Stream first = memStreamOf("shared");
    first.worker()->coder = std::make_unique<Coder>();
    readText(first, 3);
    Stream second = first.clone();
    EXPECT_NE(second.worker()->coder, nullptr);
    EXPECT_EQ(readText(second, 6), "shared");
    EXPECT_EQ(readText(first, 6), "red");
    first.write("!", 1);
    first.close();
    EXPECT_EQ(wholeText(second), "shared!");
    // A write behind a cut leaves no old bytes in the gap.
    Stream third = second.clone();
    second.setPosition(6);
    third.setSize(2);
    second.write("x", 1);
    EXPECT_EQ(wholeText(third), string("sh\0\0\0\0x", 7));
    // Windows have the position of their parent and stop at their ends.
    Stream window = subStream(third, 1, 2);
    EXPECT_EQ(window.write("abc", 3), 2u);
    third.setPosition(0);
    EXPECT_EQ(window.position(), 0u);
    EXPECT_EQ(readText(window, 9), "ab");
    EXPECT_EQ(textOf([&] { subStream(third, 8, 0); }),
              "base::subStream| empty substream of 'memory'!");
}

TEST(Stream, CopiesAndViewsOfMemory) {
    string foreign = "foreign";
    Stream view = memStreamView(foreign.data(), foreign.size(), "view");
    u64 start = 9, size = 0;
    EXPECT_EQ(view.map(start, size), foreign.data());
    EXPECT_EQ(size - start, foreign.size());
    Stream copy = memStream(view);
    copy.write("F", 1);
    EXPECT_EQ(wholeText(copy), "Foreign");
    EXPECT_EQ(foreign, "foreign");
    MemBlock block{foreign.data(), foreign.size(), nullptr};
    EXPECT_EQ(textOf([&] { memBlockStream(&block, "blocks").setSize(2); }),
              "base::memBlockSetSize| memBlockStream do not support resizing!");
}

TEST(Stream, WriteBufferSendsWholeBuffers) {
    CountingWorker::Record record;
    Stream sink(new CountingWorker(record, 9));
    sink.setFlags(streamThrowOnShortWrite);
    Stream buffer = bufferedStream(sink, 4, BufferMode::write);
    sink.close();
    buffer.write("ab", 2);
    EXPECT_TRUE(record.writes.empty());
    buffer.write("cd", 2);
    buffer.write("e", 1);
    EXPECT_EQ(record.writes, (vector<string>{"abcd"}));
    EXPECT_EQ(record.flushes, 1);
    buffer.flush();
    buffer.write("f", 1);
    buffer.write("gh", 2);
    buffer.write("ijk", 3); // one byte of it finds room in the sink
    EXPECT_EQ(textOf([&] { buffer.flush(); }),
              "base::Stream::write| stream 'sink': trying to write 3 bytes, written 1 bytes");
    buffer.close();
    EXPECT_EQ(record.writes, (vector<string>{"abcd", "e", "fgh", "i"}))
        << "lost bytes were written again on closing";
    EXPECT_EQ(record.closes, 1);

    // Without the check the buffer fills up, and the counts tell.
    Stream lax(new CountingWorker(record, 3));
    buffer = bufferedStream(lax, 4, BufferMode::write);
    EXPECT_EQ(buffer.write("abcdef", 6), 3u);
    EXPECT_EQ(buffer.write("gh", 2), 2u);
    EXPECT_EQ(buffer.write("ijk", 3), 2u);
    EXPECT_EQ(buffer.write("l", 1), 0u);
}

TEST(Stream, CopiesFromThePositionToTheEnd) {
    const string large(600'000, 'x');
    Stream source = memStreamOf("ab" + large + "z");
    Stream target = memStream(0);
    source.setPosition(2);
    EXPECT_EQ(&(source >> target), &source);
    EXPECT_EQ(wholeText(target), large + "z");
    source.setPosition(0);
    EXPECT_EQ(&(target << source), &target);
    EXPECT_EQ(target.size(), 2 * large.size() + 4);

    string room = "123";
    MemBlock block{room.data(), room.size(), nullptr};
    Stream small = memBlockStream(&block, "small");
    Stream four = memStreamOf("wxyz");
    EXPECT_EQ(textOf([&] { four >> small; }),
              "Stream::read->write| trying to write 4 bytes, written 3 bytes");
    four.setPosition(0);
    EXPECT_EQ(textOf([&] { small << four; }),
              "Stream::write->read| trying to write 4 bytes, written 0 bytes");
    Stream view = memStreamView("a", 1, "view");
    EXPECT_THROW(four >> view, unsupported_interface);
    Stream reader = bufferedStream(four, 8, BufferMode::read);
    EXPECT_THROW(reader.write("a", 1), unsupported_interface);
}

TEST(Stream, TheLastHandleCloses) {
    CountingWorker::Record record;
    {
        Stream first(new CountingWorker(record, 1));
        Stream second = first;
        Stream third = std::move(first);
        second = third;
        third.close();
        third.close();
        EXPECT_EQ(record.closes, 0);
    }
    EXPECT_EQ(record.closes, 1);

    test_support::LogCapture log;
    Stream(new CountingWorker(record, 1, true)).close();
    ASSERT_FALSE(log.entries().empty());
    EXPECT_EQ(log.take()[0],
              (test_support::LogCapture::Entry{logSystem, logError,
                                               "Unhandled exception while closing 'sink'!"}));
    EXPECT_EQ(record.closes, 2);
}

} // namespace
} // namespace base
