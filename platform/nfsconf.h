// The platform's NFS configuration library: settings, ID map, keytab, export rules.
//
// Every operation answers a negative value (or null) on failure; the reason is then in the error
// facility of core.h. Layouts are part of the binary contract: integers are 32 bits wide in the
// platform's byte order, texts have their given lengths, pointers the target's width.
#ifndef VORN_PLATFORM_NFSCONF_H
#define VORN_PLATFORM_NFSCONF_H

#include <stddef.h>
#include <stdint.h>

#include "core.h"

extern "C" {

// ---------------------------------------------------------------------------------------------
// The NFS configuration record. The caller provides it. A writer reads the record, changes its own
// fields and writes all of it back. Switches are true when non-zero and written as 0 or 1.

typedef struct NFSConfRecord {
  int32_t read_size;             // largest READ transfer in bytes; 0: the kernel's choice
  int32_t write_size;            // largest WRITE transfer in bytes; 0: the kernel's choice
  char kerberos_principal[516];  // the server's own principal, "" when there is none
  int32_t enable_nfs_v4;
  // Whether the server asks its own user database for a user's groups instead of believing the
  // list, cut to 16 groups, that a client sends (rpc.mountd(8), manage-gids).
  int32_t unix_pri_enable;
  int32_t statd_port;          // rpc.statd(8), TCP and UDP
  int32_t nlm_port;            // the kernel's lock manager, TCP and UDP
  int32_t custom_port_enable;  // whether the two ports are used; off, the system chooses
} NFSConfRecord;

static_assert(sizeof(NFSConfRecord) == 544, "record layout");
static_assert(offsetof(NFSConfRecord, write_size) == 4, "record layout");
static_assert(offsetof(NFSConfRecord, kerberos_principal) == 8, "record layout");
static_assert(offsetof(NFSConfRecord, enable_nfs_v4) == 524, "record layout");
static_assert(offsetof(NFSConfRecord, unix_pri_enable) == 528, "record layout");
static_assert(offsetof(NFSConfRecord, statd_port) == 532, "record layout");
static_assert(offsetof(NFSConfRecord, nlm_port) == 536, "record layout");
static_assert(offsetof(NFSConfRecord, custom_port_enable) == 540, "record layout");

// Fills the whole record; what is not configured has the service's default.
int VORNNFSConfGet(NFSConfRecord* record);

// Stores the whole record, unless the settings were edited by hand since this thread read a record: that edit is in
// none of its fields and would be lost. The running service takes no notice until it is restarted, or told by
// one of the two operations below.
int VORNNFSConfSet(const NFSConfRecord* record);

// Applies the transfer sizes to the running service without interrupting its clients; what cannot
// be applied that way takes effect at the service's next start, and the log says so.
int VORNNFSUDPPrefSizeSet(int read_size, int write_size);

// Applies the UNIX-permission switch (0 or 1) to the running service, in the same way.
int VORNNFSUNIXPriEnableSet(int enable);

// ---------------------------------------------------------------------------------------------
// The ID-map record: idmapd.conf(5).

typedef struct _tag_nfs_id_map_ {
  // The NFSv4 domain, from malloc(3). A caller that replaces it frees the old text and stores a
  // copy made with strdup(3). Null when the platform cannot tell one.
  char* domain;
  void* platform[4];  // the platform's own, passed back untouched
  // Static mappings from a Kerberos principal to a local user's name; may be null.
  KLIBSZHASH* table;
} _tag_nfs_id_map_;

static_assert(offsetof(_tag_nfs_id_map_, domain) == 0, "record layout");
static_assert(offsetof(_tag_nfs_id_map_, table) == 5 * sizeof(void*), "domain and four words come first");

// The stored ID map, or null. The record, its domain and its table belong to the caller and go with
// one VORNNFSIDMapFree. From get to free the calling thread holds the configuration context (see
// VornConf): nobody else can write, so a read-modify-write loses nothing. Free it in the thread
// that got it.
_tag_nfs_id_map_* VORNNFSIDMapGet(void);

// Stores domain and table in the file at `path`, "/etc/idmapd.conf", and makes sure that static
// mappings are honoured as soon as there is one. Comments and foreign settings stay. A domain, a
// principal or a name that the file's syntax cannot carry is refused before anything is written; so
// is a new domain or principal that its readers have no room for, or that looks like something else.
int VORNNFSIDMapSet(const char* path, const _tag_nfs_id_map_* record);

// Releases a record and lets the next writer in. Null is allowed.
void VORNNFSIDMapFree(_tag_nfs_id_map_* record);

// Puts the stored static mappings into `hash`: those whose principal or local name contains
// `filter`, ignoring case, or all of them when it is null.
int VORNNFSStaticMapGet(KLIBSZHASH** hash, const char* filter);

// Adds every pair of `pairs` to `table`; the value of a key that is there is replaced.
int VORNNFSStaticMapAppend(KLIBSZHASH** table, const KLIBSZHASH* pairs);

// Removes the listed principals from `table`; one that is not mapped is no failure.
int VORNNFSStaticMapRemove(KLIBSZHASH* table, const KLIBSZLIST* principals);

// ---------------------------------------------------------------------------------------------
// Kerberos.

// Non-zero when the NFS service can authenticate by Kerberos (RPCSEC_GSS, RFC 2203).
int VORNNFSSupportKerberos(void);

enum {
  VORNNFS_KEYTAB_FAILED = -1,    // anything but a faulty file
  VORNNFS_KEYTAB_NO_KEYTAB = -2  // the file is no keytab
};

// Checks the keytab at `path` to its last entry and installs it as the server's keytab, atomically.
// The server's principal in the NFS configuration record follows. The file at `path` stays.
// `path` is taken as it is, not below the root: the web server named it.
int VORNNFSKeytabImport(const char* path);

// One key of a keytab, in a list; only these fields are the caller's to read.
typedef struct KeytabEntry {
  int32_t version;      // key version number (kvno)
  char principal[514];  // "nfs/box.example@EXAMPLE"
  char enc_type[66];    // RFC 3961 name, "aes256-cts-hmac-sha1-96"
  struct KeytabEntry* next;
} KeytabEntry;

static_assert(offsetof(KeytabEntry, principal) == 4, "record layout");
static_assert(offsetof(KeytabEntry, enc_type) == 518, "record layout");
static_assert(offsetof(KeytabEntry, next) == 584, "record layout");

// Lists the keys of the keytab at `path`, in file order. The list (null when there is no key, or no file)
// belongs to the caller, also when the operation failed half-way, and goes with one
// VORNNFSKeytabInfoFree.
int VORNNFSKeytabInfoGet(const char* path, KeytabEntry** list);
void VORNNFSKeytabInfoFree(KeytabEntry* list);

// ---------------------------------------------------------------------------------------------
// Export rules of one share: exports(5). Head and rules are from malloc(3), one block each, and
// whoever made them, VORNNFSRuleExtFree frees them.

enum { VORNNFS_SQUASH_ROOT = 0, VORNNFS_SQUASH_ADMIN = 1, VORNNFS_SQUASH_GUEST = 2, VORNNFS_SQUASH_ALL_ADMIN = 3 };
enum { VORNNFS_WRITE_ASYNC = 0, VORNNFS_WRITE_SYNC = 1 };

typedef struct ExportRule {
  char client[1024];  // as exports(5) names a client
  int32_t privilege;  // 1: read-write, 0: read-only
  // Who a client's users are on the box. ROOT: root stays root; ADMIN, GUEST: root becomes the
  // administrator's or the guest account; ALL_ADMIN: everybody becomes the administrator's account.
  int32_t squash;
  int32_t write_mode;  // VORNNFS_WRITE_…
  int32_t insecure;    // 1: requests from ports of 1024 and above are taken
  int32_t crossmnt;    // 1: file systems mounted below are seen
  int32_t krb5;        // accepted security flavours: 1 or 0 each
  int32_t krb5i;
  int32_t krb5p;
  int32_t sys;
  struct ExportRule* next;  // null on the last rule
} ExportRule;

typedef struct ExportRuleList {
  char path[508];     // the share's path
  ExportRule* first;  // null when the share has no rule
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

// The rules of the share at `path`, from all its lines of the exports file at `file`
// ("/etc/exports"), in file order. Positive: `*list` holds them. Zero: there are none, and `*list`
// may be left as it was. Negative: failure; `*list` is the caller's to free if it was set.
int VORNNFSRuleExtGet(const char* file, const char* path, ExportRuleList** list);

// Replaces every rule of the share at `path` in the exports file by those of `list`, or removes
// them when it is null. A rule that exports(5) cannot carry is refused and nothing is written.
int VORNNFSRuleExtSetAll(const char* path, const ExportRuleList* list);

// Frees a list and its rules. Null is allowed.
void VORNNFSRuleExtFree(ExportRuleList* list);

}  // extern "C"

#endif  // VORN_PLATFORM_NFSCONF_H
