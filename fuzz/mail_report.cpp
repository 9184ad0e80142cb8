// Reports of servers of e-mail, which anybody can send.
#include "programs/base/error.h"
#include "programs/carriers/mime_message.h"
#include "programs/carriers/smtp_carrier.h"

#include <cstdint>
#include <string_view>

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    try {
        Carriers::MailReport const report =
            Carriers::mailReportIn(std::string_view(reinterpret_cast<char const*>(data), size));
        Carriers::keyOfMessageId(report.messageId);
    } catch (Base::Error const&) {
    }
    return 0;
}
