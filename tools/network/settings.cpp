#include "network/settings.h"

#include <sys/stat.h>

#include <cerrno>
#include <charconv>
#include <cstring>
#include <map>
#include <optional>
#include <regex>
#include <sstream>

#include "base/files.h"

namespace kelo::tool {
namespace {

constexpr const char *kFolder = "/etc/kelosyslog/syslog-ng/";
constexpr const char *kInclude = "kelo_listen"; // defined by a configuration that includes the settings

// The values of lines "@define NAME VALUE", and the file that each is from.
struct Definition {
    std::string value;
    std::string file;
};
using Definitions = std::map<std::string, Definition>;

void ReadDefinitions(const std::string &text, const std::string &file, Definitions &definitions) {
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line);
        std::string word;
        std::string name;
        if (!(words >> word >> name >> std::ws) || word != "@define")
            continue;
        std::string value;
        std::getline(words, value);
        const bool isQuoted = value.starts_with('"');
        const size_t end = isQuoted ? value.find('"', 1) : value.find_first_of(" \t#");
        definitions[name] = {value.substr(isQuoted ? 1 : 0, end - (isQuoted && end != std::string::npos)),
                             file};
    }
}

class Values {
public:
    explicit Values(const Definitions &definitions) : definitions_(definitions) {}

    void Read(const char *name, std::string &value) const {
        if (const Definition *definition = Find(name))
            value = definition->value;
    }
    void Read(const char *name, bool &isOn) const {
        const Definition *definition = Find(name);
        if (definition == nullptr)
            return;
        isOn = definition->value == "on";
        if (!isOn && definition->value != "off")
            Refuse(name, *definition, "on or off");
    }
    template <typename Number>
    void ReadNumber(const char *name, Number &number) const {
        const Definition *definition = Find(name);
        if (definition == nullptr)
            return;
        const char *end = definition->value.data() + definition->value.size();
        const auto [stop, error] = std::from_chars(definition->value.data(), end, number);
        if (error != std::errc() || stop != end || number == 0)
            Refuse(name, *definition, "a number above 0 in its range");
    }

private:
    const Definition *Find(const char *name) const {
        const auto found = definitions_.find(name);
        return found == definitions_.end() ? nullptr : &found->second;
    }
    [[noreturn]] static void Refuse(const char *name, const Definition &definition, const char *wanted) {
        throw SettingsError(definition.file + ": " + name + " is \"" + definition.value + "\", not " +
                            wanted);
    }

    const Definitions &definitions_;
};

const char *OnOff(bool isOn) {
    return isOn ? "on" : "off";
}

} // namespace

std::string MainConfigurationPath(const std::string &root) {
    return root + "/etc/syslog-ng/syslog-ng.conf";
}
std::string ConfigurationPath(const std::string &root) {
    return root + kFolder + "kelosyslog.conf";
}
std::string ConfigurationLink(const std::string &root) {
    return root + "/etc/syslog-ng/conf.d/kelosyslog.conf";
}
std::string ListenPath(const std::string &root) {
    return root + kFolder + "listen.conf";
}

bool IsConfigurationUsed(const std::string &root) {
    struct stat status {};
    return stat(ConfigurationLink(root).c_str(), &status) == 0;
}

bool IsIpv6(const std::string &address) {
    return address.find(':') != std::string::npos;
}

namespace {

Definitions ReadBoth(const std::string &root) {
    Definitions definitions;
    const std::string configuration = ConfigurationPath(root);
    const std::optional<std::string> text = ReadWhole(configuration);
    if (!text)
        throw SettingsError(configuration + ": " + std::strerror(errno));
    ReadDefinitions(*text, configuration, definitions);
    if (definitions.contains(kInclude)) {
        const std::optional<std::string> listen = ReadWhole(ListenPath(root));
        if (!listen && errno != ENOENT)
            throw SettingsError(ListenPath(root) + ": " + std::strerror(errno));
        ReadDefinitions(listen.value_or(""), ListenPath(root), definitions);
    }
    return definitions;
}

} // namespace

void RequireInclude(const std::string &root) {
    if (!ReadBoth(root).contains(kInclude))
        throw SettingsError(ConfigurationPath(root) + " does not include " + ListenPath(root) +
                            ": it is of an earlier version; take the shipped one over");
}

NetworkSettings ReadNetworkSettings(const std::string &root) {
    const Definitions definitions = ReadBoth(root);
    const Values values(definitions);
    NetworkSettings settings;
    values.Read("kelo_address", settings.address);
    values.Read("kelo_plain", settings.isPlain);
    values.ReadNumber("kelo_port", settings.port);
    values.ReadNumber("kelo_frame_port", settings.framePort);
    values.Read("kelo_tls", settings.isTls);
    values.ReadNumber("kelo_tls_port", settings.tlsPort);
    values.Read("kelo_internal", settings.internalSource);
    values.Read("kelo_rate_limit", settings.isRateLimited);
    values.ReadNumber("kelo_rate", settings.rate);
    values.ReadNumber("kelo_connections", settings.connections);
    values.Read("kelo_tls_dir", settings.tlsFolder);
    std::string store;
    values.Read("kelo_store", store);
    if (store == "spool")
        values.Read("kelo_spool", settings.spool);
    return settings;
}

std::string FindInternalSource(const std::string &root) {
    static const std::regex comment("#[^\n]*");
    static const std::regex source(R"(\bsource\s+([\w.-]+)\s*\{[^{}]*\binternal\s*\()");
    const std::string text =
        std::regex_replace(ReadWhole(MainConfigurationPath(root)).value_or(""), comment, "");
    std::smatch found;
    return std::regex_search(text, found, source) ? found.str(1) : "";
}

std::string WriteNetworkSettings(const NetworkSettings &settings) {
    std::ostringstream text;
    const auto define = [&text](const char *name, const auto &value) {
        text << "@define " << name << " \"" << value << "\"\n";
    };
    text << "# Written by \"kelosyslog listen\". These definitions replace those in kelosyslog.conf.\n";
    define("kelo_address", settings.address);
    define("kelo_family", IsIpv6(settings.address) ? "6" : "4");
    define("kelo_plain", OnOff(settings.isPlain));
    define("kelo_port", settings.port);
    define("kelo_frame_port", settings.framePort);
    define("kelo_tls", OnOff(settings.isTls));
    define("kelo_tls_port", settings.tlsPort);
    define("kelo_count_refused", OnOff(!settings.internalSource.empty()));
    define("kelo_internal", settings.internalSource);
    define("kelo_rate_limit", OnOff(settings.isRateLimited));
    define("kelo_rate", settings.rate);
    define("kelo_connections", settings.connections);
    return text.str();
}

} // namespace kelo::tool
