// The FTP configuration library: the settings of the FTP and FTPS services, the shares offered to FTP,
// the chroot users and the chroot rules.
//
// Results are negative on failure unless an operation says otherwise. The library reports no last error
// for the settings; the share, user and rule operations set the core library's.
// Threads: every operation may be called from any thread.
#ifndef VELT_FTP_FTP_LIBRARY_H
#define VELT_FTP_FTP_LIBRARY_H

#include "platform/core.h"

#include <assert.h>
#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/// Bits of the record's service_flags; the others are carried as they are.
enum {
    VELT_FTP_SERVICE_PLAIN = 1, ///< the plain FTP service is enabled
    VELT_FTP_SERVICE_TLS = 2    ///< the FTPS service is enabled
};

/// The FTP configuration record, exchanged whole. Texts are NUL-terminated; a boolean reads as true when
/// it is non-zero and is written as 0 or 1.
typedef struct _tag_VELT_FTP_CONF_ {
    char portnum[8];                  ///< control port, decimal digits
    char anonymous_chroot_share[492]; ///< name of the share that anonymous users are confined to
    int32_t use_ext_ip;               ///< boolean: passive mode announces the external address
    int32_t enable_flow_ctrl;         ///< boolean: the two rates are in force
    int32_t maxuploadrate;            ///< KB/s
    int32_t maxdownloadrate;          ///< KB/s
    int32_t anonymous;                ///< boolean: anonymous login is allowed
    int32_t anonymous_chroot;         ///< boolean: anonymous users are confined to the share above
    int32_t passive_port_min;         ///< first port of the custom passive range
    int32_t passive_port_max;         ///< last port; without both ports there is no custom range
    int32_t service_flags;            ///< VELT_FTP_SERVICE_ bits
    int32_t support_utf8;             ///< boolean: UTF-8 file names are supported
    int32_t max_conn_per_ip;          ///< connections from one client address; 0: no limit
    int32_t reserved;                 ///< carried unchanged
    int32_t enable_fxp;               ///< boolean: server-to-server transfers are allowed
    int32_t user_chroot;              ///< boolean: local users are confined to their home folders
} _tag_VELT_FTP_CONF_;

static_assert(sizeof(_tag_VELT_FTP_CONF_) == 556, "the record has 556 bytes");
static_assert(offsetof(_tag_VELT_FTP_CONF_, portnum) == 0, "portnum");
static_assert(offsetof(_tag_VELT_FTP_CONF_, anonymous_chroot_share) == 8, "anonymous_chroot_share");
static_assert(offsetof(_tag_VELT_FTP_CONF_, use_ext_ip) == 500, "use_ext_ip");
static_assert(offsetof(_tag_VELT_FTP_CONF_, enable_flow_ctrl) == 504, "enable_flow_ctrl");
static_assert(offsetof(_tag_VELT_FTP_CONF_, maxuploadrate) == 508, "maxuploadrate");
static_assert(offsetof(_tag_VELT_FTP_CONF_, maxdownloadrate) == 512, "maxdownloadrate");
static_assert(offsetof(_tag_VELT_FTP_CONF_, anonymous) == 516, "anonymous");
static_assert(offsetof(_tag_VELT_FTP_CONF_, anonymous_chroot) == 520, "anonymous_chroot");
static_assert(offsetof(_tag_VELT_FTP_CONF_, passive_port_min) == 524, "passive_port_min");
static_assert(offsetof(_tag_VELT_FTP_CONF_, passive_port_max) == 528, "passive_port_max");
static_assert(offsetof(_tag_VELT_FTP_CONF_, service_flags) == 532, "service_flags");
static_assert(offsetof(_tag_VELT_FTP_CONF_, support_utf8) == 536, "support_utf8");
static_assert(offsetof(_tag_VELT_FTP_CONF_, max_conn_per_ip) == 540, "max_conn_per_ip");
static_assert(offsetof(_tag_VELT_FTP_CONF_, reserved) == 544, "reserved");
static_assert(offsetof(_tag_VELT_FTP_CONF_, enable_fxp) == 548, "enable_fxp");
static_assert(offsetof(_tag_VELT_FTP_CONF_, user_chroot) == 552, "user_chroot");

/// A range of TCP ports, both ends included.
typedef struct VELT_FTP_PORT_RANGE {
    int32_t first;
    int32_t last;
} VELT_FTP_PORT_RANGE;

