// A fresh appliance root per Appliance, in a temporary folder that goes with
// it, made and entered through appliance/root. run() executes the installed
// davsync (bound at /opt/program) chrooted into the root inside private mount
// and PID namespaces, with the host's system folders but /usr/local bound
// read-only, /dev/null and /dev/zero bound, a /proc of its own, umask 077 and
// PATH as the only environment variable (and what a run adds). Executables
// in /opt/alongside start beside it (outside the chroot): only they and the
// run's own processes are seen in /proc. A recording "apache" first on PATH
// appends its arguments as one line to /var/log/apache_calls. A datagram
// socket at /dev/log takes what the runs send to syslog. Every path a member
// takes is a path inside the root.
#ifndef DAVSYNC_TESTS_HARNESS_APPLIANCE_H
#define DAVSYNC_TESTS_HARNESS_APPLIANCE_H

#include <map>
#include <string>
#include <sys/types.h>
#include <utility>
#include <vector>

namespace appliance {

struct RunResult { int status = -1; std::string out, err; };  // status: exit status, or 128 + signal
struct ListItem { std::string shared_name, path; int RW = 1, enable = 1; };  // a share list item
// A catalogue item; empty texts leave the element out.
struct Share { std::string name, path, read_list, write_list, invalid_users, public_, web_public; };

// A share list exactly as the tool writes it, and a catalogue file.
std::string share_list_xml(int allen, const std::vector<ListItem> &items);
std::string catalogue_xml(const std::vector<Share> &shares);

struct RunOptions {
    // Size-limited tmpfs (inside path, size such as "16k") holding a copy of
    // the folder; what the run writes there goes with the run.
    std::vector<std::pair<std::string, std::string>> tmpfs;
    int kill_after_ms = 0;  // SIGKILL the run and every shell it started after this delay
    std::string program;    // a host program to run instead of davsync
    std::vector<std::string> env;  // NAME=VALUE words added to the run's environment
    std::string preload;           // a host library preloaded into the program (bound at /opt/preload)
};

class Appliance {
public:
    Appliance();
    ~Appliance();
    Appliance(const Appliance &) = delete;
    Appliance &operator=(const Appliance &) = delete;

    std::string host(const std::string &inside) const { return root_ + inside; }  // where it is found from outside
    void write(const std::string &inside, const std::string &content, mode_t mode = 0644);  // parents made
    std::string read(const std::string &inside) const;  // "" when missing
    bool exists(const std::string &inside) const;       // a dangling link counts
    void make_dir(const std::string &inside);
    void remove(const std::string &inside);
    std::string link_target(const std::string &inside) const;        // "" when no link
    std::vector<std::string> list(const std::string &inside) const;  // sorted names

    // Things planted where the tool writes.
    void plant_link(const std::string &target, const std::string &inside);
    void plant_fifo(const std::string &inside);
    void plant_foreign(const std::string &inside, uid_t owner = 4242);  // another user's file

    // An /etc/mtab line (and the folder); a USB volume under /mnt/USB, marked or not.
    void mount(const std::string &dir, const std::string &device = "/dev/sda4", const std::string &type = "ext4");
    void mount_usb(const std::string &name, bool marked = true);
    void set_config(const std::string &slash_path, const std::string &value);
    void set_catalogue(const std::vector<Share> &shares);
    void add_group(const std::string &name, const std::vector<std::string> &members);
    void write_list(const std::string &volume, const std::vector<ListItem> &items, int allen = 1,
                    const std::string &list_name = "lighty.xml");

    RunResult run(const std::vector<std::string> &args, const RunOptions &options = {});
    pid_t start(const std::vector<std::string> &args, const RunOptions &options = {});
    RunResult finish(pid_t pid);  // waits for a started run
    std::vector<std::string> apache_calls() const;
    std::vector<std::string> log_lines();  // every message sent to /dev/log so far, in order

private:
    pid_t spawn(std::vector<std::string> words);  // output to numbered files, reaped by finish()
    void write_config();
    std::string dir_, root_;
    std::map<std::string, std::string> config_;
    std::map<pid_t, int> running_;  // started runs and the numbers that name their output files
    int runs_ = 0;
    int log_socket_ = -1;
    std::vector<std::string> log_;
    void drain_log();
};

}  // namespace appliance

#endif
