#include "b_attribute_json.h"

#include "b_json_pull.h"
#include "b_log.h"
#include "b_number_type.h"
#include "stream/b_stream.h"

#include <cfloat>
#include <cmath>
#include <utility>

namespace base {

namespace {

using Event = GenericPullReader::Event;
using Kind = GenericPullReader::Kind;

constexpr std::size_t readStep = 64 * 1024;

/// The rest of a stream that lies in memory, where it lies; false if it does not.
bool mapRest(Stream& stream, string_view& text) {
    u64 start = 0, size = 0;
    const char* content = nullptr;
    try {
        content = static_cast<const char*>(stream.map(start, size));
    } catch (const unsupported_interface&) {
        return false;
    }
    const u64 position = std::min(stream.position(), size);
    text = content ? string_view(content + position, size - position) : string_view();
    stream.setPosition(0, StreamOrigin::end);
    return true;
}

/// Reads the rest of a stream, at most one step beyond the longest text.
void readRest(Stream stream, GrowingBlock<char>& text) {
    // The text ends where the stream does.
    stream.setFlags(stream.flags() & ~u32{streamThrowOnShortRead});
    while (text.size() <= GenericPullReader::maxTextLength) {
        const u64 count = stream.read(text.room(readStep), readStep);
        text.take(count);
        if (count == 0)
            break;
    }
}

string_view withoutByteOrderMark(string_view text) {
    constexpr string_view mark = "\xEF\xBB\xBF";
    return text.starts_with(mark) ? text.substr(mark.size()) : text;
}

bool isFloatRange(double value) {
    return std::isnan(value) || std::fabs(value) <= double{FLT_MAX};
}

template <class T>
bool takeNumber(const Event& event, T& value) {
    if constexpr (std::is_integral_v<T>) {
        if (event.kind != Kind::integer || !std::in_range<T>(event.integer))
            return false;
        value = static_cast<T>(event.integer);
        return true;
    } else {
        double real = 0;
        if (event.kind == Kind::real || event.kind == Kind::hugeReal)
            real = event.real;
        else if (event.kind == Kind::integer)
            real = static_cast<double>(event.integer);
        else if (event.kind == Kind::natural)
            real = static_cast<double>(event.natural);
        else
            return false;
        if (std::is_same_v<T, float> && !isFloatRange(real))
            return false;
        value = static_cast<T>(real);
        return true;
    }
}

template <class T>
bool takeNumbers(GenericPullReader& events, void* values, std::size_t count) {
    T* value = static_cast<T*>(values);
    const Event* event = events.events();
    // An end stops the walk ahead of the end of the events.
    std::size_t i = 0;
    while (i < count && takeNumber(event[i], value[i]))
        ++i;
    events.setPlace(events.place() + static_cast<u32>(i));
    return i == count;
}

DataKind kindOf(const Event& event) {
    switch (event.kind) {
    case Kind::end:
        return DataKind::end;
    case Kind::name:
        return DataKind::name;
    case Kind::null:
        return DataKind::null;
    case Kind::boolean:
        return DataKind::boolean;
    case Kind::integer:
    case Kind::natural:
    case Kind::hugeReal:
        return DataKind::integer;
    case Kind::real:
        return DataKind::real;
    case Kind::text:
        return DataKind::text;
    case Kind::beginArray:
        return DataKind::array;
    case Kind::beginObject:
        return DataKind::object;
    }
    return DataKind::end;
}

} // namespace

DataReader::~DataReader() = default;

struct JSONAttrReader::Content {
    Stream stream; ///< keeps mapped text alive
    GrowingBlock<char> text;
    GenericPullReader events;
};

JSONAttrReader::JSONAttrReader() = default;
JSONAttrReader::~JSONAttrReader() = default;

bool JSONAttrReader::open(Stream& stream) {
    content_ = std::make_unique<Content>();
    content_->stream = stream;
    source_ = stream.name();
    string_view text;
    if (!mapRest(stream, text)) {
        readRest(stream, content_->text);
        text = {content_->text.data(), content_->text.size()};
    }
    text = withoutByteOrderMark(text);
    if (text.size() > GenericPullReader::maxTextLength) {
        log().log(logSystem, logError, "json parser {}| The text is longer than 1 GiB!", source_);
        return false;
    }
    const GenericPullReader::Fault fault = content_->events.parse(text);
    if (!fault.text)
        return true;
    log().log(logSystem, logError, "json parser {}({})| {}", source_,
              content_->events.lineOf(fault.offset), fault.text);
    return false;
}

DataKind JSONAttrReader::kind() const {
    return kindOf(content_->events.event());
}

void JSONAttrReader::skip() {
    content_->events.skip();
}

void JSONAttrReader::enter() {
    content_->events.next();
}

void JSONAttrReader::leave() {
    content_->events.setPlace(place() + 1);
}

bool JSONAttrReader::nextMember(DataMember& member) {
    GenericPullReader& events = content_->events;
    if (events.event().kind != Kind::name)
        return false;
    member.name = events.textOf(events.event());
    events.next();
    member.kind = kindOf(events.event());
    member.text = member.kind == DataKind::text ? events.textOf(events.event()) : string_view();
    member.place = events.place();
    events.skip();
    return true;
}

u32 JSONAttrReader::length() const {
    return content_->events.event().block.length;
}

string_view JSONAttrReader::text() const {
    return content_->events.textOf(content_->events.event());
}

bool JSONAttrReader::boolean() const {
    return content_->events.event().boolean;
}

u32 JSONAttrReader::place() const {
    return content_->events.place();
}

void JSONAttrReader::setPlace(u32 place) {
    content_->events.setPlace(place);
}

u32 JSONAttrReader::line() const {
    return content_->events.lineOf(content_->events.event().offset);
}

bool JSONAttrReader::readNumbers(NumberType type, void* values, std::size_t count) {
    return withNumberType(type, [&](auto* typed) {
        return takeNumbers<std::remove_pointer_t<decltype(typed)>>(content_->events, values, count);
    });
}

} // namespace base
