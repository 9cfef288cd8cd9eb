// A forwarder: appends the records of one database to another one, each exactly once, whenever the program
// is killed. It ends when there is nothing more to forward: run it as often as you like, by one process at a
// time.
//
// usage: forwarder SOURCE TARGET      (absolute paths; TARGET is created where it is missing)

#include "forward.h"

#include <iostream>

int main(int argc, char **argv) {
    if (argc != 3)
        return 2;
    try {
        SyslogDBReader reader(argv[1]);
        SyslogDBWriter writer(argv[2]);
        const std::string last = Forward(reader, {}, writer);
        std::cout << "forwarded up to " << last << "\n";
        return 0;
    } catch (const Failure &failure) {
        std::cerr << "forwarder: " << failure.what() << "\n";
        return StatusOf(failure);
    } catch (const std::runtime_error &error) {
        std::cerr << "forwarder: " << error.what() << "\n";
        return 1;
    }
}
