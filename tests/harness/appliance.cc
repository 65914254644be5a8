#include "harness/appliance.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace appliance {

namespace {

const char XML_DECLARATION[] = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";

std::string escape(const std::string &text) {
    std::string out;
    for (char c : text)
        out += c == '&' ? "&amp;" : c == '<' ? "&lt;" : c == '>' ? "&gt;" : c == '"' ? "&quot;" : std::string(1, c);
    return out;
}

std::string element(const std::string &name, const std::string &text) {
    return "<" + name + ">" + escape(text) + "</" + name + ">";
}

std::string slurp(const std::string &path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), {});
}

// Slash paths as nested elements, siblings merged: lookups take the first match.
struct ConfigNode {
    std::string value;
    std::map<std::string, ConfigNode> children;
    std::string text(const std::string &name) const {
        std::string inner = escape(value);
        for (const auto &[child, node] : children) inner += node.text(child);
        return "<" + name + ">" + inner + "</" + name + ">\n";
    }
};

}  // namespace

std::string share_list_xml(int allen, const std::vector<ListItem> &items) {
    std::string out = std::string(XML_DECLARATION) + "<config>\n\t<WebDAV>\n\t\t<count>" +
                      std::to_string(items.size()) + "</count>\n\t\t<allen>" + std::to_string(allen) + "</allen>\n";
    for (const ListItem &item : items)
        out += "\t\t\t<item>\n\t\t\t\t" + element("shared_name", item.shared_name) + "\n\t\t\t\t" +
               element("path", item.path) + "\n\t\t\t\t" + element("RW", std::to_string(item.RW)) + "\n\t\t\t\t" +
               element("enable", std::to_string(item.enable)) + "\n\t\t\t</item>\n";
    return out + "\t</WebDAV>\n</config>\n";
}

std::string catalogue_xml(const std::vector<Share> &shares) {
    std::string out = std::string(XML_DECLARATION) + "<config><samba>";
    for (const Share &s : shares) {
        out += "<item>";
        for (const auto &[name, text] : std::vector<std::pair<std::string, std::string>>{
                 {"name", s.name}, {"path", s.path}, {"read_list", s.read_list}, {"write_list", s.write_list},
                 {"invalid_users", s.invalid_users}, {"public", s.public_}, {"web_public", s.web_public}})
            if (!text.empty()) out += element(name, text);
        out += "</item>";
    }
    return out + "</samba></config>\n";
}

Appliance::Appliance() {
    const char *tmp = getenv("TMPDIR");
    std::string pattern = std::string(tmp && *tmp ? tmp : "/tmp") + "/davsync-appliance.XXXXXX";
    if (mkdtemp(pattern.data()) == nullptr) throw std::runtime_error("appliance harness: mkdtemp " + pattern);
    dir_ = fs::canonical(pattern);  // chrooted into: no link on the way
    root_ = dir_ + "/root";
    finish(spawn({"sh", DAVSYNC_APPLIANCE_ROOT, "make", root_}));
    write("/opt/bin/apache", "#!/bin/sh\necho \"$*\" >> /var/log/apache_calls\n", 0755);
    write("/opt/program", "", 0755);  // the program of a run is bound here: made now, it is in every snapshot
    config_ = {{"/system_mgr/webdav/enable", "1"}, {"/system_mgr/samba/ads_enable", "0"}};
    write_config();
    std::string log_path = host("/dev/log");
    sockaddr_un log_address{AF_UNIX, {}};
    log_path.copy(log_address.sun_path, sizeof log_address.sun_path - 1);
    log_socket_ = socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (log_path.size() >= sizeof log_address.sun_path || log_socket_ < 0 ||
        bind(log_socket_, reinterpret_cast<sockaddr *>(&log_address), sizeof log_address) != 0)
        ADD_FAILURE() << "appliance harness: cannot bind " << log_path;
}

