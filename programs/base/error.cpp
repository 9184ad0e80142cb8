#include "programs/base/error.h"

#include "vlservice/json/json.h"

#include <new>
#include <string_view>
#include <system_error>

namespace Base {
namespace {

/// Where the code begins, " [code]" to the end of the line; the line's size when it has none.
std::size_t codeAt(std::string_view line) {
    std::size_t const at = line.rfind(" [");
    if (!line.ends_with(']') || at == line.npos)
        return line.size();
    return codeNamed(line.substr(at + 2, line.size() - at - 3)) ? at : line.size();
}

Code codeOf(std::error_code const& failure) {
    if (failure == std::errc::no_such_file_or_directory || failure == std::errc::permission_denied ||
        failure == std::errc::is_a_directory || failure == std::errc::not_a_directory)
        return Code::FileUnreadable;
    if (failure == std::errc::no_space_on_device || failure == std::errc::read_only_file_system)
        return Code::FileUnwritable;
    return failure == std::errc::not_enough_memory ? Code::OutOfMemory : Code::SystemFailed;
}

} // namespace

Code codeOf(std::exception const& failure) {
    if (auto const* const error = dynamic_cast<Error const*>(&failure))
        return error->code();
    if (auto const* const system = dynamic_cast<std::system_error const*>(&failure))
        return codeOf(system->code());
    if (dynamic_cast<std::bad_alloc const*>(&failure))
        return Code::OutOfMemory;
    return dynamic_cast<json::Exc const*>(&failure) ? Code::JsonMalformed : Code::Unexpected;
}

std::string codedLine(std::string const& line, Code code) {
    return codeAt(line) < line.size() ? line : line + " [" + nameOf(code) + ']';
}

std::string codedLine(std::exception const& failure) { return codedLine(failure.what(), codeOf(failure)); }

Error errorSaid(std::string const& line, Code otherwise) {
    std::size_t const at = codeAt(line);
    if (at == line.size())
        return {otherwise, line};
    return {*codeNamed(std::string_view(line).substr(at + 2, line.size() - at - 3)), line.substr(0, at)};
}

} // namespace Base
