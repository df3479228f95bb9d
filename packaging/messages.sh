# For ./run: sends the service one message of each kind and shows where each ended, as it is found in the store, the
# outbox and the log. Sourced; needs bash.

# wait_for COMMAND...: until the command succeeds, for ten seconds at the most.
wait_for() {
    local tries
    for ((tries = 0; tries < 200; tries++)); do
        if "$@"; then
            return 0
        fi
        sleep 0.05
    done
    return 1
}

send() {
    printf '%s' "$1" >/dev/udp/127.0.0.1/9997
}

# in_log TEXT: the log's lines with that text; fails when there is none. Rotated files are part of the log.
in_log() {
    grep -hF -- "$1" "$log_directory"/Report*.log
}

query() {
    sqlite3 -readonly -cmd '.timeout 5000' "$1" "$2" 2>/dev/null
}

# show TITLE MESSAGE
show() {
    printf '\n%s\n  sent  %s\n' "$1" "$2"
}

# found WHERE COMMAND...: waits until the command prints something, and shows it.
found() {
    local where=$1
    shift
    if wait_for found_quietly "$@"; then
        "$@" | tail -n 1 | sed "s/^/  $where  /"
    else
        echo "  $where  NOT FOUND within ten seconds"
        missing=$((missing + 1))
    fi
}

found_quietly() {
    [ -n "$("$@" 2>/dev/null)" ]
}

# send_and_show DATA_DIRECTORY: true when each message ended where it belongs.
send_and_show() {
    local store=$1/database/Report.db outbox=$1/database/MetrikOutbox.db
    local log_directory=$1/log/metrik
    local id message missing=0
    id=$(date +%s%N)

    message='{"eventID":"DEMO|'$id'","value":{"page":"start"},"createTime":'${id:0:13}'}'
    show "A report for the local store" "$message"
    send "$message"
    found "row " query "$store" "select id, eventID, value, createTime, pType, extData3, extData4 from OperLog
        where eventID='DEMO|$id'"
    found "log " in_log "$message"

    # An event that a collector took has left the outbox; the module's count tells that it was there.
    local before
    before=$(query "$outbox" "select last_sequence from module where module_id='A759'")
    message='{"eventID":"A759|'$id'","value":{"page":"start"},"createTime":'${id:0:10}'}'
    show "A report for analytics" "$message"
    send "$message"
    found "event" query "$outbox" "select 'number ' || last_sequence || ' of module A759, ' || coalesce(
            (select 'waiting as ' || uuid || ': ' || payload from event where event_id='A759|$id'), 'uploaded already')
        from module where module_id='A759' and last_sequence > ${before:-0}"

    message='{"msgType":"init","exdata":{"moduleID":"DEMO'$id'","moduleVersion":"1","moduleName":"demo"}}'
    show "A module that announces itself" "$message"
    send "$message"
    found "log " in_log "Add metrik module :DEMO$id"

    # With the user and version that stand in the row above: what really is so must not change.
    local user version
    user=$(query "$store" "select extData4 from OperLog where eventID='DEMO|$id'")
    version=$(query "$store" "select extData3 from OperLog where eventID='DEMO|$id'")
    message='{"msgType":"updateOpenID","exdata":{"openID":"'$user'","hublinkVersion":"'$version'","demo":"'$id'"}}'
    show "The signed-in user" "$message"
    send "$message"
    found "log " line_after "$message" "[App/ReportServer:111 SetBaseInfo] SetBaseInfo $user-$version"

    message='{"eventID":"DEMO|'$id'", this is no JSON'
    show "A report that cannot be parsed" "$message"
    send "$message"
    found "log " line_after "$message" "[App/ReportServer:123 JsonToStruct]"

    echo
    if [ "$missing" -gt 0 ]; then
        echo "$missing of the messages did not end where they belong; the log is in $log_directory."
        return 1
    fi
    echo "Each message ended where it belongs."
}

# line_after MESSAGE TEXT: the first line of the log with that text behind the line that logs the message's arrival.
line_after() {
    cat "$log_directory"/Report.log | awk -v message="$1" -v text="$2" \
        'seen && index($0, text) { print; exit } index($0, "Recv] " message) { seen = 1 }'
}