Appliance::~Appliance() {
    for (const auto &[pid, number] : running_) kill(-pid, SIGKILL), waitpid(pid, nullptr, 0);
    if (log_socket_ >= 0) close(log_socket_);
    fs::remove_all(dir_);
}

// Never through a link at the last step: one the tool made points at the host's files out here.
void Appliance::write(const std::string &inside, const std::string &content, mode_t mode) {
    fs::create_directories(fs::path(host(inside)).parent_path());
    int fd = open(host(inside).c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, mode);
    if (fd < 0 || ::write(fd, content.data(), content.size()) != ssize_t(content.size()) || fchmod(fd, mode) != 0)
        ADD_FAILURE() << "appliance harness: cannot write " << inside;
    if (fd >= 0) close(fd);
}

std::string Appliance::read(const std::string &inside) const { return slurp(host(inside)); }
bool Appliance::exists(const std::string &inside) const { return fs::exists(fs::symlink_status(host(inside))); }
void Appliance::make_dir(const std::string &inside) { fs::create_directories(host(inside)); }
void Appliance::remove(const std::string &inside) { fs::remove_all(host(inside)); }

std::string Appliance::link_target(const std::string &inside) const {
    std::error_code not_a_link;
    return fs::read_symlink(host(inside), not_a_link).string();
}

std::vector<std::string> Appliance::list(const std::string &inside) const {
    std::vector<std::string> names;
    for (const auto &entry : fs::directory_iterator(host(inside))) names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
}

void Appliance::plant_link(const std::string &target, const std::string &inside) {
    make_dir(fs::path(inside).parent_path());
    fs::create_symlink(target, host(inside));
}

void Appliance::plant_fifo(const std::string &inside) {
    make_dir(fs::path(inside).parent_path());
    if (mkfifo(host(inside).c_str(), 0666) != 0) ADD_FAILURE() << "appliance harness: mkfifo " << inside;
}

void Appliance::plant_foreign(const std::string &inside, uid_t owner) {
    write(inside, "foreign\n", 0666);
    if (chown(host(inside).c_str(), owner, owner) != 0) ADD_FAILURE() << "appliance harness: chown " << inside;
}

void Appliance::mount(const std::string &dir, const std::string &device, const std::string &type) {
    write("/etc/mtab", read("/etc/mtab") + device + " " + dir + " " + type + " rw 0 0\n");
    make_dir(dir);
}

void Appliance::mount_usb(const std::string &name, bool marked) {
    mount("/mnt/USB/" + name, "/dev/sdc1", "vfat");
    if (marked) write("/mnt/USB/" + name + "/.davconf", "ON");
}

void Appliance::set_config(const std::string &slash_path, const std::string &value) {
    config_[slash_path] = value, write_config();
}

void Appliance::write_config() {
    ConfigNode top;
    for (const auto &[path, value] : config_) {
        ConfigNode *node = &top;
        for (const auto &step : fs::path(path).relative_path()) node = &node->children[step.string()];
        node->value = value;
    }
    write("/etc/NAS_CFG/config_db.xml", XML_DECLARATION + top.text("config"));
}

void Appliance::set_catalogue(const std::vector<Share> &shares) { write("/var/www/xml/smb.xml", catalogue_xml(shares)); }

// Group ids count from 1000 by the lines already there.
void Appliance::add_group(const std::string &name, const std::vector<std::string> &members) {
    std::string group = read("/etc/group"), line = name + ":x:" +
        std::to_string(999 + std::count(group.begin(), group.end(), '\n')) + ":";
    for (size_t i = 0; i < members.size(); ++i) line += (i ? "," : "") + members[i];
    write("/etc/group", group + line + "\n");
}

void Appliance::write_list(const std::string &volume, const std::vector<ListItem> &items, int allen,
                           const std::string &list_name) {
    write(volume + "/.system_data/" + list_name, share_list_xml(allen, items));
}

