#pragma once

#include "b_factory.h"
#include "stream/b_stream_workers.h"

#include <string>

namespace {

inline std::string writtenJson(const base::PluginFactory& factory) {
    base::string text;
    base::Stream stream = base::stringStream(text);
    factory.writeJson(stream);
    return text;
}

inline bool readJsonText(base::PluginFactory& factory, std::string text) {
    base::Stream stream = base::memStreamView(text.data(), text.size(), "a file");
    return factory.readJson(stream);
}

/// A document with one object, whose members are given.
inline std::string documentWith(const std::string& members) {
    return "{\"@version\": 1, \"@objects\": [{\"@type\": \"kind\", \"name\": \"it\"" +
           (members.empty() ? "" : ",\n" + members) + "}]}";
}

inline base::name_id nameOf(const std::string& text) {
    return base::nameServer().id(text);
}

} // namespace
