#include "log_capture.h"
#include "scene.h"

#include <gtest/gtest.h>

namespace {

using namespace scene;
using namespace test_support;

constexpr base::u32 all = 0xffffffffu;

class BufferAdapter : public testing::Test {
protected:
    BufferAdapter() {
        register_scene_schema(factory_);
        buffer_ = factory_.create(buffer_schema::n_kind);
        adapter_ = factory_.create(bufferAdapter_schema::n_kind);
        write(*buffer_, buffer_schema::n_name) = "bytes";
        // 0, 1, ... as little endian 32-bit numbers.
        auto& data = write(*buffer_, buffer_schema::n_data);
        data.resize(48);
        for (base::u8 i = 0; i < 12; ++i)
            data[4u * i] = i;
        write(*adapter_, bufferAdapter_schema::n_inputBuffer) = buffer_;
    }
    const base::vector<base::u32>& output() {
        return *find(*adapter_, bufferAdapter_schema::n_outputUint32);
    }

    base::PluginFactory factory_{"buffers"};
    base::ref<base::IPlugin> buffer_, adapter_;
};

TEST_F(BufferAdapter, RangesOfBytes) {
    const struct {
        base::u32 offset, length;
        base::vector<base::u32> expected;
    } cases[] = {{0, all, {0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11}},
                 {0, 8, {0, 1}},
                 {0, 11, {0, 1}},                    // whole elements alone
                 {8, 16, {2, 3}},                    // the end counts from the start of the data
                 {8, all, {2, 3, 4, 5, 6, 7, 8, 9}}, // 48 - 8 bytes from the start
                 {24, all, {}}, // 24 bytes from the start: ends where it begins
                 {40, all, {}}, // would end before it begins
                 {48, all, {}},
                 {1000, 4, {}},
                 {0, 0, {}}};
    write(*adapter_, bufferAdapter_schema::n_outputUint32);
    for (const auto& c : cases) {
        write(*adapter_, bufferAdapter_schema::n_inputOffset) = c.offset;
        write(*adapter_, bufferAdapter_schema::n_inputLength) = c.length;
        adapter_->afterLoad(1);
        EXPECT_EQ(output(), c.expected) << c.offset << ' ' << c.length;
    }
}

TEST_F(BufferAdapter, EveryOutputThatIsThereViewsTheBytes) {
    write(*adapter_, bufferAdapter_schema::n_outputUint8);
    write(*adapter_, bufferAdapter_schema::n_outputUint16);
    write(*adapter_, bufferAdapter_schema::n_outputFloat2);
    write(*adapter_, bufferAdapter_schema::n_outputFloat3) = {{1, 2, 3}};
    const base::u32 attributes = adapter_->size();
    adapter_->afterLoad(1);
    EXPECT_EQ(adapter_->size(), attributes) << "makes no outputs";

    const auto& data = *find(*buffer_, buffer_schema::n_data);
    const auto expectView = [&](const auto& attribute, std::size_t count) {
        const auto& values = *find(*adapter_, attribute);
        EXPECT_EQ(values.size(), count) << attribute.text;
        EXPECT_TRUE(values.isView()) << attribute.text;
        EXPECT_EQ(static_cast<const void*>(values.data()), data.data()) << attribute.text;
    };
    expectView(bufferAdapter_schema::n_outputUint8, 48);
    expectView(bufferAdapter_schema::n_outputUint16, 24);
    expectView(bufferAdapter_schema::n_outputFloat2, 6);
    expectView(bufferAdapter_schema::n_outputFloat3, 4);
}

TEST_F(BufferAdapter, OddOffsetsGiveTheSameValues) {
    write(*adapter_, bufferAdapter_schema::n_outputUint16);
    write(*adapter_, bufferAdapter_schema::n_inputOffset) = 3;
    write(*adapter_, bufferAdapter_schema::n_inputLength) = 9;
    adapter_->afterLoad(1);
    EXPECT_EQ(*find(*adapter_, bufferAdapter_schema::n_outputUint16),
              (base::vector<base::u16>{0x100, 0, 0x200})); // bytes 0 1 0 0 0 2
}

TEST_F(BufferAdapter, MissingInputsAreLoggedAndLeaveTheOutputs) {
    adapter_->attribute<base::string>(base::nameServer().id("name")) = "adapter";
    write(*adapter_, bufferAdapter_schema::n_outputUint32) = {42};
    const LogCapture log;
    buffer_->removeAttribute(buffer_schema::n_data);
    adapter_->afterLoad(1);
    write(*adapter_, bufferAdapter_schema::n_inputBuffer) = nullptr;
    adapter_->afterLoad(1);
    adapter_->removeAttribute(bufferAdapter_schema::n_inputBuffer);
    adapter_->afterLoad(1);
    EXPECT_EQ(output(), (base::vector<base::u32>{42}));

    EXPECT_EQ(linesOf(log), "3 bufferAdapter |adapter| Missing `data` attribute in bytes!\n"
                            "3 bufferAdapter |adapter| Missing `inputBuffer` attribute!\n"
                            "3 bufferAdapter |adapter| Missing `inputBuffer` attribute!\n");
}

TEST_F(BufferAdapter, ChangesOfOthersRefresh) {
    write(*adapter_, bufferAdapter_schema::n_outputUint32);
    auto& listener = dynamic_cast<base::PluginCallback&>(*adapter_);
    listener.changed(0, base::AttribPath(*adapter_, bufferAdapter_schema::n_inputOffset));
    EXPECT_TRUE(output().empty()) << "its own change";
    listener.changed(0, base::AttribPath(*buffer_, buffer_schema::n_data));
    EXPECT_EQ(output().size(), 12u);
}

TEST_F(BufferAdapter, InputsAreKeyed) {
    const auto keyed = [&](base::name_id name) {
        return adapter_->isPathKeyed(base::AttribPath(*adapter_, name));
    };
    EXPECT_TRUE(keyed(bufferAdapter_schema::n_inputOffset));
    EXPECT_FALSE(keyed(bufferAdapter_schema::n_outputFloat));
}

TEST_F(BufferAdapter, ViewsOutliveTheRemovalOfTheBuffer) {
    write(*adapter_, bufferAdapter_schema::n_outputUint32);
    adapter_->afterLoad(1);
    const base::u32 id = buffer_->id();
    buffer_.reset();
    factory_.remove(id, false);
    EXPECT_EQ(output()[11], 11u);
}

} // namespace
