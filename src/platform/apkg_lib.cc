#include "platform/apkg_lib.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

void *p_lib_list = nullptr;

static const char PACKAGE_LIST[] = "/etc/NAS_CFG/apkg.xml";
static const size_t NAME_MAX_CHARS = 203;
static const size_t PATH_MAX_CHARS = 1427;

int LIB_Check_ps(const char *name) {
    if (name == nullptr) return 0;
    DIR *proc = opendir("/proc");
    if (proc == nullptr) return 0;
    int found = 0;
    while (struct dirent *entry = readdir(proc)) {
        if (entry->d_name[0] < '0' || entry->d_name[0] > '9') continue;
        char comm_path[300];
        snprintf(comm_path, sizeof comm_path, "/proc/%s/comm", entry->d_name);
        FILE *comm = fopen(comm_path, "r");
        if (comm == nullptr) continue;
        char command[64] = {};
        if (fgets(command, sizeof command, comm) != nullptr) {
            command[strcspn(command, "\n")] = '\0';
            found = strcmp(command, name) == 0;
        }
        fclose(comm);
        if (found) break;
    }
    closedir(proc);
    return found;
}

int APKG_COMMAND(int, int) { return 0; }

static xmlNode *child_named(xmlNode *parent, const char *name) {
    for (xmlNode *child = parent->children; child != nullptr; child = child->next)
        if (child->type == XML_ELEMENT_NODE && strcmp(reinterpret_cast<const char *>(child->name), name) == 0)
            return child;
    return nullptr;
}

// The text of the item's first child element of this name; null when absent.
static xmlChar *child_text(xmlNode *item, const char *name) {
    xmlNode *child = child_named(item, name);
    return child != nullptr ? xmlNodeGetContent(child) : nullptr;
}

static void copy_child_text(xmlNode *item, const char *name, char *field, size_t max_chars) {
    xmlChar *text = child_text(item, name);
    if (text == nullptr) return;
    size_t length = strnlen(reinterpret_cast<const char *>(text), max_chars);
    memcpy(field, text, length);
    field[length] = '\0';
    xmlFree(text);
}

static char *new_record(xmlNode *item) {
    char *record = static_cast<char *>(calloc(1, APKG_RECORD_SIZE));
    if (record == nullptr) return nullptr;
    xmlChar *state_text = child_text(item, "state");
    int32_t state = 0;
    if (state_text != nullptr) {
        state = static_cast<int32_t>(strtol(reinterpret_cast<const char *>(state_text), nullptr, 10));
        xmlFree(state_text);
    }
    memcpy(record + APKG_RECORD_STATE, &state, sizeof state);
    copy_child_text(item, "name", record + APKG_RECORD_NAME, NAME_MAX_CHARS);
    copy_child_text(item, "path", record + APKG_RECORD_PATH, PATH_MAX_CHARS);
    return record;
}

static int apkg_read_list_file(const char *file) {
    APKG_FreeAllXml();
    char *header = static_cast<char *>(calloc(1, APKG_HEADER_SIZE));
    if (header == nullptr) return -1;
    p_lib_list = header;
    xmlDoc *doc = xmlReadFile(file, nullptr, XML_PARSE_NONET | XML_PARSE_NOWARNING | XML_PARSE_NOERROR);
    if (doc == nullptr) return 0;
    int result = 0;
    char *link = header + APKG_HEADER_FIRST;  // where the next record's pointer goes
    xmlNode *root = xmlDocGetRootElement(doc);
    for (xmlNode *item = root ? root->children : nullptr; item != nullptr; item = item->next) {
        if (item->type != XML_ELEMENT_NODE || strcmp(reinterpret_cast<const char *>(item->name), "item") != 0)
            continue;
        char *record = new_record(item);
        if (record == nullptr) {
            result = -1;
            break;
        }
        memcpy(link, &record, sizeof record);
        link = record + APKG_RECORD_NEXT;
    }
    xmlFreeDoc(doc);
    return result;
}

int APKG_ReadAllXml(void) { return apkg_read_list_file(PACKAGE_LIST); }

void APKG_FreeAllXml(void) {
    char *header = static_cast<char *>(p_lib_list);
    if (header == nullptr) return;
    char *record = nullptr;
    memcpy(&record, header + APKG_HEADER_FIRST, sizeof record);
    while (record != nullptr) {
        char *next = nullptr;
        memcpy(&next, record + APKG_RECORD_NEXT, sizeof next);
        free(record);
        record = next;
    }
    free(header);
    p_lib_list = nullptr;
}
