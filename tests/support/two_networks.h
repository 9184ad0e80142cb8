#pragma once
// Two network namespaces that see each other over a pair of virtual interfaces, and nothing else.

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
    /// The namespaces, as open files that keep them alive.
    int client() const { return client_; }
    int service() const { return service_; }
    /// Where the service is, by family.
    static constexpr char const* SERVICE_IP4 = "10.77.0.2";
    static constexpr char const* SERVICE_IP6 = "fd77::2";

    /// Takes the pair of interfaces away, and makes another one.
    void disconnect();
    void connect();

    /// Switches IPv6 off in a namespace.
    void disableIp6(int network);

    /// While it lives, the thread is in that namespace.
    class Inside {
    public:
        explicit Inside(int network);
        ~Inside();
        Inside(Inside const&) = delete;
        Inside& operator=(Inside const&) = delete;

    private:
        int before_;
    };

private:
    void makeNetwork(int& network);
    /// Runs `ip` with these arguments in a namespace.
    void ip(int network, std::string const& arguments);
    /// Sets what the kernel keeps for each namespace by itself, as below /proc/sys/net.
    void set(int network, std::string const& name, char value);
    /// An interface that was brought up is not ready at once.
    void awaitMulticast(int network);

    int client_ = -1;
    int service_ = -1;
    std::string whyNot_;
};
