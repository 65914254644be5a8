// Runs each command of the table from the same appliance once per failure
// point and mode (ENOSPC, EIO, EACCES: the call fails; kill: SIGKILL there),
// through the preloaded shim, and judges only by what the run leaves.
//   fault_runner SHIM [--commands a,b] [--points N] [--modes ENOSPC,kill] [--jobs J] [--calls 1]
// (--calls 1 lists each command's counted calls first)
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <memory>
#include <set>
#include <sstream>

#include "appliance/fixture.h"

using namespace fixture;
namespace fs = std::filesystem;

namespace {

struct Command {
    const char *name;
    Words words;
    std::function<void(Appliance &)> setup;
    bool started = true;  // a start placed the configuration and links first
};

const auto DO_SETUP = with({open_share(A2 + "/NewA"), open_share(B2 + "/NewB")},
                          {{"NewA", A2 + "/NewA"}, {"NewB", B2 + "/NewB"}, {"Music", A2 + "/Music", 1, 1}, {"usb", "/mnt/USB/USB2"}},
                          [](Appliance &box) { box.mount_usb("USB2", false); });

const std::vector<Command> COMMANDS = {
    {"start", {"start"}, nullptr, false},
    {"stop", {"stop"}},
    {"do", {"do", "/tmp/input.xml"}, DO_SETUP},
    {"merge", {"merge", "/tmp/input.xml"}, DO_SETUP},
    {"del", {"del", A2 + "/Public"}},
    {"du", {"du", "alice"}, [](Appliance &box) {
         std::vector<Share> shares = realistic_shares();
         shares[0].read_list = "#bob#";
         box.set_catalogue(shares);
     }},
    {"chg", {"chg", A2 + "/Music", B2 + "/Media/Music"}, with({open_share(B2 + "/Media/Music")})},
    {"p2pen", {"p2pen"}, [](Appliance &box) {
         publish(box, [] { auto shares = realistic_shares(); shares.push_back({"P2P", B2 + "/P2P"}); return shares; }());
         box.set_config("/download_mgr/p2p/enable", "1");
         box.write("/etc/NAS_CFG/p2psettings.xml", "<p2p>\n<save_path>/mnt/HD/HD_b2/Download</save_path>\n</p2p>\n");
     }},
    {"get", {"get", A2 + "/Public"}},
};

const std::vector<std::pair<std::string, int>> MODES = {{"ENOSPC", ENOSPC}, {"EIO", EIO}, {"EACCES", EACCES}, {"kill", 0}};

// What a run leaves: the files that must be old or new, the link directory,
// what the outcome also counts, and every entry: its type, mode and content.
struct State {
    std::map<std::string, std::string> kept, links, entries;
    std::string note, calls;
    bool operator==(const State &o) const { return kept == o.kept && links == o.links; }
    std::set<std::string> tree() const {  // names and types
        std::set<std::string> names;
        for (const auto &[path, entry] : entries) names.insert(path + " " + entry[0]);
        return names;
    }
};

State snapshot(const Appliance &box) {
    State state;
    for (auto it = fs::recursive_directory_iterator(box.host("")); it != fs::recursive_directory_iterator(); ++it) {
        std::string path = it->path().string().substr(box.host("").size());
        std::string name = it->path().filename(), folder = it->path().parent_path().filename();
        if (path == "/proc") it.disable_recursion_pending();
        if (path == "/dev/log" || path == "/var/log/apache_calls" || path == "/opt/preload") continue;
        auto status = it->symlink_status();
        state.entries[path] = "-fdlbcpsu"[int(status.type()) & 7] + std::to_string(int(status.permissions())) + " " +
                              (fs::is_regular_file(status) ? box.read(path) : box.link_target(path));
        if (((name == "lighty.xml" || name == ISO) && folder == ".system_data") || name == ".davconf" || path == CONF ||
            path == QUERY)
            state.kept[path] = box.read(path);
        if (it->path().parent_path() == box.host(LINKS)) state.links[name] = box.link_target(path);
    }
    state.note = box.exists(NOTE) ? box.read(NOTE) : GONE;
    state.calls = box.read("/var/log/apache_calls");
    return state;
}

std::string at(const State &state, const std::string &path) {
    auto found = state.kept.find(path);
    return found == state.kept.end() ? GONE : found->second;
}

// All but /dev, whose log socket is bound by the appliance `to`.
void restore(const Appliance &from, Appliance &to) {
    for (const auto &entry : fs::directory_iterator(to.host("")))
        if (entry.path().filename() != "dev") fs::remove_all(entry.path());
    for (const auto &entry : fs::directory_iterator(from.host("")))
        if (entry.path().filename() != "dev")
            fs::copy(entry.path(), to.host("/" + entry.path().filename().string()),
                     fs::copy_options::recursive | fs::copy_options::copy_symlinks);
}

struct Runner {
    std::string shim;
    const Command &command;
    Appliance prepared;
    std::unique_ptr<Appliance> work = std::make_unique<Appliance>();
    State before, after, after_start, start_alone;
    bool short_io_same;  // reads and writes of a few bytes at a time change nothing
    std::vector<std::string> points;  // the name of each counted call

