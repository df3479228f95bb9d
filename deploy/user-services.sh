# For the maintainer scripts of packages: restarts users' services, or stops them. To be sourced, by any POSIX
# shell, as root. It talks to each user's service manager as that user, through the manager's own socket. So
# it needs no system bus, and a user who puts something else in the socket's place deceives only themselves.

ssr_unit=sync-service-report.service
ssr_program=/usr/lib/sync-service-report/SyncServiceReport

# ssr_each_manager COMMAND...: runs systemctl --user COMMAND... for each user whose manager runs.
ssr_each_manager() {
    command -v systemctl >/dev/null || return 0
    for ssr_runtime in /run/user/*; do
        [ -S "$ssr_runtime/systemd/private" ] || continue
        ssr_uid=${ssr_runtime##*/}
        ssr_gid=$(getent passwd "$ssr_uid" | cut -d: -f4)
        [ -n "$ssr_gid" ] || continue
        # A manager that hangs must not stop the installation of the package.
        timeout 20 setpriv --reuid "$ssr_uid" --regid "$ssr_gid" --init-groups \
            env XDG_RUNTIME_DIR="$ssr_runtime" systemctl --user --quiet "$@" </dev/null || true
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

restart_user_services() {
    ssr_each_manager daemon-reload
    ssr_each_manager try-restart "$ssr_unit"
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

stop_user_services() {
    ssr_each_manager stop "$ssr_unit"
    for ssr_process in $(ssr_processes); do
        kill "$ssr_process" 2>/dev/null || true
    done
}