RunResult Appliance::run(const std::vector<std::string> &args, const RunOptions &options) {
    pid_t pid = start(args, options);
    if (pid > 0 && options.kill_after_ms > 0) usleep(options.kill_after_ms * 1000), kill(-pid, SIGKILL);
    return finish(pid);
}

pid_t Appliance::start(const std::vector<std::string> &args, const RunOptions &options) {
    std::vector<std::string> words = {"sh", DAVSYNC_APPLIANCE_ROOT, "enter", "--pid", "--umask", "077", "--bind",
                                      options.program.empty() ? DAVSYNC_STAGED_BINARY : options.program, "/opt/program"};
    for (const auto &[inside, size] : options.tmpfs) words.insert(words.end(), {"--tmpfs", inside, size});
    for (const std::string &variable : options.env) words.insert(words.end(), {"--env", variable});
    if (!options.preload.empty()) words.insert(words.end(), {"--preload", options.preload});
    if (fs::is_directory(host("/opt/alongside")))
        for (const auto &entry : fs::directory_iterator(host("/opt/alongside"))) words.insert(words.end(), {"--beside", entry.path()});
    words.insert(words.end(), {root_, "--", "/opt/program"});
    words.insert(words.end(), args.begin(), args.end());
    return spawn(words);
}

pid_t Appliance::spawn(std::vector<std::string> words) {
    std::vector<char *> argv;
    for (std::string &word : words) argv.push_back(word.data());
    argv.push_back(nullptr);
    std::string output = dir_ + "/" + std::to_string(++runs_);
    fflush(nullptr);  // else the child's freopen writes out what the caller had buffered
    pid_t pid = fork();
    if (pid == 0) {
        setpgid(0, 0);  // the run and every shell it starts go at once
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        if (!freopen("/dev/null", "r", stdin) || !freopen((output + ".out").c_str(), "w", stdout) ||
            !freopen((output + ".err").c_str(), "w", stderr))
            _exit(125);
        execvp(argv[0], argv.data());
        _exit(125);
    }
    if (pid < 0) ADD_FAILURE() << "appliance harness: fork failed";
    else running_[pid] = runs_;
    return pid;
}

RunResult Appliance::finish(pid_t pid) {
    auto found = running_.find(pid);
    if (found == running_.end()) return {};
    // Drained while it runs: a run blocks in syslog(3) once the socket's queue is full.
    int pid_fd = static_cast<int>(syscall(SYS_pidfd_open, pid, 0));
    pollfd watched[] = {{pid_fd, POLLIN, 0}, {log_socket_, POLLIN, 0}};
    do drain_log();
    while (pid_fd >= 0 && poll(watched, 2, -1) >= 0 && !(watched[0].revents & POLLIN));
    if (pid_fd >= 0) close(pid_fd);
    drain_log();
    siginfo_t ended;
    waitid(P_PID, pid, &ended, WEXITED | WNOWAIT);  // not reaped yet, so the group id is still ours
    kill(-pid, SIGKILL);                            // for anything the run left behind
    int raw = 0;
    waitpid(pid, &raw, 0);
    std::string output = dir_ + "/" + std::to_string(found->second);
    running_.erase(found);
    RunResult run{WIFEXITED(raw) ? WEXITSTATUS(raw) : 128 + WTERMSIG(raw), slurp(output + ".out"), slurp(output + ".err")};
    if (run.status == 125 || run.err.rfind("unshare:", 0) == 0)
        ADD_FAILURE() << "appliance harness: the root could not be made or entered:\n" << run.err;
    return run;
}

void Appliance::drain_log() {
    char message[4096];
    for (ssize_t size; (size = recv(log_socket_, message, sizeof message, 0)) >= 0;) log_.emplace_back(message, size);
}

std::vector<std::string> Appliance::log_lines() {
    drain_log();
    return log_;
}

std::vector<std::string> Appliance::apache_calls() const {
    std::vector<std::string> lines;
    std::istringstream in(read("/var/log/apache_calls"));
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

}  // namespace appliance
