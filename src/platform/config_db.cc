#include "platform/config_db.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <libxml/parser.h>
#include <libxml/tree.h>
#include <sys/stat.h>
#include <unistd.h>

static const char CONFIG_FILE[] = "/etc/NAS_CFG/config_db.xml";

namespace {

// The document last parsed and what its file was then.
struct ParsedFile {
    char *file;
    xmlDoc *doc;  // null for a file that did not parse
    dev_t device;
    ino_t inode;
    off_t size;
    struct timespec changed;
};
ParsedFile cache = {};

bool same_file(const struct stat &status, const char *file) {
    return cache.file != nullptr && strcmp(cache.file, file) == 0 && cache.device == status.st_dev &&
           cache.inode == status.st_ino && cache.size == status.st_size &&
           cache.changed.tv_sec == status.st_mtim.tv_sec && cache.changed.tv_nsec == status.st_mtim.tv_nsec;
}

// The file's bytes; null with errno set when it cannot be read.
char *read_all(int fd, size_t size, size_t *length) {
    char *data = static_cast<char *>(malloc(size + 1));
    if (data == nullptr) return nullptr;
    size_t done = 0;
    for (;;) {
        if (done == size) {
            char *grown = static_cast<char *>(realloc(data, 2 * size + 2));
            if (grown == nullptr) break;
            data = grown;
            size = 2 * size + 1;
        }
        ssize_t got = read(fd, data + done, size - done);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) {
            if (got == 0) {
                *length = done;
                return data;
            }
            break;
        }
        done += static_cast<size_t>(got);
    }
    int error = errno;
    free(data);
    errno = error;
    return nullptr;
}

void remember(const char *file, xmlDoc *doc, const struct stat &status) {
    if (cache.doc != nullptr) xmlFreeDoc(cache.doc);
    free(cache.file);
    cache = {strdup(file), doc, status.st_dev, status.st_ino, status.st_size, status.st_mtim};
}

// The parsed document of `file`; null with errno set when there is none.
xmlDoc *document(const char *file) {
    int fd = open(file, O_RDONLY | O_CLOEXEC);
    if (fd == -1) return nullptr;
    struct stat status;
    if (fstat(fd, &status) != 0) {
        int error = errno;
        close(fd);
        errno = error;
        return nullptr;
    }
    if (!same_file(status, file)) {
        size_t length = 0;
        char *data = read_all(fd, static_cast<size_t>(status.st_size), &length);
        int error = errno;
        if (close(fd) != 0 && data != nullptr) {
            error = errno;
            free(data);
            data = nullptr;
        }
        if (data == nullptr) {
            errno = error;
            return nullptr;
        }
        xmlDoc *doc = xmlReadMemory(data, static_cast<int>(length), nullptr, nullptr,
                                    XML_PARSE_NONET | XML_PARSE_NOWARNING | XML_PARSE_NOERROR);
        free(data);
        remember(file, doc, status);
    } else if (close(fd) != 0) {
        return nullptr;
    }
    if (cache.doc == nullptr) errno = EBADMSG;
    return cache.doc;
}

xmlNode *first_child_element(xmlNode *parent, const char *name, size_t length) {
    for (xmlNode *child = parent->children; child != nullptr; child = child->next) {
        if (child->type != XML_ELEMENT_NODE) continue;
        const char *child_name = reinterpret_cast<const char *>(child->name);
        if (strlen(child_name) == length && strncmp(child_name, name, length) == 0) return child;
    }
    return nullptr;
}

// The value's text, newly allocated with xmlMalloc; null with errno set.
xmlChar *lookup_value(const char *file, const char *slash_path) {
    xmlDoc *doc = document(file);
    if (doc == nullptr) return nullptr;
    xmlNode *node = xmlDocGetRootElement(doc);
    const char *step = slash_path;
    while (node != nullptr && *step != '\0') {
        while (*step == '/') ++step;
        size_t length = strcspn(step, "/");
        if (length == 0) break;
        node = first_child_element(node, step, length);
        step += length;
    }
    xmlChar *value = node != nullptr ? xmlNodeGetContent(node) : nullptr;
    if (value == nullptr) errno = ENOENT;
    return value;
}

}  // namespace

static int xml_get_str_in(const char *file, const char *path, int size, char *buf) {
    if (path == nullptr || buf == nullptr || size <= 0) return errno = EINVAL, -1;
    xmlChar *value = lookup_value(file, path);
    if (value == nullptr) return -1;
    size_t length = strnlen(reinterpret_cast<const char *>(value), static_cast<size_t>(size) - 1);
    memcpy(buf, value, length);
    buf[length] = '\0';
    xmlFree(value);
    return 0;
}

static int xml_get_int_in(const char *file, const char *path) {
    if (path == nullptr) return errno = EINVAL, -1;
    xmlChar *value = lookup_value(file, path);
    if (value == nullptr) return -1;
    errno = 0;
    int result = static_cast<int>(strtol(reinterpret_cast<const char *>(value), nullptr, 10));
    xmlFree(value);
    errno = 0;
    return result;
}

int xml_get_str(const char *path, int size, char *buf) {
    return xml_get_str_in(CONFIG_FILE, path, size, buf);
}

int xml_get_int(const char *path) { return xml_get_int_in(CONFIG_FILE, path); }
