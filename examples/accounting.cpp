// Counts received records by device and second, and writes the counts regularly.

#include <kelosyslog/accounting.h>
#include <kelosyslog/debuger.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <ctime>
#include <iostream>

// A clock set by hand, so that this program prints the same whenever it runs. Yours needs none.
static time_t now = 1577931072;
extern "C" time_t time(time_t *result) noexcept {
    return result != nullptr ? *result = now : now;
}

void Print(const AccountingManager &accounting) {
    std::cout << "total " << accounting.TotalCountGet() << ", in the open sample "
              << accounting.CurrentEpsGet() << ":";
    for (const KELOLOG_LOG_DEVICE_STATISTIC &device : accounting.HistogramGet())
        std::cout << " " << device.device << "=" << device.count;
    std::cout << "\n";
}

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string path = std::string(argv[1]) + "/var/log/kelolog/.KELOACCOUNTDB";
    {
        AccountingManager accounting; // loads what an earlier one stored: here nothing
        std::cout << "due at the first question: " << accounting.isNeed2Flush() << "\n";
        for (const char *device : {"nas", "nas", "web1", "nas"}) // one call per received record
            accounting.LogInc(device);
        Print(accounting);
        ++now;
        accounting.LogInc("web1"); // a new second: closes the sample, then counts
        Print(accounting);
        std::cout << "due after 1 second: " << accounting.isNeed2Flush();
        now += 6;
        std::cout << ", after 6 more: " << accounting.isNeed2Flush() << "\n";
        accounting.CurEpsUpdate(); // closes the sample of the second that has passed
        std::cout << "flushed: " << accounting.AccoutingFlush2DB() << "\n";
        accounting.LogInc("tv");  // in a sample that is open at the end: it is not flushed
        Debuger::ThresholdSet(2); // for the dump, which goes to the debug channel
        accounting.AccountingDump();
        Debuger::ThresholdSet(0);
    }
    for (const auto &[stamp, sample] : SyslogDBEpsGet(path, 0, 2000000000)) {
        std::cout << stamp << ":";
        for (const auto &[device, count] : sample.devices)
            std::cout << " " << device << "=" << count;
        std::cout << "\n";
    }
    Print(AccountingManager()); // the histogram continues from the stored one
}
