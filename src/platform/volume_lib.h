// Share and volume library (stand-in). A volume's hidden data location is
// the folder ".system_data" directly in its mount directory.
#ifndef DAVSYNC_PLATFORM_VOLUME_LIB_H
#define DAVSYNC_PLATFORM_VOLUME_LIB_H

extern "C" {
// Newly allocated "<volume_dir>/.system_data/<name>" (not tested for
// existence); null only when memory is exhausted. The caller frees it.
char *getDataLocationByVolume(const char *name, const char *volume_dir);
// Stores a copy of `file` in the volume's hidden data location under the
// file's base name, atomically (temporary name, fsync, rename); creates the
// location (0755) when absent. 0, or -1 (errno set) with the old copy untouched.
int saveDataToHiddenByVolume(const char *file, const char *volume_dir);
}

#endif
