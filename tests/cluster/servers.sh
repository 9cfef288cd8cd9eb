# shellcheck shell=bash
# A shard of real servers on loopback for the tests of faults, set up by the files of "kelosyslog cluster init": two replicas that
# ZooKeeper keeps in step where it is installed, else one server. Sourced after tests/system/support.sh; everything is below $root.

: "${root:?}"
: "${zookeeperJars:=/usr/share/java}"
isReplicated=
[[ ! -e $zookeeperJars/zookeeper.jar ]] || isReplicated=1
hosts=(127.0.0.1)
[[ $isReplicated ]] && hosts+=(127.0.0.2) || echo "SKIPPED: faults of replicas, as ZooKeeper is not installed"

keeper_start() {
    mkdir -p "$root/keeper"
    printf '%s\n' tickTime=1000 "dataDir=$root/keeper" "clientPort=$keeperPort" clientPortAddress=127.0.0.1 \
        admin.enableServer=false >"$root/keeper/zoo.cfg"
    local jars
    jars=$(printf "$zookeeperJars/%s.jar:" zookeeper zookeeper-jute slf4j-api slf4j-nop netty-all snappy-java metrics-core)
    (cd "$root/keeper" && exec java -Xmx128m -XX:TieredStopAtLevel=1 -Dzookeeper.jmx.log4j.disable=true -cp "$jars" \
        org.apache.zookeeper.server.quorum.QuorumPeerMain zoo.cfg </dev/null >log 2>&1) &
    keeperPid=$!
    disown
}

# ask HOST STATEMENT: runs it as the administrator of the server.
ask() { curl -sS --noproxy '*' --fail-with-body -u default:p "http://$1:$httpPort/" --data-binary @- <<<"$2" 2>"$root/curl.err"; }
answers() { [[ $(ask "$1" 'SELECT 1') == 1 ]]; }

# server_launch HOST; server_start HOST waits until it answers.
declare -A serverPids
server_launch() {
    (cd "$root/new/$1" && exec clickhouse-server --config-file=config.xml </dev/null >/dev/null 2>&1) &
    serverPids[$1]=$!
    disown
}
server_start() {
    server_launch "$1"
    wait_until 30 answers "$1" || fail "no server $1: $(tail -n 5 "$root/new/$1/errors")"
}
kill_now() { kill -KILL "$1" && wait_until 10 is_gone "$1"; } # PID
is_gone() { ! kill -0 "$1" 2>/dev/null; }

# cluster_start FOLDER: all of it, with empty tables, and the data below the folder.
cluster_start() {
    local host options=()
    httpPort=$(free_port) nativePort=$(free_port) betweenPort=$(free_port) keeperPort=$(free_port)
    [[ -z $isReplicated ]] || options=(--keeper "127.0.0.1:$keeperPort")
    "$KELO_BIN_DIR/kelosyslog" cluster init "$root/new" --shard "$(IFS=,; echo "${hosts[*]}")" "${options[@]}" \
        --log-server 127.0.0.1 --http-port "$httpPort" --native-port "$nativePort" >"$root/made"
    # A replica that was killed is known as alive until its session is over.
    sed -i 's|</zookeeper>|<session_timeout_ms>2000</session_timeout_ms>&|' "$root"/new/*/config.d/kelosyslog.xml
    [[ -z $isReplicated ]] || keeper_start
    for host in "${hosts[@]}"; do
        local folder=$root/new/$host
        cat >"$folder/config.xml" <<END
<yandex><logger><level>warning</level><log>$folder/log</log><errorlog>$folder/errors</errorlog></logger>
<listen_host>$host</listen_host><http_port>$httpPort</http_port><tcp_port>$nativePort</tcp_port>
<interserver_http_port>$betweenPort</interserver_http_port><interserver_http_host>$host</interserver_http_host>
<path>$1/$host/</path><tmp_path>$folder/tmp/</tmp_path><user_files_path>$folder/files/</user_files_path>
<format_schema_path>$folder/formats/</format_schema_path><users_config>$folder/users.xml</users_config>
<default_profile>default</default_profile><default_database>default</default_database><timezone>UTC</timezone>
<mark_cache_size>67108864</mark_cache_size></yandex>
END
        cat >"$folder/users.xml" <<END
<yandex><profiles><default><max_threads>2</max_threads></default></profiles><users><default><password>p</password>
<networks><ip>127.0.0.0/8</ip></networks><profile>default</profile><quota>default</quota></default></users>
<quotas><default></default></quotas></yandex>
END
        server_launch "$host"
    done
    for host in "${hosts[@]}"; do
        wait_until 30 answers "$host" || fail "no server $host: $(tail -n 5 "$folder/errors")"
        local statement
        while IFS= read -rd ';' statement; do
            [[ -z ${statement//[[:space:]]/} ]] || wait_until 30 ask "$host" "$statement" >"$root/answer" ||
                fail "$host: $(<"$root/answer")"
        done < <(grep -v '^--' "$root/new/tables.sql")
    done
}
cluster_stop() {
    local pid
    for pid in "${serverPids[@]}" ${keeperPid:+"$keeperPid"}; do
        kill -KILL "$pid" 2>/dev/null || true
        wait_until 10 is_gone "$pid" || true
    done
}