    RunResult run(const Words &words, const std::string &fault) {
        return work->run(words, RunOptions{{}, 0, "", {"ASAN_OPTIONS=verify_asan_link_order=0", "DAVSYNC_FAULT=" + fault}, shim});
    }

    Runner(const std::string &shim_path, const Command &c) : shim(shim_path), command(c) {
        realistic(prepared);
        if (command.started) {
            prepared.run({"start"});
            for (const auto &[volume, items] : {std::make_pair(A2, A2_ITEMS), {B2, B2_ITEMS}, {D2, D2_ITEMS}})
                prepared.write_list(volume, items, 7);
            prepared.write_list(A2, ISO_ITEMS, 7, ISO);
        }
        if (command.setup) command.setup(prepared);
        before = snapshot(prepared);
        restore(prepared, *work);
        std::istringstream calls(run(command.words, "count").err);
        for (std::string what, k, name; calls >> what >> k >> name;)
            if (what == "call") points.push_back(name);
        after = snapshot(*work);
        run({"start"}, ""), after_start = snapshot(*work);
        restore(prepared, *work), run({"start"}, ""), start_alone = snapshot(*work);
        restore(prepared, *work), run(command.words, "short");
        State cut = snapshot(*work);
        short_io_same = cut.entries == after.entries && cut.calls == after.calls;
    }

    // One trial: "VIOLATIONS CHANGED TOLD what differed".
    std::string trial(size_t k, const std::pair<std::string, int> &mode) {
        restore(prepared, *work);
        size_t logged = work->log_lines().size();
        run(command.words, std::to_string(k) + ":" + (mode.second ? std::to_string(mode.second) : "kill"));
        State left = snapshot(*work);
        bool told = work->log_lines().size() > logged;
        // A root exactly as before or as the fault-free run left it starts as the references did.
        State then = left.entries == before.entries ? start_alone : left.entries == after.entries ? after_start
                     : (run({"start"}, ""), snapshot(*work));
        std::string wrong;
        bool all_new = true;
        std::set<std::string> paths;
        for (const State *state : {&before, &after, &left})
            for (const auto &[path, text] : state->kept) paths.insert(path);
        for (const std::string &path : paths) {
            std::string now = at(left, path);
            if (now != at(before, path) && now != at(after, path)) wrong += " neither old nor new: " + path + ";";
            all_new = all_new && (path == CONF || now == at(after, path));
        }
        if (at(left, CONF) == at(after, CONF) && at(before, CONF) != at(after, CONF) && !all_new)
            wrong += " configuration new, a list or marker not;";
        if (!(then == after_start) && !(then == start_alone)) wrong += " the next start left neither outcome;";
        const State &like = then == start_alone ? start_alone : after_start;
        std::set<std::string> now = then.tree(), want = like.tree();
        for (const std::string &entry : now)
            if (!want.count(entry)) wrong += " left " + entry + ";";
        for (const std::string &entry : want)
            if (!now.count(entry)) wrong += " lost " + entry + ";";
        bool changed = mode.second && (left.kept != after.kept || left.note != after.note || left.calls != after.calls);
        return std::string(wrong.empty() ? "0" : "1") + (changed ? " 1" : " 0") + (changed && told ? " 1" : " 0") + wrong;
    }
};

std::vector<std::string> split(const std::string &text) {
    std::vector<std::string> parts;
    std::istringstream in(text);
    for (std::string part; std::getline(in, part, ',');) parts.push_back(part);
    return parts;
}

}  // namespace

