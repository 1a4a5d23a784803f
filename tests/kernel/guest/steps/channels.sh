make_channels
diagnose complete TesselTelemonDiagnostic
channel=$(sed -n 5p /rig/channels)
# A process in the group uses processor time, which the group counts.
sh -c 'echo $$ >"$1/cgroup.procs"; i=0; while [ $i -lt 2000 ]; do i=$((i + 1)); done' - "/sys/fs/cgroup/$channel"
diagnose raised TesselTelemonDiagnostic
remake_channels
rmdir "/sys/fs/cgroup/$(sed -n 7p /rig/channels)"
diagnose missing TesselTelemonDiagnostic
remake_channels
diagnose next TesselTelemonDiagnostic
sed -n '5p;7p' /rig/channels >"$out/chosen"
