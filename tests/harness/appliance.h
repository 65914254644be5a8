// Appliance test harness. Each Appliance is a fresh appliance root in a
// temporary folder; run() executes the installed davsync chrooted into it,
// inside a private mount namespace (as root: unshare; otherwise an
// unprivileged user namespace), with the system's /usr/bin, /usr/lib, ...
// bound read-only, /proc and /dev/null bound, and PATH as the only
// environment variable. A recording "apache" is first on PATH and appends
// its arguments as one line to /var/log/apache_calls. The root is removed
// when the Appliance goes; the mounts die with the namespace.
#ifndef DAVSYNC_TESTS_HARNESS_APPLIANCE_H
#define DAVSYNC_TESTS_HARNESS_APPLIANCE_H

#include <map>
#include <string>
#include <utility>
#include <sys/types.h>
#include <vector>

namespace appliance {

struct RunResult {
    int status = -1;  // exit status, or 128 + signal
    std::string out;
    std::string err;
};

// One item of a WebDAV share list file.
struct ListItem {
    std::string shared_name;
    std::string path;  // as written in the file (relative for volume lists)
    int RW = 1;
    int enable = 1;
};

// One share of a catalogue file; empty texts leave the element out.
struct Share {
    std::string name;
    std::string path;
    std::string read_list;
    std::string write_list;
    std::string invalid_users;
    std::string public_;
    std::string web_public;
};

// Exactly the text the tool writes for a share list (names and paths are
// XML-escaped here the way the tool escapes them).
std::string share_list_xml(int allen, const std::vector<ListItem> &items);
// A catalogue file: <config><samba><item>...</item>...</samba></config>.
std::string catalogue_xml(const std::vector<Share> &shares);

class Appliance {
public:
    Appliance();   // skeleton root; throws (the test fails) when no namespace can be had
    ~Appliance();
    Appliance(const Appliance &) = delete;
    Appliance &operator=(const Appliance &) = delete;

    const std::string &root() const { return root_; }
    std::string host_path(const std::string &inside) const;  // root + inside

    // Files inside the root; parents are created as needed.
    void write_file(const std::string &inside, const std::string &content, mode_t mode = 0644);
    std::string read_file(const std::string &inside) const;  // "" when missing
    bool exists(const std::string &inside) const;            // lstat
    void make_dir(const std::string &inside);
    void remove(const std::string &inside);                  // file or tree
    void make_symlink(const std::string &target, const std::string &inside);
    std::string link_target(const std::string &inside) const;  // "" when not a link
    std::vector<std::string> list_dir(const std::string &inside) const;  // sorted names

    // The appliance's state.
    void mount(const std::string &dir, const std::string &device = "/dev/sda4",
               const std::string &type = "ext4");   // mtab line; creates dir
    void set_config(const std::string &slash_path, const std::string &value);
    void unset_config(const std::string &slash_path);
    void set_catalogue(const std::vector<Share> &shares);  // /var/www/xml/smb.xml
    void add_user(const std::string &name);                // /etc/passwd
    void add_group(const std::string &name, const std::vector<std::string> &members);
    // A volume's list file in its hidden data location.
    void write_share_list(const std::string &volume_dir, const std::vector<ListItem> &items,
                          int allen = 1, const std::string &list_name = "lighty.xml");
    std::string read_share_list(const std::string &volume_dir,
                                const std::string &list_name = "lighty.xml") const;

    // Runs davsync with these arguments (not including the program name).
    RunResult run(const std::vector<std::string> &args) const;
    // Runs a program of the host (e.g. a test helper) in the same way.
    RunResult run_program(const std::string &host_binary, const std::vector<std::string> &args) const;
    // Starts davsync without waiting; finish() collects it.
    pid_t start(const std::vector<std::string> &args) const;
    RunResult finish(pid_t pid) const;

    // Lines the recording apache logged, in order.
    std::vector<std::string> apache_calls() const;

private:
    void write_config() const;
    pid_t launch(const std::string &host_binary, const std::string &inside,
                 const std::vector<std::string> &args) const;
    std::string root_;
    std::map<std::string, std::string> config_;
    std::vector<std::string> read_only_;  // host dirs bound read-only at the same place
    mutable std::map<pid_t, std::pair<int, int>> running_;  // stdout, stderr of started runs
};

}  // namespace appliance

#endif
