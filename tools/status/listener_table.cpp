#include "status/listener_table.h"

namespace kelo::tool {
namespace {

std::string FormOf(const Listener &listener) {
    if (!listener.isConfigured)
        return "another source";
    return std::string(listener.form) + (listener.isTls ? ", TLS" : ", no encryption");
}

const char *StateOf(const Listener &listener) {
    if (!listener.isKnown)
        return "-";
    return listener.isOpen ? "open" : "not open";
}

} // namespace

StatisticsTable TableOfListeners(const std::vector<Listener> &listeners) {
    StatisticsTable table({{"protocol", false},
                           {"address", false},
                           {"port", true},
                           {"families", false},
                           {"form", false},
                           {"state", false},
                           {"connections", true},
                           {"dropped", true}});
    for (const Listener &listener : listeners)
        table.Add({listener.isTcp ? "tcp" : "udp", listener.address, std::to_string(listener.port),
                   listener.Families(), FormOf(listener), StateOf(listener),
                   std::to_string(listener.connections), std::to_string(listener.drops)});
    return table;
}

} // namespace kelo::tool
