# Where cmake --install puts things, below the prefix; GNUInstallDirs knows the rest.
include(GNUInstallDirs)

# Programs and plug-ins together: a program looks for its plug-ins beside itself, by its real path, so that a link to it
# works from anywhere. Not below a folder of the machine's architecture: only one service runs on a machine.
set(SSR_INSTALL_PROGRAMS_DIR lib/sync-service-report CACHE STRING "Folder of the service and its plug-ins")
set(SSR_INSTALL_UNITS_DIR lib/systemd/user CACHE STRING "Folder of the units of users' service managers")
set(SSR_INSTALL_TMPFILES_DIR lib/tmpfiles.d CACHE STRING "Folder of what is made at boot")
