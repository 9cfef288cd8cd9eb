#pragma once

#include <string>

namespace kelo::tool {

// Whether syslog-ng receives for the log server: it does as long as its folder of configurations has the link
// to ours. All else that it does goes on.
class Reception {
public:
    explicit Reception(const std::string &root);

    // Whether Stop has stopped it.
    bool IsStopped() const;

    // Renames the link and reloads syslog-ng. Returns whether it had to. Throws OutputError, which names the
    // link or syslog-ng; then the link is as before.
    bool Stop() const;
    bool Resume() const;

private:
    static void Rename(const std::string &from, const std::string &to);

    std::string link_;
    std::string stopped_;
};

} // namespace kelo::tool
