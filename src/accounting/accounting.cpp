#include "kelosyslog/accounting.h"

#include <syslog.h>

#include <ctime>
#include <exception>
#include <utility>

#include "accounting/device_table.h"
#include "common/root.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logger.h"
#include "kelosyslog/utils.h"

namespace {

constexpr int32_t kFlushBeatSec = 5;

} // namespace

AccountingManager::AccountingManager()
    : AccountingManager(kelo::RootedPath("/var/log/kelolog/.KELOACCOUNTDB")) {}

AccountingManager::AccountingManager(std::string dbPath)
    : dbPath_(std::move(dbPath)), devices_(std::make_unique<kelo::DeviceTable>()) {
    for (const auto &[device, count] : SyslogDBHistGet(dbPath_, 0))
        devices_->Find(device).total = count;
}

AccountingManager::~AccountingManager() {
    try {
        AccoutingFlush2DB();
    } catch (const std::exception &error) {
        syslog(LOG_ERR, "cannot flush the accounting at its end: %s", error.what());
    }
}

int AccountingManager::ConfigLoad() {
    dbPath_ = kelo::RootedPath("/var/log/kelolog/.KELOACCOUNTDB");
    return 0;
}

int AccountingManager::LogInc(std::string device) {
    CurEpsUpdate();
    kelo::DeviceCounts &counts = devices_->Find(device);
    if (counts.inOpenSample == 0)
        openSample_.push_back(&devices_->DeviceOf(counts));
    // Nothing throws from here on: a record is in all figures or, without memory, in none.
    ++counts.inOpenSample;
    ++counts.total;
    ++currentCount_;
    ++totalCount_;
    return 0;
}

int AccountingManager::CurEpsUpdate() {
    const int64_t now = std::time(nullptr);
    if (now == currentSecond_ || currentCount_ == 0)
        return 0;
    Sample sample{now, {}};
    sample.devices.reserve(openSample_.size());
    samples_.push_back(std::move(sample));
    // From here on nothing throws until the sample is closed, so that none is closed twice.
    currentSecond_ = now;
    for (kelo::Device *device : openSample_)
        samples_.back().devices.emplace_back(device,
                                             std::exchange(devices_->CountsOf(*device).inOpenSample, 0));
    openSample_.clear();
    const auto eps = static_cast<uint64_t>(std::exchange(currentCount_, 0));
    if (epsHandler_)
        epsHandler_(eps);
    else if (notifications_.CheckEps(eps))
        NotifyEps(eps);
    return 0;
}

void AccountingManager::EpsHandlerSet(std::function<void(uint64_t eps)> handler) {
    epsHandler_ = std::move(handler);
}

void AccountingManager::FlushStatementsSet(std::function<std::vector<std::string>()> statements) {
    flushStatements_ = std::move(statements);
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

size_t AccountingManager::SamplesDrop(size_t samples, size_t counts) {
    size_t left = 0;
    for (const Sample &sample : samples_)
        left += sample.devices.size();
    const size_t before = samples_.size();
    while (samples_.size() > samples || left > counts) {
        left -= samples_.front().devices.size();
        samples_.pop_front();
    }
    return before - samples_.size();
}

void AccountingManager::AccountingDump() {
    if (Debuger::ThresholdGet() < 2)
        return;
    Debuger::MSG(2, "======Accounting Status dump======");
    Debuger::MSG(2, "Total: " + ullNumberToString(static_cast<uint64_t>(totalCount_)));
    Debuger::MSG(2, "EPS: " + ullNumberToString(static_cast<uint64_t>(currentCount_)));
    for (size_t i = 0; i < devices_->Size(); ++i) {
        const kelo::Device &device = (*devices_)[i];
        Debuger::MSG(2, "Device: " + device.name +
                            ", count: " + ullNumberToString(devices_->CountsOf(device).total));
    }
    Debuger::MSG(2, "==================================");
}

int64_t AccountingManager::TotalCountGet() const {
    return totalCount_;
}

int64_t AccountingManager::CurrentEpsGet() const {
    return currentCount_;
}

std::list<KELOLOG_LOG_DEVICE_STATISTIC> AccountingManager::HistogramGet() const {
    std::list<KELOLOG_LOG_DEVICE_STATISTIC> histogram;
    for (size_t i = 0; i < devices_->Size(); ++i)
        histogram.push_back({(*devices_)[i].name, devices_->CountsOf((*devices_)[i]).total});
    return histogram;
}
