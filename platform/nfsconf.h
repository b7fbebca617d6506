// The platform's NFS configuration library: settings, ID map, keytab, export rules.
//
// Errors: an operation returns a negative value, or null, on failure. The reason is then in the error facility
// (core.h). Ownership and thread safety are those of core.h. The record layouts are part of the binary contract:
// integers have 32 bits in the platform's byte order, strings have the given lengths, and pointers have the width of
// the target.
#ifndef VORN_PLATFORM_NFSCONF_H
#define VORN_PLATFORM_NFSCONF_H

#include <stddef.h>
#include <stdint.h>

#include "core.h"

extern "C" {

// ---------------------------------------------------------------------------------------------
// The NFS configuration record: nfs.conf(5). The caller provides the memory. A writer reads the record, changes its own
// fields and writes the whole record back. Switches are true if they are non-zero, and written as 0 or 1.

typedef struct NFSConfRecord {
  int32_t read_size;             // largest READ transfer in bytes (nfs(5), rsize); 0: the default of the kernel
  int32_t write_size;            // largest WRITE transfer in bytes (nfs(5), wsize); 0: the default of the kernel
  char kerberos_principal[516];  // principal of the NFS service, or "" if there is none
  int32_t enable_nfs_v4;
  // The server looks up the groups of a user in its own user database. It ignores the list that the client sends, which
  // has at most 16 groups (rpc.mountd(8), manage-gids).
  int32_t unix_pri_enable;
  int32_t statd_port;          // port of rpc.statd(8), TCP and UDP
  int32_t nlm_port;            // port of the kernel's lock manager, TCP and UDP
  int32_t custom_port_enable;  // use the two fixed ports; otherwise the system chooses
} NFSConfRecord;

static_assert(sizeof(NFSConfRecord) == 544, "record layout");
static_assert(offsetof(NFSConfRecord, write_size) == 4, "record layout");
static_assert(offsetof(NFSConfRecord, kerberos_principal) == 8, "record layout");
static_assert(offsetof(NFSConfRecord, enable_nfs_v4) == 524, "record layout");
static_assert(offsetof(NFSConfRecord, unix_pri_enable) == 528, "record layout");
static_assert(offsetof(NFSConfRecord, statd_port) == 532, "record layout");
static_assert(offsetof(NFSConfRecord, nlm_port) == 536, "record layout");
static_assert(offsetof(NFSConfRecord, custom_port_enable) == 540, "record layout");

// Fills the whole record. Settings that are not configured have the default of the service.
int VORNNFSConfGet(NFSConfRecord* record);

// Stores the whole record. Within a configuration context (VornConf) it fails if the settings were edited by hand after
// the context read them, because the edit would be lost. A running service adopts the settings at its next start, or by
// one of the two operations below.
int VORNNFSConfSet(const NFSConfRecord* record);

// Applies the transfer sizes, in bytes, to the running service without interrupting its clients. Sizes that cannot be
// applied that way take effect at the next start of the service; the log says so.
int VORNNFSUDPPrefSizeSet(int read_size, int write_size);

// Applies the switch `unix_pri_enable` (0 or 1) to the running service under the same conditions.
int VORNNFSUNIXPriEnableSet(int enable);

// ---------------------------------------------------------------------------------------------
// The ID-map record: idmapd.conf(5).

typedef struct _tag_nfs_id_map_ {
  // The NFSv4 domain, allocated with malloc(3), or null if the platform cannot determine it. A caller that replaces it
  // frees the old string and stores a copy made with strdup(3).
  char* domain;
  void* platform[4];  // private members of the platform; callers must not change them
  // Static mappings: Kerberos principal to name of a local user. May be null.
  KLIBSZHASH* table;
} _tag_nfs_id_map_;

static_assert(offsetof(_tag_nfs_id_map_, domain) == 0, "record layout");
static_assert(offsetof(_tag_nfs_id_map_, table) == 5 * sizeof(void*), "domain and four words come first");

// Returns the stored ID map, or null on failure. The record, its domain and its table belong to the caller, who
// releases them with one VORNNFSIDMapFree, in the same thread. Until then the thread holds the configuration lock (see
// VornConf).
_tag_nfs_id_map_* VORNNFSIDMapGet(void);

// Stores the domain and the table in the file at `path`, "/etc/idmapd.conf". Enables static mappings in the file as
// soon as the table has one. Comments and settings of other programs stay. Before anything is written, the operation
// refuses a domain, principal or name that the syntax of the file cannot represent, and a new domain or principal that
// is too long for the readers of the file or confusable with another one.
int VORNNFSIDMapSet(const char* path, const _tag_nfs_id_map_* record);

// Releases a record and its share of the configuration lock. Accepts null.
void VORNNFSIDMapFree(_tag_nfs_id_map_* record);

// Adds the stored static mappings to `hash`. If `filter` is not null, adds only those whose principal or local name
// contains it, ignoring case. The hash may move.
int VORNNFSStaticMapGet(KLIBSZHASH** hash, const char* filter);

// Adds every pair of `pairs` to `table`. The value of an existing key is replaced. The table may move.
int VORNNFSStaticMapAppend(KLIBSZHASH** table, const KLIBSZHASH* pairs);

// Removes the listed principals from `table`. A principal that is not mapped is not an error.
int VORNNFSStaticMapRemove(KLIBSZHASH* table, const KLIBSZLIST* principals);

// ---------------------------------------------------------------------------------------------
// Kerberos.

// Returns a non-zero value if the NFS service supports authentication by Kerberos (RPCSEC_GSS, RFC 2203).
int VORNNFSSupportKerberos(void);

enum {
  VORNNFS_KEYTAB_FAILED = -1,    // a failure other than the next one
  VORNNFS_KEYTAB_NO_KEYTAB = -2  // the file is not a valid keytab
};

// Checks all entries of the keytab at `path` and installs the file atomically as the keytab of the NFS service. Sets
// the principal of the NFS configuration record to that of the keytab. The file at `path` stays. `path` is one of
// this system: without a call context (call.h) any path, with one that of an upload of the call; every other path is
// below the root. Returns one of the values above on failure, and a non-negative value on
// success.
int VORNNFSKeytabImport(const char* path);

// One key of a keytab, in a linked list. The members behind these belong to the platform.
typedef struct KeytabEntry {
  int32_t version;           // key version number (kvno)
  char principal[514];       // "nfs/box.example@EXAMPLE"
  char enc_type[66];         // RFC 3961 name, "aes256-cts-hmac-sha1-96"
  struct KeytabEntry* next;  // null in the last entry
} KeytabEntry;

static_assert(offsetof(KeytabEntry, principal) == 4, "record layout");
static_assert(offsetof(KeytabEntry, enc_type) == 518, "record layout");
static_assert(offsetof(KeytabEntry, next) == 584, "record layout");

// Stores the keys of the keytab at `path` in `*list`, in file order (klist(1), option -k). `*list` stays null if the
// file has no key or does not exist. The list belongs to the caller, also after a failure, who releases it with one
// VORNNFSKeytabInfoFree.
int VORNNFSKeytabInfoGet(const char* path, KeytabEntry** list);
void VORNNFSKeytabInfoFree(KeytabEntry* list);

// ---------------------------------------------------------------------------------------------
// Export rules of one share: exports(5). The list and each rule are separate blocks of malloc(3). VORNNFSRuleExtFree
// frees them, whether the module or the platform allocated them.

enum { VORNNFS_SQUASH_ROOT = 0, VORNNFS_SQUASH_ADMIN = 1, VORNNFS_SQUASH_GUEST = 2, VORNNFS_SQUASH_ALL_ADMIN = 3 };
enum { VORNNFS_WRITE_ASYNC = 0, VORNNFS_WRITE_SYNC = 1 };

typedef struct ExportRule {
  char client[1024];  // a client in the syntax of exports(5)
  int32_t privilege;  // 1: read-write, 0: read-only
  // The mapping of the client's users. ROOT: root stays root. ADMIN and GUEST: root is mapped to the administrator or
  // the guest account. ALL_ADMIN: all users are mapped to the administrator account.
  int32_t squash;
  int32_t write_mode;  // VORNNFS_WRITE_…
  int32_t insecure;    // 1: requests from ports from 1024 on are accepted
  int32_t crossmnt;    // 1: clients may enter file systems that are mounted below the share
  int32_t krb5;        // accepted security flavours (RFC 5531): 1 or 0 each
  int32_t krb5i;
  int32_t krb5p;
  int32_t sys;
  struct ExportRule* next;  // null in the last rule
} ExportRule;

typedef struct ExportRuleList {
  char path[508];     // the share's path
  ExportRule* first;  // null if the share has no rule
} ExportRuleList;

static_assert(offsetof(ExportRule, privilege) == 1024, "record layout");
static_assert(offsetof(ExportRule, squash) == 1028, "record layout");
static_assert(offsetof(ExportRule, write_mode) == 1032, "record layout");
static_assert(offsetof(ExportRule, insecure) == 1036, "record layout");
static_assert(offsetof(ExportRule, crossmnt) == 1040, "record layout");
static_assert(offsetof(ExportRule, krb5) == 1044, "record layout");
static_assert(offsetof(ExportRule, krb5i) == 1048, "record layout");
static_assert(offsetof(ExportRule, krb5p) == 1052, "record layout");
static_assert(offsetof(ExportRule, sys) == 1056, "record layout");
static_assert(sizeof(void*) != 4 || (sizeof(ExportRule) == 1064 && offsetof(ExportRule, next) == 1060),
              "record layout");
static_assert(sizeof(void*) != 4 || (sizeof(ExportRuleList) == 512 && offsetof(ExportRuleList, first) == 508),
              "record layout");

// Reads the rules of the share at `path` from all its lines in the exports file `file`, in file order. "/etc/exports"
// includes the files of /etc/exports.d. Where the security flavours of a client differ, the fields of its rule have the
// widest access of any of them. Returns a positive value if `*list` contains the rules; 0 if there are none, and
// `*list` may be unchanged; a negative value on failure, also for a path of more than 507 bytes. The list belongs to
// the caller, also after a failure if it was set.
int VORNNFSRuleExtGet(const char* file, const char* path, ExportRuleList** list);

// Replaces all rules of the share at `path` in the exports file by those of `list`. A null `list` removes them. Of a
// client that has a rule, only the fields that differ from that rule are changed. The operation fails and writes
// nothing for a rule that exports(5) cannot represent, a changed or missing rule of a file in /etc/exports.d, a changed
// rule on a line that is not understood, a change that is ambiguous because the client's security flavours differ, and
// a path of more than 507 bytes. The list stays the caller's.
int VORNNFSRuleExtSetAll(const char* path, const ExportRuleList* list);

// Frees a list and its rules. Accepts null.
void VORNNFSRuleExtFree(ExportRuleList* list);

}  // extern "C"

#endif  // VORN_PLATFORM_NFSCONF_H
