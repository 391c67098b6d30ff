#include "i_jpeg_profile.h"

#include "b_log.h"

#include <cstring>
#include <span>

namespace iio {

namespace {

constexpr char identifier[] = "ICC_PROFILE"; // Its zero byte belongs to it.
constexpr char inconsistentCount[] =
    "jpeg load |{}| inconsistent ICC profile markers count, ignoring...";
constexpr std::size_t headerBytes = sizeof identifier + 2;

/// The parts by their number, which counts from 1.
struct ProfileParts {
    std::span<const u8> parts[256];
    bool isThere[256] = {};
    u32 count = 0; ///< of parts, as the first marker has it; 0 before that
};

bool isProfile(const jpeg_marker_struct& marker) {
    return marker.marker == jpegProfileMarker && marker.data_length >= headerBytes &&
           std::memcmp(marker.data, identifier, sizeof identifier) == 0;
}

/// Takes a part in. What it answers is wrong with it, null if nothing.
const char* takePart(ProfileParts& profile, const jpeg_marker_struct& marker) {
    const u32 number = marker.data[sizeof identifier];
    const u32 count = marker.data[sizeof identifier + 1];
    if (profile.count == 0)
        profile.count = count;
    if (count != profile.count)
        return inconsistentCount;
    if (number == 0 || number > count)
        return "jpeg load |{}| bogus id in the ICC profile marker, ignoring...";
    if (profile.isThere[number])
        return "jpeg load |{}| duplicated ICC profile marker, ignoring...";
    profile.isThere[number] = true;
    profile.parts[number] = {marker.data + headerBytes, marker.data_length - headerBytes};
    return nullptr;
}

bool isWhole(const ProfileParts& profile) {
    for (u32 number = 1; number <= profile.count; ++number) {
        if (!profile.isThere[number])
            return false;
    }
    return true;
}

} // namespace

vector<u8> joinJpegProfile(jpeg_saved_marker_ptr markers, const string& path) {
    // Each kind of complaint once, for a file may hold thousands of broken markers.
    base::set<const char*> said;
    const auto complain = [&](const char* message) {
        if (said.insert(message).second)
            base::log().log(base::logIO, base::logError, message, path);
    };
    ProfileParts profile;
    bool isThere = false;
    for (jpeg_saved_marker_ptr marker = markers; marker; marker = marker->next) {
        if (!isProfile(*marker))
            continue;
        isThere = true;
        if (const char* fault = takePart(profile, *marker))
            complain(fault);
    }
    vector<u8> bytes;
    if (!isWhole(profile)) {
        complain(inconsistentCount);
        return bytes;
    }
    for (u32 number = 1; number <= profile.count; ++number)
        bytes.append(profile.parts[number].data(),
                     profile.parts[number].data() + profile.parts[number].size());
    if (isThere && bytes.empty())
        complain("jpeg load |{}| empty ICC profile markers, ignoring...");
    return bytes;
}

} // namespace iio
