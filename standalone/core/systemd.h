// Whether systemd keeps this machine's services.
#ifndef VELT_STANDALONE_CORE_SYSTEMD_H
#define VELT_STANDALONE_CORE_SYSTEMD_H

namespace velt {

/// Whether supervisors are units of systemd's here: processes of its own, which see the machine's mounts and
/// not those of who asks for them. Otherwise they are children of the process that starts them.
bool systemdKeepsSupervisors();

} // namespace velt

#endif
