#include "programs/base/version.h"

#include <boost/version.hpp>
#include <jansson.h>
#include <openssl/crypto.h>
#include <unicode/uversion.h>
#include <zlib.h>

#include <algorithm>
#include <cctype>
#include <iterator>

namespace Base {
namespace {

std::string unicodeVersion() {
    UVersionInfo info;
    char text[U_MAX_VERSION_STRING_LENGTH];
    u_getVersion(info);
    u_versionToString(info, text);
    return text;
}

std::string boostVersion() {
    return std::to_string(BOOST_VERSION / 100000) + '.' + std::to_string(BOOST_VERSION / 100 % 1000);
}

bool comesFirst(LibraryVersion const& a, LibraryVersion const& b) {
    return std::ranges::lexicographical_compare(
        a.name, b.name, {}, [](unsigned char c) { return std::tolower(c); },
        [](unsigned char c) { return std::tolower(c); });
}

} // namespace

std::string projectVersion() { return VLSERVICE_VERSION; }

std::vector<LibraryVersion> libraryVersions() {
    return {{"Boost", boostVersion()},
            {"ICU", unicodeVersion()},
            {"jansson", jansson_version_str()},
            {"OpenSSL", OpenSSL_version(OPENSSL_VERSION_STRING)},
            {"zlib", zlibVersion()}};
}

std::string versionText(std::string const& program, std::string const& commit,
                        std::vector<LibraryVersion> libraries) {
    std::ranges::move(libraryVersions(), std::back_inserter(libraries));
    std::ranges::sort(libraries, comesFirst);
    std::string text = program + ' ' + projectVersion();
    if (!commit.empty())
        text += " (commit " + commit + ')';
    for (LibraryVersion const& library : libraries)
        text += (&library == &libraries.front() ? "\nwith " : ", ") + library.name + ' ' + library.version;
    return text;
}

} // namespace Base
