#include "harness/appliance.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <fstream>
#include <ftw.h>
#include <poll.h>
#include <sched.h>
#include <signal.h>
#include <sstream>
#include <stdexcept>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/wait.h>
#include <unistd.h>

#ifndef DAVSYNC_STAGED_BINARY
#error "DAVSYNC_STAGED_BINARY must name the installed davsync"
#endif

namespace appliance {

namespace {

constexpr const char *DAVSYNC_INSIDE = "/opt/davsync/sbin/davsync";
constexpr const char *PROGRAM_INSIDE = "/opt/program";
constexpr const char *CONFIG_FILE = "/etc/NAS_CFG/config_db.xml";
constexpr const char *APACHE_LOG = "/var/log/apache_calls";
constexpr const char *XML_DECLARATION = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";
// A child that outlives this is taken for hung and killed.
constexpr int RUN_LIMIT_SECONDS = 120;
// Marks the child's own complaints, so the parent can tell them from the tool's.
constexpr const char *HARNESS_PREFIX = "appliance harness: ";

std::string xml_escape(const std::string &text) {
    std::string out;
    for (char c : text) {
        switch (c) {
        case '&': out += "&amp;"; break;
        case '<': out += "&lt;"; break;
        case '>': out += "&gt;"; break;
        case '"': out += "&quot;"; break;
        default: out += c;
        }
    }
    return out;
}

std::string element(const std::string &name, const std::string &text) {
    return "<" + name + ">" + xml_escape(text) + "</" + name + ">";
}

void make_dirs(const std::string &path, mode_t mode = 0755) {
    for (size_t slash = path.find('/', 1);; slash = path.find('/', slash + 1)) {
        std::string part = path.substr(0, slash);
        if (mkdir(part.c_str(), mode) != 0 && errno != EEXIST)
            ADD_FAILURE() << "mkdir " << part << ": " << strerror(errno);
        if (slash == std::string::npos) break;
    }
}

std::string parent_of(const std::string &path) { return path.substr(0, path.rfind('/')); }

// Never follows a link at the last step: a link the tool made may point
// at an absolute path, which outside the chroot is the host's.
void write_host_file(const std::string &path, const std::string &content, mode_t mode,
                     bool append = false) {
    make_dirs(parent_of(path));
    int flags = O_WRONLY | O_CREAT | O_NOFOLLOW | O_CLOEXEC | (append ? O_APPEND : O_TRUNC);
    int fd = open(path.c_str(), flags, mode);
    if (fd < 0) {
        ADD_FAILURE() << "cannot write " << path << ": " << strerror(errno);
        return;
    }
    if (write(fd, content.data(), content.size()) != static_cast<ssize_t>(content.size()))
        ADD_FAILURE() << "short write to " << path;
    if (!append) fchmod(fd, mode);
    close(fd);
}

int remove_entry(const char *path, const struct stat *, int type, struct FTW *) {
    int rc = (type == FTW_DP) ? rmdir(path) : unlink(path);
    if (rc != 0) ADD_FAILURE() << "cannot remove " << path << ": " << strerror(errno);
    return 0;
}

// FTW_MOUNT: nothing is mounted in the root out here, and if something
// ever were, the host's files behind it must stay.
void remove_tree(const std::string &path) {
    struct stat st;
    if (lstat(path.c_str(), &st) != 0) return;
    nftw(path.c_str(), remove_entry, 16, FTW_DEPTH | FTW_PHYS | FTW_MOUNT);
}

std::vector<std::string> split_lines(const std::string &text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

// Nested elements for slash paths; a path's last step carries the value.
struct ConfigNode {
    std::string value;
    std::map<std::string, ConfigNode> children;
};

std::string config_text(const ConfigNode &node) {
    std::string out = xml_escape(node.value);
    for (const auto &[name, child] : node.children)
        out += "<" + name + ">" + config_text(child) + "</" + name + ">\n";
    return out;
}

// ---- child side: everything below runs between fork and exec ----

[[noreturn]] void child_fail(const std::string &what) {
    std::string line = HARNESS_PREFIX + what + ": " + strerror(errno) + "\n";
    if (write(STDERR_FILENO, line.data(), line.size()) < 0) {}
    _exit(127);
}

bool write_proc_file(const char *path, const std::string &text) {
    int fd = open(path, O_WRONLY | O_CLOEXEC);
    if (fd < 0) return false;
    bool ok = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
    close(fd);
    return ok;
}

// A private mount namespace; without root, a user namespace that maps the
// caller to root. Returns what failed, or null.
const char *enter_namespace(uid_t uid, gid_t gid) {
    if (uid == 0) {
        if (unshare(CLONE_NEWNS) != 0) return "unshare(CLONE_NEWNS)";
    } else {
        if (unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0) return "unshare(CLONE_NEWUSER|CLONE_NEWNS)";
        if (!write_proc_file("/proc/self/setgroups", "deny")) return "writing /proc/self/setgroups";
        if (!write_proc_file("/proc/self/uid_map", "0 " + std::to_string(uid) + " 1"))
            return "writing /proc/self/uid_map";
        if (!write_proc_file("/proc/self/gid_map", "0 " + std::to_string(gid) + " 1"))
            return "writing /proc/self/gid_map";
    }
    if (mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) return "making / private";
    return nullptr;
}

void bind_mount(const std::string &source, const std::string &target) {
    if (mount(source.c_str(), target.c_str(), nullptr, MS_BIND | MS_REC, nullptr) != 0)
        child_fail("bind " + source + " on " + target);
}

// The remount must keep the flags the source already has: a user
// namespace may not drop them.
void bind_read_only(const std::string &source, const std::string &target) {
    bind_mount(source, target);
    struct statvfs vfs;
    unsigned long kept = 0;
    if (statvfs(source.c_str(), &vfs) == 0) {
        const std::pair<unsigned long, unsigned long> map[] = {
            {ST_NOSUID, MS_NOSUID}, {ST_NODEV, MS_NODEV}, {ST_NOEXEC, MS_NOEXEC},
            {ST_NOATIME, MS_NOATIME}, {ST_NODIRATIME, MS_NODIRATIME}, {ST_RELATIME, MS_RELATIME}};
        for (const auto &[st, ms] : map)
            if (vfs.f_flag & st) kept |= ms;
    }
    if (mount(nullptr, target.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY | kept, nullptr) != 0)
        child_fail("read-only remount of " + target);
}

struct Pipe {
    int read_end = -1;
    int write_end = -1;
};

Pipe make_pipe() {
    int fds[2];
    if (pipe2(fds, O_CLOEXEC) != 0) {
        ADD_FAILURE() << "pipe: " << strerror(errno);
        return {};
    }
    return {fds[0], fds[1]};
}

// Reads what is there; false at end of file or error.
bool drain(int fd, std::string &into) {
    char buffer[4096];
    for (;;) {
        ssize_t n = read(fd, buffer, sizeof buffer);
        if (n > 0) {
            into.append(buffer, n);
            continue;
        }
        if (n < 0 && (errno == EAGAIN || errno == EINTR)) return true;
        return false;
    }
}

int decode_status(int raw) {
    if (WIFEXITED(raw)) return WEXITSTATUS(raw);
    if (WIFSIGNALED(raw)) return 128 + WTERMSIG(raw);
    return -1;
}

// Why no namespace can be had, or "" when one can; asked once per process.
const std::string &namespace_problem() {
    static const std::string problem = [] {
        uid_t uid = geteuid();
        gid_t gid = getegid();
        Pipe report = make_pipe();
        pid_t pid = fork();
        if (pid == 0) {
            close(report.read_end);
            const char *failed = enter_namespace(uid, gid);
            if (failed) {
                std::string line = std::string(failed) + ": " + strerror(errno);
                if (write(report.write_end, line.data(), line.size()) < 0) {}
                _exit(1);
            }
            _exit(0);
        }
        close(report.write_end);
        std::string why;
        if (pid < 0) why = std::string("fork: ") + strerror(errno);
        while (pid > 0 && drain(report.read_end, why)) {}
        close(report.read_end);
        int raw = 0;
        if (pid > 0 && (waitpid(pid, &raw, 0) != pid || decode_status(raw) != 0) && why.empty())
            why = "namespace probe failed";
        return why;
    }();
    return problem;
}

// A fresh folder in $TMPDIR (or /tmp), as an absolute path: it is chrooted into.
std::string make_root_folder() {
    const char *tmpdir = getenv("TMPDIR");
    std::string templ = std::string(tmpdir && *tmpdir ? tmpdir : "/tmp") + "/davsync-appliance.XXXXXX";
    if (!mkdtemp(templ.data())) throw std::runtime_error("appliance harness: mkdtemp " + templ +
                                                         ": " + strerror(errno));
    char absolute[PATH_MAX];
    if (!realpath(templ.c_str(), absolute)) {
        rmdir(templ.c_str());
        throw std::runtime_error("appliance harness: realpath " + templ + ": " + strerror(errno));
    }
    chmod(absolute, 0755);
    return absolute;
}

}  // namespace

std::string share_list_xml(int allen, const std::vector<ListItem> &items) {
    std::string out = std::string(XML_DECLARATION) + "<config>\n\t<WebDAV>\n\t\t<count>" +
                      std::to_string(items.size()) + "</count>\n\t\t<allen>" +
                      std::to_string(allen) + "</allen>\n";
    for (const ListItem &item : items) {
        out += "\t\t\t<item>\n\t\t\t\t" + element("shared_name", item.shared_name) +
               "\n\t\t\t\t" + element("path", item.path) + "\n\t\t\t\t" +
               element("RW", std::to_string(item.RW)) + "\n\t\t\t\t" +
               element("enable", std::to_string(item.enable)) + "\n\t\t\t</item>\n";
    }
    return out + "\t</WebDAV>\n</config>\n";
}

std::string catalogue_xml(const std::vector<Share> &shares) {
    std::string out = std::string(XML_DECLARATION) + "<config><samba>";
    for (const Share &share : shares) {
        out += "<item>";
        const std::pair<const char *, const std::string *> fields[] = {
            {"name", &share.name},           {"path", &share.path},
            {"read_list", &share.read_list}, {"write_list", &share.write_list},
            {"invalid_users", &share.invalid_users}, {"public", &share.public_},
            {"web_public", &share.web_public}};
        for (const auto &[name, text] : fields)
            if (!text->empty()) out += element(name, *text);
        out += "</item>";
    }
    return out + "</samba></config>\n";
}

// Throws, so that the test ends at once on that one line instead of a
// failure for every run that follows.
Appliance::Appliance() {
    if (!namespace_problem().empty())
        throw std::runtime_error("appliance harness: no private mount namespace can be had (" +
                                 namespace_problem() + "); run the tests as root or allow "
                                 "unprivileged user namespaces");
    root_ = make_root_folder();

    write_file("/etc/mtab", "");
    write_file("/etc/passwd", "root:x:0:0:root:/root:/bin/sh\n");
    write_file("/etc/group", "root:x:0:\n");
    write_file("/etc/nsswitch.conf", "passwd: files\ngroup: files\n");
    make_dir("/tmp");
    chmod(host_path("/tmp").c_str(), 01777);
    for (const char *dir : {"/var/www/xml", "/mnt/HD", "/usr/local/apache2_dav/conf/extra",
                            "/var/log", "/opt", "/proc"})
        make_dir(dir);
    write_file("/opt/recorder/apache",
               std::string("#!/bin/sh\nprintf '%s\\n' \"$*\" >> ") + APACHE_LOG + "\n", 0755);
    write_file("/dev/null", "", 0666);
    write_file(DAVSYNC_INSIDE, "", 0755);
    write_file(PROGRAM_INSIDE, "", 0755);

    // The tool writes below /usr/local, so /usr is bound piece by piece.
    for (const char *dir : {"/bin", "/sbin", "/lib", "/lib64", "/lib32", "/usr/bin", "/usr/sbin",
                            "/usr/lib", "/usr/lib64", "/usr/lib32", "/usr/libexec", "/usr/share"}) {
        struct stat st;
        if (lstat(dir, &st) != 0) continue;
        if (S_ISLNK(st.st_mode)) {
            char target[PATH_MAX] = {};
            if (readlink(dir, target, sizeof target - 1) > 0) make_symlink(target, dir);
        } else if (S_ISDIR(st.st_mode)) {
            make_dir(dir);
            read_only_.push_back(dir);
        }
    }

    config_ = {{"/system_mgr/webdav/enable", "1"}, {"/system_mgr/samba/ads_enable", "0"}};
    write_config();
}

Appliance::~Appliance() {
    for (const auto &[pid, pipes] : running_) {
        kill(pid, SIGKILL);
        waitpid(pid, nullptr, 0);
        close(pipes.first);
        close(pipes.second);
    }
    if (!root_.empty()) remove_tree(root_);
}

std::string Appliance::host_path(const std::string &inside) const { return root_ + inside; }

void Appliance::write_file(const std::string &inside, const std::string &content, mode_t mode) {
    write_host_file(host_path(inside), content, mode);
}

std::string Appliance::read_file(const std::string &inside) const {
    std::ifstream in(host_path(inside), std::ios::binary);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

bool Appliance::exists(const std::string &inside) const {
    struct stat st;
    return lstat(host_path(inside).c_str(), &st) == 0;
}

void Appliance::make_dir(const std::string &inside) { make_dirs(host_path(inside)); }

void Appliance::remove(const std::string &inside) { remove_tree(host_path(inside)); }

void Appliance::make_symlink(const std::string &target, const std::string &inside) {
    make_dirs(parent_of(host_path(inside)));
    if (symlink(target.c_str(), host_path(inside).c_str()) != 0)
        ADD_FAILURE() << "symlink " << inside << ": " << strerror(errno);
}

std::string Appliance::link_target(const std::string &inside) const {
    char target[PATH_MAX] = {};
    ssize_t n = readlink(host_path(inside).c_str(), target, sizeof target - 1);
    return n > 0 ? std::string(target, n) : "";
}

std::vector<std::string> Appliance::list_dir(const std::string &inside) const {
    std::vector<std::string> names;
    DIR *dir = opendir(host_path(inside).c_str());
    if (!dir) return names;
    while (const dirent *entry = readdir(dir)) {
        std::string name = entry->d_name;
        if (name != "." && name != "..") names.push_back(name);
    }
    closedir(dir);
    std::sort(names.begin(), names.end());
    return names;
}

void Appliance::mount(const std::string &dir, const std::string &device, const std::string &type) {
    write_host_file(host_path("/etc/mtab"), device + " " + dir + " " + type + " rw 0 0\n", 0644, true);
    make_dir(dir);
}

void Appliance::set_config(const std::string &slash_path, const std::string &value) {
    config_[slash_path] = value;
    write_config();
}

void Appliance::unset_config(const std::string &slash_path) {
    config_.erase(slash_path);
    write_config();
}

void Appliance::write_config() const {
    ConfigNode top;
    for (const auto &[path, value] : config_) {
        ConfigNode *node = &top;
        std::istringstream steps(path);
        for (std::string step; std::getline(steps, step, '/');)
            if (!step.empty()) node = &node->children[step];
        node->value = value;
    }
    write_host_file(host_path(CONFIG_FILE),
                    std::string(XML_DECLARATION) + "<config>\n" + config_text(top) + "</config>\n",
                    0644);
}

void Appliance::set_catalogue(const std::vector<Share> &shares) {
    write_file("/var/www/xml/smb.xml", catalogue_xml(shares));
}

void Appliance::add_user(const std::string &name) {
    // Root is the first line; users count from 1000.
    std::string id = std::to_string(999 + split_lines(read_file("/etc/passwd")).size());
    write_host_file(host_path("/etc/passwd"),
                    name + ":x:" + id + ":" + id + "::/home/" + name + ":/bin/sh\n", 0644, true);
}

void Appliance::add_group(const std::string &name, const std::vector<std::string> &members) {
    std::string gid = std::to_string(999 + split_lines(read_file("/etc/group")).size());
    std::string line = name + ":x:" + gid + ":";
    for (size_t i = 0; i < members.size(); ++i) line += (i ? "," : "") + members[i];
    write_host_file(host_path("/etc/group"), line + "\n", 0644, true);
}

void Appliance::write_share_list(const std::string &volume_dir, const std::vector<ListItem> &items,
                                 int allen, const std::string &list_name) {
    write_file(volume_dir + "/.system_data/" + list_name, share_list_xml(allen, items));
}

std::string Appliance::read_share_list(const std::string &volume_dir,
                                       const std::string &list_name) const {
    return read_file(volume_dir + "/.system_data/" + list_name);
}

RunResult Appliance::run(const std::vector<std::string> &args) const { return finish(start(args)); }

RunResult Appliance::run_program(const std::string &host_binary,
                                 const std::vector<std::string> &args) const {
    return finish(launch(host_binary, PROGRAM_INSIDE, args));
}

pid_t Appliance::start(const std::vector<std::string> &args) const {
    return launch(DAVSYNC_STAGED_BINARY, DAVSYNC_INSIDE, args);
}

pid_t Appliance::launch(const std::string &host_binary, const std::string &inside,
                        const std::vector<std::string> &args) const {
    // Everything the child needs is made before the fork.
    std::vector<std::string> words = {inside};
    words.insert(words.end(), args.begin(), args.end());
    std::vector<char *> argv;
    for (std::string &word : words) argv.push_back(word.data());
    argv.push_back(nullptr);
    char path_variable[] = "PATH=/opt/recorder:/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin";
    char *envp[] = {path_variable, nullptr};
    uid_t uid = geteuid();
    gid_t gid = getegid();

    Pipe out = make_pipe();
    Pipe err = make_pipe();
    pid_t pid = fork();
    if (pid == 0) {
        dup2(out.write_end, STDOUT_FILENO);
        dup2(err.write_end, STDERR_FILENO);
        int null_fd = open("/dev/null", O_RDONLY);
        if (null_fd >= 0) dup2(null_fd, STDIN_FILENO);
        if (const char *failed = enter_namespace(uid, gid)) child_fail(failed);
        for (const std::string &dir : read_only_) bind_read_only(dir, root_ + dir);
        bind_mount("/proc", root_ + "/proc");
        bind_mount("/dev/null", root_ + "/dev/null");
        bind_mount(host_binary, root_ + inside);
        if (chroot(root_.c_str()) != 0) child_fail("chroot " + root_);
        if (chdir("/") != 0) child_fail("chdir /");
        execve(inside.c_str(), argv.data(), envp);
        child_fail("exec " + host_binary);
    }
    close(out.write_end);
    close(err.write_end);
    if (pid < 0) {
        ADD_FAILURE() << "fork: " << strerror(errno);
        close(out.read_end);
        close(err.read_end);
        return -1;
    }
    fcntl(out.read_end, F_SETFL, O_NONBLOCK);
    fcntl(err.read_end, F_SETFL, O_NONBLOCK);
    running_[pid] = {out.read_end, err.read_end};
    return pid;
}

RunResult Appliance::finish(pid_t pid) const {
    RunResult result;
    if (pid < 0) return result;  // already reported
    auto found = running_.find(pid);
    if (found == running_.end()) {
        ADD_FAILURE() << "appliance harness: no run with pid " << pid << " to finish";
        return result;
    }
    auto [out_fd, err_fd] = found->second;
    running_.erase(found);

    // Waits for the child itself, not for end of file: something it left
    // running may hold the pipes open.
    auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(RUN_LIMIT_SECONDS);
    bool out_open = true, err_open = true;
    int raw = 0;
    for (;;) {
        if (waitpid(pid, &raw, WNOHANG) == pid) break;
        if (std::chrono::steady_clock::now() > deadline) {
            ADD_FAILURE() << "appliance harness: run " << pid << " still going after "
                          << RUN_LIMIT_SECONDS << " s; killed";
            kill(pid, SIGKILL);
            waitpid(pid, &raw, 0);
            break;
        }
        pollfd fds[] = {{out_open ? out_fd : -1, POLLIN, 0}, {err_open ? err_fd : -1, POLLIN, 0}};
        if (out_open || err_open) poll(fds, 2, 20);
        else usleep(2000);
        if (out_open && fds[0].revents) out_open = drain(out_fd, result.out);
        if (err_open && fds[1].revents) err_open = drain(err_fd, result.err);
    }
    if (out_open) drain(out_fd, result.out);
    if (err_open) drain(err_fd, result.err);
    close(out_fd);
    close(err_fd);
    result.status = decode_status(raw);
    if (result.status == 127 && result.err.rfind(HARNESS_PREFIX, 0) == 0)
        ADD_FAILURE() << result.err;
    return result;
}

std::vector<std::string> Appliance::apache_calls() const {
    return split_lines(read_file(APACHE_LOG));
}

}  // namespace appliance
