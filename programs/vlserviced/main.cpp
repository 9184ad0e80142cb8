#include "programs/base/commit.h"
#include "programs/base/host_port.h"
#include "programs/base/out_of_memory.h"
#include "programs/base/plain_log.h"
#include "programs/base/plain_text.h"
#include "programs/vlserviced/options.h"
#include "programs/vlserviced/service.h"
#include "programs/vlserviced/system_manager.h"
#include "vlservice/platform/log.h"

#include <exception>
#include <iostream>
#include <new>

namespace {

constexpr char const* OUT_OF_MEMORY =
    "vlserviced: there is not enough memory; nothing that was acknowledged is lost, start it again\n";

void serve(VlServiced::Options options) {
    VlServiced::takeHandedOver(options);
    g_LogVerbose = options.verbose;
    Base::PlainLog const plainLog;
    VlServiced::Service service(options);
    std::cout << "listening on " << Base::hostPortText(options.listen, service.port()) << '\n';
    if (!service.fingerprint().empty())
        std::cout << "certificate " << service.fingerprint() << '\n';
    if (!service.metricsPlace().empty())
        std::cout << "metrics on " << service.metricsPlace() << '\n';
    std::cout << std::flush;
    service.run();
}

int run(int argc, char** argv) {
    auto const parsed = VlServiced::parseOptions(argc, argv, std::cout, std::cerr, Base::COMMIT);
    if (int const* const status = std::get_if<int>(&parsed))
        return *status;
    serve(std::get<VlServiced::Options>(parsed));
    return 0;
}

} // namespace

int main(int argc, char** argv) {
    Base::endWhenOutOfMemory(OUT_OF_MEMORY);
    try {
        return run(argc, argv);
    } catch (std::bad_alloc const&) {
        Base::endOutOfMemory();
    } catch (std::exception const& failure) {
        std::cerr << "vlserviced: " << Base::oneLine(failure.what()) << std::endl;
        return 1;
    }
}