static_assert(sizeof(VELT_FTP_PORT_RANGE) == 8, "a range is two int32");
static_assert(offsetof(VELT_FTP_PORT_RANGE, first) == 0, "first");
static_assert(offsetof(VELT_FTP_PORT_RANGE, last) == 4, "last");

/// Fills the whole record with the stored settings. Negative on failure.
int VELTFTPConfGet(_tag_VELT_FTP_CONF_* out);

/// Stores the record, which becomes the service configuration; running daemons take it up at their next
/// start. Negative on failure, which leaves the stored record as it was. A platform whose settings are
/// changed by several callers may store those fields (of service_flags, those bits) alone in which the record
/// differs from what the calling thread last read or stored, so that what another caller changed since stays.
int VELTFTPConfSet(_tag_VELT_FTP_CONF_ conf);

/// The idle time-out. The platform settles its unit; callers pass it on as it is, a negative one too.
int VELTFTPTimeOutGet(void);
/// Negative on failure.
int VELTFTPTimeOutSet(int timeout);

/// Whether sessions use UTF-8 from the start: 0 off, any other result (a negative one too) on.
int VELTFTPUseUTF8Get(void);
/// 1 on, 0 off. Negative on failure.
int VELTFTPUseUTF8Set(int enable);

/// Whether only FIPS-approved algorithms are used: 0 off, positive on, negative on failure.
int VELTFTPFIPSEnabledGet(void);
/// 1 on, 0 off. Negative on failure.
int VELTFTPFIPSEnabledSet(int enable);

/// Whether ASCII transfers convert line ends: 0 off, any other result on.
int VELTFTPASCIIEnabledGet(void);
/// 1 on, 0 off. Negative on failure.
int VELTFTPASCIIEnabledSet(int enable);

/// Whether the server applies its umask to uploads: 0 off, any other result on.
int VELTFTPUmaskEnabledGet(void);
/// Negative on failure.
int VELTFTPUmaskEnabledSet(bool enable);

/// Fills the passive range that is in force without a custom one. Negative on failure, which leaves the range
/// as it was; callers do not check it.
int VELTFTPDefaultPassivePortGet(VELT_FTP_PORT_RANGE* out);

/// Fills the list, which is handed over empty, with the names of the shares that the mask `selection` selects
/// (0x207: those offered to FTP). May replace `*list`; the caller frees what stands there afterwards, also
/// after a failure. Negative on failure.
int VELTFTPShareEnum(VLIBCSzList** list, int selection);

/// Fills the list, which is handed over empty, with the names of the chroot users of `source` (1 local, 2
/// domain, 8 LDAP, or a union of these), narrowed to names that contain `substr`, in whatever letter case,
/// and to the domain `domain` where these are not null. May replace `*list`; the caller frees what stands
/// there afterwards, also after a failure. Negative on failure.
int VELTFTPChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain);

/// The same for the users who are not chroot users.
int VELTFTPNonChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain);

/// Makes every user named in the list a chroot user. A name may stand there twice. Negative on failure, a
/// name that no user has among them, which leaves all users as they were.
int VELTFTPAddChrootUser(VLIBCSzList* list);

/// Takes the chroot status from every user named in the list; negative as above.
int VELTFTPDeleteChrootUser(VLIBCSzList* list);

/// Fills the list, which is handed over empty, with the stored chroot rules, one line each, in stored order.
/// May replace `*list`; the caller frees what stands there afterwards, also after a failure. Negative on
/// failure.
int VELTFTPChrootRuleEnum(VLIBCSzList** list);

/// Reads one stored rule line: `*isUser` becomes non-zero for a user's rule and 0 for a group's, `name`
/// the user's or group's name, `path` the confining directory ("/share", "/share/below" or "/home").
/// The sizes count the terminating NUL. Negative when the line cannot be read.
int VELTFTPChrootRuleParseToName(const char* line, int* isUser, char* name, int nameSize, char* path,
                                 int pathSize);

/// Writes one rule line for the user (`isUser` 1) or group (0) with the numeric `id` into `buf` of `size`
/// bytes, in the form that VELTFTPChrootRuleParseToName reads. Negative on failure.
int VELTFTPChrootRuleFormat(char* buf, int size, int isUser, int id, const char* path);

/// Stores exactly the rule lines of the list, in its order, in place of all stored rules. Negative on
/// failure.
int VELTFTPChrootRuleSave(VLIBCSzList* list);

#ifdef __cplusplus
}
#endif

#endif
