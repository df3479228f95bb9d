# The folders below the prefix into which cmake --install puts files. GNUInstallDirs has the others.
include(GNUInstallDirs)

# Programs and plug-ins are in one folder: a program looks for its plug-ins in its own folder. It uses its
# real path, so a link to it works from anywhere. The folder's name has no architecture, because only one
# service runs on a machine.
set(SSR_INSTALL_PROGRAMS_DIR lib/sync-service-report CACHE STRING "Folder of the service and its plug-ins")
set(SSR_INSTALL_UNITS_DIR lib/systemd/user CACHE STRING "Folder of the units of users' service managers")
set(SSR_INSTALL_TMPFILES_DIR lib/tmpfiles.d CACHE STRING "Folder of what is made at boot")
# zsh looks below /usr/local and /usr in this folder. A distribution's package sets the folder for packages.
set(SSR_INSTALL_ZSH_DIR share/zsh/site-functions CACHE STRING "Folder of the completion for zsh")