int main(int argc, char **argv) {
    std::map<std::string, std::string> option = {{"--commands", ""}, {"--points", "0"}, {"--modes", ""}, {"--jobs", "2"}, {"--calls", ""}};
    for (int i = 2; i + 1 < argc; i += 2) option[argv[i]] = argv[i + 1];
    if (argc < 2 || option.size() != 5) return std::cerr << "usage: fault_runner SHIM [--commands a,b] [--points N] "
                                                            "[--modes ENOSPC,EIO,EACCES,kill] [--jobs J] [--calls 1]\n", 2;
    std::set<std::string> commands, modes;
    for (const std::string &name : split(option["--commands"])) commands.insert(name);
    for (const std::string &name : split(option["--modes"])) modes.insert(name);
    size_t wanted = std::stoul(option["--points"]), jobs = std::stoul(option["--jobs"]);
    wanted += wanted == 1;  // first and last
    bool failed = false;
    std::string table = "command  points  tried  trials  violations  changed  told\n";
    for (const Command &command : COMMANDS) {
        if (!commands.empty() && !commands.count(command.name)) continue;
        Runner runner(argv[1], command);
        size_t n = runner.points.size();
        for (size_t k = 0; !option["--calls"].empty() && k < n; ++k) printf("%s %zu %s\n", command.name, k + 1, runner.points[k].c_str());
        fflush(stdout);
        std::set<size_t> ks;  // spread over 1..n, first and last always
        for (size_t i = 0; n && i < (wanted && wanted < n ? wanted : n); ++i)
            ks.insert(wanted && wanted < n ? 1 + (i * (n - 1) + (wanted - 1) / 2) / (wanted - 1) : i + 1);
        std::vector<std::pair<size_t, const std::pair<std::string, int> *>> trials;
        for (size_t k : ks)
            for (const auto &mode : MODES)
                if (modes.empty() || modes.count(mode.first)) trials.push_back({k, &mode});
        // Each worker takes the next trial (a kill is often followed by a slow start) in an
        // appliance of its own and writes its lines to a file.
        auto *next = static_cast<size_t *>(mmap(nullptr, sizeof(size_t), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));
        *next = 0;
        std::vector<FILE *> results;
        std::vector<pid_t> workers;
        for (size_t j = 0; j < jobs; ++j) {
            results.push_back(tmpfile());
            if ((workers.emplace_back(fork())) != 0) continue;
            runner.work.release();  // the parent's to remove
            runner.work = std::make_unique<Appliance>();
            for (size_t t; (t = __atomic_fetch_add(next, 1, __ATOMIC_RELAXED)) < trials.size();)
                fprintf(results[j], "%zu %s\n", t, runner.trial(trials[t].first, *trials[t].second).c_str());
            fflush(results[j]);
            runner.work.reset();
            _exit(0);
        }
        int violations = 0, changed = 0, told = 0;
        size_t judged = 0;
        std::map<size_t, std::string> reported;
        for (size_t j = 0; j < jobs; ++j) {
            waitpid(workers[j], nullptr, 0);
            rewind(results[j]);
            for (char line[8192]; fgets(line, sizeof line, results[j]);) {
                size_t t;
                int bad, change, tell, used;
                line[strcspn(line, "\n")] = '\0';
                if (sscanf(line, "%zu %d %d %d%n", &t, &bad, &change, &tell, &used) < 4) continue;
                violations += bad, changed += change, told += tell, ++judged;
                if (bad || change > tell)
                    reported[t] = std::string(command.name) + " k=" + std::to_string(trials[t].first) + " (" +
                                  runner.points[trials[t].first - 1] + ") " + trials[t].second->first + ":" +
                                  (change > tell ? " changed, not told;" : "") + (line + used) + "\n";
            }
            fclose(results[j]);
        }
        munmap(next, sizeof(size_t));
        for (const auto &[t, text] : reported) fputs(text.c_str(), stdout);
        char row[128];
        snprintf(row, sizeof row, "%-7s %7zu %6zu %7zu %11d %8d %5d%s\n", command.name, n, ks.size(), trials.size(),
                 violations, changed, told, judged == trials.size() ? "" : "  (a worker died: trials missing)");
        table += row;
        if (!runner.short_io_same) printf("%s: short reads and writes left another state than whole ones\n", command.name);
        failed = failed || violations > 0 || changed > told || n == 0 || judged != trials.size() || !runner.short_io_same;
    }
    fputs(table.c_str(), stdout);
    return failed ? 1 : 0;
}
