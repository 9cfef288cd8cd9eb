#include "kelosyslog/accounting.h"

#include <ctime>

#include "common/root.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logger.h"
#include "kelosyslog/utils.h"

namespace {

constexpr int32_t kFlushBeatSec = 5;

} // namespace

AccountingManager::AccountingManager() {
    ConfigLoad();
    for (const auto &[device, count] : SyslogDBHistGet(dbPath_, 0))
        DeviceOf(device).statistic->count = count;
}

AccountingManager::~AccountingManager() {
    AccoutingFlush2DB();
}

int AccountingManager::ConfigLoad() {
    dbPath_ = kelo::RootedPath("/var/log/kelolog/.KELOACCOUNTDB");
    return 0;
}

AccountingManager::Device &AccountingManager::DeviceOf(const std::string &name) {
    const auto [entry, isNew] = devices_.try_emplace(name, Device{nullptr, 0});
    if (isNew)
        entry->second.statistic = &histogram_.emplace_back(KELOLOG_LOG_DEVICE_STATISTIC{name, 0});
    return entry->second;
}

int AccountingManager::LogInc(std::string device) {
    ++totalCount_;
    CurEpsUpdate();
    Device &counted = DeviceOf(device);
    if (counted.currentCount == 0)
        currentDevices_.push_back(&counted);
    ++counted.currentCount;
    ++currentCount_;
    ++counted.statistic->count;
    return 0;
}

std::map<std::string, int32_t> AccountingManager::CurrentDevices() const {
    std::map<std::string, int32_t> counts;
    for (const Device *device : currentDevices_)
        counts.emplace(device->statistic->device, device->currentCount);
    return counts;
}

int AccountingManager::CurEpsUpdate() {
    const int64_t now = std::time(nullptr);
    if (now == currentSecond_ || currentCount_ == 0)
        return 0;
    currentSecond_ = now;
    samples_.push_back({now, currentCount_, CurrentDevices()});
    const auto eps = static_cast<uint64_t>(currentCount_);
    if (notifications_.CheckEps(eps))
        NotifyEps(eps);
    currentCount_ = 0;
    for (Device *device : currentDevices_)
        device->currentCount = 0;
    currentDevices_.clear();
    return 0;
}

void AccountingManager::NotifyEps(uint64_t eps) {
    if (notifications_.NotificationSendEps(eps) < 0)
        Debuger::MSG(0, "Fail to send syslog notification");
    else
        Debuger::MSG(2, "Send EPS notification");
    Logger().LogAddNotifyEps(eps);
}

bool AccountingManager::isNeed2Flush() {
    const auto now = static_cast<int32_t>(std::time(nullptr));
    // The difference wraps like the 32-bit clock it is taken from.
    const auto elapsed =
        static_cast<int32_t>(static_cast<uint32_t>(now) - static_cast<uint32_t>(lastFlushCheck_));
    lastFlushCheck_ = now;
    return elapsed > kFlushBeatSec;
}

void AccountingManager::AccountingDump() {
    if (Debuger::ThresholdGet() < 2)
        return;
    Debuger::MSG(2, "======Accounting Status dump======");
    Debuger::MSG(2, "Total: " + ullNumberToString(static_cast<uint64_t>(totalCount_)));
    Debuger::MSG(2, "EPS: " + ullNumberToString(static_cast<uint64_t>(currentCount_)));
    for (const KELOLOG_LOG_DEVICE_STATISTIC &entry : histogram_)
        Debuger::MSG(2, "Device: " + entry.device + ", count: " + ullNumberToString(entry.count));
    Debuger::MSG(2, "==================================");
}

int64_t AccountingManager::TotalCountGet() const {
    return totalCount_;
}

int64_t AccountingManager::CurrentEpsGet() const {
    return currentCount_;
}

std::list<KELOLOG_LOG_DEVICE_STATISTIC> AccountingManager::HistogramGet() const {
    return histogram_;
}
