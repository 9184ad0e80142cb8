// A request or a response from the other side: the first byte is the command's number, the second the
// direction, the rest the JSON text. What could be read is written and read again, and must come out the
// same.

#include "tests/ipc/json_steps.h"

#include "vlservice/ipc/make_empty_cmd.h"

#include <cstdint>
#include <cstdlib>

namespace {

using Read = void (Ipc::JsonCmdBase::*)(json::Object const&);
using Write = json::Object (Ipc::JsonCmdBase::*)() const;

void readWriteRead(unsigned char id, Read read, Write write, json::Object const& received) {
    auto const first = Ipc::makeEmptyCmd(id, nullptr);
    auto const second = Ipc::makeEmptyCmd(id, nullptr);
    if (!first)
        return;
    (*first.*read)(received);
    std::string const written = text((*first.*write)());
    (*second.*read)(parse(written));
    if (text((*second.*write)()) != written)
        std::abort();
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    if (size < 2)
        return 0;
    bool const isRequest = data[1] % 2 == 0;
    try {
        json::Object const received = parse({reinterpret_cast<char const*>(data) + 2, size - 2});
        if (isRequest)
            readWriteRead(data[0], &Ipc::JsonCmdBase::deserializeReq, &Ipc::JsonCmdBase::serializeReq,
                          received);
        else
            readWriteRead(data[0], &Ipc::JsonCmdBase::deserializeResp, &Ipc::JsonCmdBase::serializeResp,
                          received);
    } catch (json::Exc const&) {
        // The one failure that reading may have.
    }
    return 0;
}
