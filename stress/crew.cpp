#include "crew.h"

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

namespace kelo::stress {
namespace {

namespace fs = std::filesystem;

// The library waits up to 30 seconds for a lock and 5 for a writer; a program does several such things.
constexpr int64_t kPatienceMs = 120'000;

struct RoleEntry {
    Role role;
    Database database;
    bool mustEndWhole; // with the program that it has started
};
constexpr RoleEntry kRoles[] = {{AddEvents, kEvents, false},
                                {AddEvents, kEvents, false},
                                {AddEvents, kEvents, false},
                                {CountRecords, kAccounts, false},
                                {WriteLikeSyslogNg, kLogs, false},
                                {Receive, kLogs, false},
                                {ParseTexts, kLogs, false},
                                {Search, kLogs, false},
                                {Keep, kLogs, false},
                                {Archive, kLogs, true}};
static_assert(std::size(kRoles) < Board::kPlaces);

struct Process {
    pid_t id;
    pid_t parent;
    char state;
};

// All of this session but this process.
std::vector<Process> SessionProcesses() {
    std::vector<Process> processes;
    for (const auto &entry : fs::directory_iterator("/proc")) {
        const pid_t id = std::atoi(entry.path().filename().c_str());
        if (id <= 0 || id == getpid())
            continue;
        std::string line;
        std::getline(std::ifstream(entry.path() / "stat"), line);
        std::istringstream fields(line.substr(std::min(line.rfind(')') + 1, line.size())));
        Process process{id, 0, 0};
        pid_t group = 0;
        pid_t session = 0;
        if (fields >> process.state >> process.parent >> group >> session && session == getsid(0))
            processes.push_back(process);
    }
    return processes;
}

void Nap() {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

} // namespace

Crew::Crew(const Site &site, Board &board, uint64_t seed)
    : site_(site), board_(board), seed_(seed), random_(seed),
      own_(site, board, Board::kPlaces - 1, nextId_++, seed, kLogs) {
    prctl(PR_SET_CHILD_SUBREAPER, 1);
    for (size_t role = 0; role < std::size(kRoles); ++role) {
        members_.push_back({role});
        Start(members_.back(), role);
    }
}

void Crew::Start(Member &member, size_t place) {
    const uint32_t id = nextId_++;
    member.isKilled = false;
    member.process = fork();
    if (member.process != 0)
        return;
    setpgid(0, 0);
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    int status = 0;
    try {
        const RoleEntry &entry = kRoles[member.role];
        Worker worker(site_, board_, place, id, seed_, entry.database);
        try {
            entry.role(worker);
        } catch (const std::exception &error) {
            worker.Complain(std::string("ended: ") + error.what());
            status = 1;
        }
    } catch (const std::exception &) {
        status = 1;
    }
    _exit(status);
}

void Crew::Reap() {
    int status = 0;
    for (pid_t process; (process = waitpid(-1, &status, WNOHANG)) > 0;) {
        const auto member = std::find_if(members_.begin(), members_.end(),
                                         [&](const Member &each) { return each.process == process; });
        if (member == members_.end())
            continue;
        const bool isExpected = member->isKilled || (board_.isOver && status == 0);
        if (!isExpected)
            own_.Complain("process " + std::to_string(process) + " ended with wait status " +
                          std::to_string(status));
        member->process = -1;
    }
}

void Crew::RequireProgress(const Member &member, size_t place) {
    Board::Place &at = board_.places[place];
    const int64_t since = at.since;
    if (member.process < 0 || since == 0 || NowMs() - since < kPatienceMs)
        return;
    std::string where;
    std::getline(std::ifstream("/proc/" + std::to_string(member.process) + "/wchan"), where);
    own_.Complain("process " + std::to_string(member.process) + " hangs in \"" + NameOf(at.kind) +
                  "\" with its token " + std::to_string(at.number) + " (" + where + ")");
    at.since = 0; // once
}

void Crew::Look() {
    Reap();
    for (size_t place = 0; place < members_.size(); ++place) {
        RequireProgress(members_[place], place);
        if (members_[place].process < 0 && !board_.isOver)
            Start(members_[place], place);
    }
}

void Crew::KillSomebody() {
    Member &victim = members_[random_() % members_.size()];
    if (victim.process < 0)
        return;
    ++kills_;
    const size_t way = random_() % 3;
    if (way == 0) {
        for (const Process &process : SessionProcesses()) {
            if (process.parent == victim.process) {
                kill(process.id, SIGKILL);
                return;
            }
        }
    }
    victim.isKilled = true;
    const bool isWhole = way == 1 || kRoles[victim.role].mustEndWhole;
    kill(isWhole ? -victim.process : victim.process, SIGKILL);
}

void Crew::Freeze() {
    // One that waits for a child to become another program cannot stop before the child goes on. It is as
    // good as stopped if it does not change.
    constexpr int kTriesForSleepers = 200;
    const std::string stopped = "TtZX";
    bool isMoving = true;
    for (int tries = 0; isMoving; ++tries) {
        isMoving = false;
        for (const Process &process : SessionProcesses()) {
            if (stopped.find(process.state) != std::string::npos)
                continue;
            kill(process.id, SIGSTOP);
            isMoving = isMoving || process.state != 'D' || tries < kTriesForSleepers;
        }
        if (isMoving)
            Nap();
    }
}

void Crew::Thaw() {
    for (const Process &process : SessionProcesses())
        kill(process.id, SIGCONT);
}

std::set<std::string> Crew::OpenFiles() {
    std::set<std::string> files;
    std::error_code ignored;
    for (const Process &process : SessionProcesses()) {
        for (const auto &file :
             fs::directory_iterator("/proc/" + std::to_string(process.id) + "/fd", ignored))
            files.insert(fs::read_symlink(file.path(), ignored).string());
    }
    return files;
}

void Crew::End() {
    const int64_t begin = NowMs();
    while (!SessionProcesses().empty() && NowMs() - begin < kPatienceMs) {
        Look();
        Nap();
    }
    for (const Process &process : SessionProcesses()) {
        own_.Complain("process " + std::to_string(process.id) + " did not end");
        kill(process.id, SIGKILL);
    }
}

} // namespace kelo::stress
