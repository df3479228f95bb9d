# For the maintainer scripts of packages: restarts users' services, or stops them. To be sourced, by any POSIX
# shell, as root. It talks to each user's service manager as that user, through the manager's own socket. So
# it needs no system bus, and a user who puts something else in the socket's place deceives only themselves.

ssr_unit=sync-service-report.service
ssr_program=/usr/lib/sync-service-report/SyncServiceReport

# ssr_managers: the ids of the users whose service manager runs.
ssr_managers() {
    command -v systemctl >/dev/null || return 0
    for ssr_runtime in /run/user/*; do
        [ -S "$ssr_runtime/systemd/private" ] && echo "${ssr_runtime##*/}"
    done
    return 0
}

# ssr_manager UID COMMAND...: runs systemctl --user COMMAND... for one user. It succeeds when that succeeds.
ssr_manager() {
    ssr_uid=$1
    shift
    ssr_gid=$(getent passwd "$ssr_uid" | cut -d: -f4)
    [ -n "$ssr_gid" ] || return 1
    # A manager that hangs must not stop the installation of the package.
    timeout 20 setpriv --reuid "$ssr_uid" --regid "$ssr_gid" --init-groups \
        env XDG_RUNTIME_DIR="/run/user/$ssr_uid" systemctl --user --quiet "$@" </dev/null
}

# ssr_each_manager COMMAND...: runs systemctl --user COMMAND... for each user whose manager runs.
ssr_each_manager() {
    for ssr_user in $(ssr_managers); do
        ssr_manager "$ssr_user" "$@" || true
    done
}

# ssr_processes: the ids of processes that run the installed service, also when its file has been replaced.
ssr_processes() {
    for ssr_process in /proc/[0-9]*; do
        case $(readlink "$ssr_process/exe" 2>/dev/null || true) in
        "$ssr_program" | "$ssr_program (deleted)" | "$ssr_program.dpkg-"*) echo "${ssr_process##*/}" ;;
        esac
    done
}

# ssr_waiting: the ids of the users whose unit waits for the machine's lock. Such a unit runs reportctl.
ssr_waiting() {
    for ssr_user in $(ssr_managers); do
        ssr_pid=$(ssr_manager "$ssr_user" show --value --property MainPID "$ssr_unit" || true)
        case $(readlink "/proc/${ssr_pid:-0}/exe" 2>/dev/null || true) in
        */reportctl | */reportctl' (deleted)' | */reportctl.dpkg-*) echo "$ssr_user" ;;
        esac
    done
}

# A unit that waits takes the lock as soon as the service that holds it ends. So the units that wait are
# stopped while that service is restarted. Otherwise the reports of all users would go to another user's
# database after an upgrade.
restart_user_services() {
    ssr_each_manager daemon-reload
    ssr_stopped=$(ssr_waiting)
    for ssr_user in $ssr_stopped; do
        ssr_manager "$ssr_user" stop "$ssr_unit" || true
    done
    ssr_each_manager try-restart "$ssr_unit"
    for ssr_user in $ssr_stopped; do
        ssr_manager "$ssr_user" start "$ssr_unit" || true
    done
    # A process that no manager controls was started by the suite. The suite may not start it again before the
    # next login, so it is not stopped here.
    for ssr_process in $(ssr_processes); do
        case $(readlink "/proc/$ssr_process/exe" 2>/dev/null || true) in
        *' (deleted)' | *.dpkg-*)
            echo "Process $ssr_process of $(stat -c %U "/proc/$ssr_process") still runs the version before." \
                "It takes the new one when it is started again."
            ;;
        esac
    done
}

# The timers, too: a timer that runs would go on starting a program that is no longer there.
stop_user_services() {
    ssr_each_manager stop 'sync-service-report*.timer' 'sync-service-report*.service'
    for ssr_process in $(ssr_processes); do
        kill "$ssr_process" 2>/dev/null || true
    done
}
