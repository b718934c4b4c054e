// Files, key files and section files.
//
// Key file: one key=value per line; a value in double quotes is read without them; a line whose
// first non-blank is '#' is a comment; lines that are not key=value are kept untouched on rewrite.
// Section file: "[name]" opens a section; key lines follow with optional leading blanks or tab.
// Writers take a format with exactly two "%s" (key, value), e.g. "%s=%s\n", "\t%s=%s\n",
// "%s=\"%s\"\n" ("%%" is allowed; any other conversion, a NULL format or a line break before
// the end is refused as a bad parameter); readers accept every such form. Every rewrite is
// atomic: a temporary file in the same directory, fsync, rename (an existing file keeps its mode
// and owner; a symbolic link is written through). A failure never leaves a truncated or
// half-written target, nor a temporary file. Every failure records its code in the error
// register (err.h). Keys and values a writer is given must read back as written: a key may not
// be empty, start with '#' or '[', hold '=' or a line break, or start or end with a blank; a
// value may not hold a line break.
#ifndef VORNPLATFORM_FILE_H
#define VORNPLATFORM_FILE_H

#include <cstdio>

#include "vornplatform/szhash.h"

// Longest key and longest value the key and section functions accept (longer input is refused
// with VLIBC_ERR_TOO_LONG, and a stored line longer than that is kept but not read as a key).
#define VLIBC_KEY_MAX 255
#define VLIBC_VALUE_MAX 4095

// Flags of VLIBCFileEnumDir (combine with |). A symbolic link counts as the kind it points at;
// VLIBC_ENUM_DIR_LINK takes every link whatever its target (dangling ones included).
#define VLIBC_ENUM_DIR_FILE 0x02    // regular files (and symbolic links to them)
#define VLIBC_ENUM_DIR_DIR 0x04     // directories (and symbolic links to them)
#define VLIBC_ENUM_DIR_LINK 0x40    // symbolic links of any target
#define VLIBC_ENUM_DIR_ANY 0x80     // every entry kind
#define VLIBC_ENUM_DIR_FULLPATH 0x400  // push "dir/name" instead of "name"

int VLIBCFileExist(const char* path);     // 1 exists (any kind; stat()), 0 not or bad parameter
int VLIBCFileCheckDir(const char* path);  // 1 is a directory, 0 otherwise; never negative
int VLIBCFileTouch(const char* path);     // creates (empty) or updates times; 0, -1

// Names in dir that begin with prefix (NULL or "" = all; "." and ".." never), sorted, pushed on
// *list after cleaning it (allocated when *list is NULL). flags 0 (or no kind bit) means every
// kind. The count, or -1 (missing directory included).
int VLIBCFileEnumDir(const char* dir, const char* prefix, PVLIBSZLIST* list, unsigned flags);

// Value of key (its first line), unquoted, into buf (NUL-terminated). > 0: its length; 0: key
// absent, value empty, or file missing; < 0: error (bad parameter, unreadable file, key longer
// than VLIBC_KEY_MAX, value longer than size-1).
int VLIBCFileGetKeyValue(const char* path, const char* key, char* buf, int size, int flags);
// Replaces the key's line (first occurrence; later duplicates are dropped) or appends it; makes
// a missing file (not its directory). 0, -1.
int VLIBCFileSetKeyValue(const char* path, const char* key, const char* value, const char* fmt);
// Removes every line of the key. 0 (also when absent or the file is missing), -1.
int VLIBCFileRemoveKey(const char* path, const char* key);
// 1 when the key's unquoted value equals value, else 0.
int VLIBCFileCheckKeyValue(const char* path, const char* key, const char* value, int flags);
// VLIBCFileSetKeyValue("/etc/vorninfo.conf", key, value, "%s=\"%s\"\n").
int VLIBCINFOSetKeyValue(const char* key, const char* value);
#define VLIBC_INFO_FILE "/etc/vorninfo.conf"

// All keys into *hash (emptied first; allocated when *hash is NULL), in file order, split at the
// first character of sep (NULL or "" = '='); the first line of a duplicated key counts.
// The number of keys (0 for an empty file), -1 on error (missing file is an error).
int VLIBCFileGetKeys(const char* path, int flags, PVLIBSZHASH* hash, const char* sep);
// Sets every key of hashSet in the file as VLIBCFileSetKeyValue with "%s=%s\n" would, in one
// atomic rewrite (a missing file is made); hashOther is ignored when NULL or empty, otherwise its
// keys (those not in hashSet) are removed in the same rewrite. The number of keys written, or -1.
int VLIBCFileSetKeys(const char* path, PVLIBSZHASH hashSet, PVLIBSZHASH hashOther, int flags);

// Section functions: keys before the first "[name]" line belong to no section. A missing file is
// an error for the readers (-1, VLIBC_ERR_NOT_FOUND); the writers make it.
//
// Section names in file order (each once) into *list (cleaned first; allocated when NULL).
// The count, or -1.
int VLIBCFileEnumSection(const char* path, PVLIBSZLIST* list);
// Keys of section name into *hash (emptied first; allocated when NULL). The number of keys; 0
// for an empty or missing section; -1 on error (missing or unreadable file).
int VLIBCFileGetSection(const char* path, const char* name, PVLIBSZHASH* hash);
// The two section writers below store a value that would not read back as written (blanks at
// either end, or double quotes at both ends) in double quotes, so that it reads back as given.
//
// Appends "[name]" and the hash's keys in fmt to the file (made when missing). 1, or -1.
// The caller makes sure the section is not there yet.
int VLIBCFileAddSection(const char* path, const char* name, PVLIBSZHASH hash, const char* fmt);
// Replaces the keys of the section with the hash's (appends the section when absent), other
// sections untouched. Key lines of the section are rewritten in place or dropped, new keys go
// after its last key line; its comments and other lines stay where they are. 1, or -1.
int VLIBCFileSetSection(const char* path, const char* name, PVLIBSZHASH hash,
                        const char* fmt = "\t%s=%s\n");
// Removes every "[name]" section: the header and all lines up to the next section.
// 0 (also when absent or the file is missing), -1.
int VLIBCFileRemoveSection(const char* path, const char* name);
// One key of one section: length (> 0) of the value, 0 absent or empty, -1 error.
int VLIBCFileGetSectionValue(const char* path, const char* section, const char* key, char* buf,
                             int size);
// Sets one key of one section: an existing line keeps its indentation and quotes; a new key
// takes the indentation of the section's first key line, unquoted "key=value"; a missing section
// is appended. 0, -1.
int VLIBCFileSetSectionValue(const char* path, const char* section, const char* key,
                             const char* value);
// Writes "[name]\n" and each key of hash with fmt to an open stream. 0 success, -1 failure.
int VLIBCFileHash2File(FILE* fp, const char* name, PVLIBSZHASH hash, const char* fmt);

// Appends line when no line equals it (after trimming; with unique 0 it always appends); makes a
// missing file. 1 success, 0 failure.
int VLIBCFileAddLine(const char* path, int flags, const char* line, int unique);
// Drops every line equal to text after trimming. 0 (also when absent or the file is missing), -1.
int VLIBCFileRemoveLine(const char* path, const char* text);
// Removes a leading UTF-8 BOM in place (atomically; no rewrite without a BOM). 0, -1.
int VLIBCFileUTF8BomStrip(const char* path);
// Copies the regular file src to dst atomically. dst gets mode (when > 0) or the mode of src.
// 0 success, -1 failure.
int VORNFileCopy(const char* src, const char* dst, int flags, int mode);

#endif
