#pragma once
// Two network namespaces that see each other over a pair of virtual interfaces, and nothing else.

#include <unistd.h>

#include <string>

/// A socket belongs to the namespace that its thread was in when it was made; afterwards any thread may use
/// it.
class TwoNetworks {
public:
    /// Makes the namespaces; without the right to do so, whyNot() tells.
    TwoNetworks();
    ~TwoNetworks();
    TwoNetworks(TwoNetworks const&) = delete;
    TwoNetworks& operator=(TwoNetworks const&) = delete;

    std::string const& whyNot() const { return whyNot_; }
    std::string const& client() const { return client_; }
    std::string const& service() const { return service_; }
    /// Where the service is, by family.
    static constexpr char const* SERVICE_IP4 = "10.77.0.2";
    static constexpr char const* SERVICE_IP6 = "fd77::2";

    /// Switches IPv6 off in a namespace.
    void disableIp6(std::string const& network);

    /// While it lives, the thread is in that namespace.
    class Inside {
    public:
        explicit Inside(std::string const& network);
        ~Inside();
        Inside(Inside const&) = delete;
        Inside& operator=(Inside const&) = delete;

    private:
        int before_;
    };

private:
    void make();
    void run(std::string const& command);
    /// An interface that was brought up is not ready at once.
    void awaitMulticast(std::string const& network);

    std::string client_ = "vlc" + std::to_string(::getpid());
    std::string service_ = "vls" + std::to_string(::getpid());
    std::string whyNot_;
};
