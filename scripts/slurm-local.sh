#!/usr/bin/env bash
# A single-node Slurm cluster on this machine, for trying `ostrel submit` and for its tests.
#
#   scripts/slurm-local.sh start   # prints the line to paste: export SLURM_CONF=...
#   scripts/slurm-local.sh stop
#
# Everything lives in one folder (OSTREL_SLURM_DIR, default /tmp/ostrel-slurm): the munge key
# and socket, slurm.conf naming this machine and its CPUs, the daemons' state, logs and process
# ids. The daemons run as root and are stopped by those ids. Needs root and the packages that
# scripts/setup.sh installs (slurm-wlm, munge).
set -euo pipefail

dir=${OSTREL_SLURM_DIR:-/tmp/ostrel-slurm}
# Ports away from a system cluster's defaults (6817, 6818), so the two never meet.
ctld_port=${OSTREL_SLURM_PORT:-16817}
node_port=$((ctld_port + 1))
ready_seconds=30

fail() {
    echo "slurm-local: $*" >&2
    exit 1
}

# Stops the daemons whose ids are in the files: all are told at once, as each takes a
# second or two to wind down, and any still running after 10 s is killed outright.
stop_daemons() {
    local file pids=()
    for file in "$@"; do
        [[ -s $file ]] && pids+=("$(<"$file")")
    done
    ((${#pids[@]})) || return 0
    kill -TERM "${pids[@]}" 2>/dev/null || true
    for _ in $(seq 100); do
        kill -0 "${pids[@]}" 2>/dev/null || break
        sleep 0.1
    done
    kill -KILL "${pids[@]}" 2>/dev/null || true
}

stop() {
    [[ -d $dir ]] || return 0
    stop_daemons "$dir/slurmd.pid" "$dir/slurmctld.pid" "$dir/munged.pid"
    rm -rf "$dir"
}

write_config() {
    local host cpus memory
    host=$(hostname -s)
    cpus=$(nproc)
    # A tenth of the memory stays with the system; the node refuses to start if it has less
    # than it declares.
    memory=$(awk '/^MemTotal:/ { print int($2 / 1024 * 0.9) }' /proc/meminfo)
    cat >"$dir/slurm.conf" <<EOF
ClusterName=ostrel-local
SlurmctldHost=$host
SlurmctldPort=$ctld_port
SlurmdPort=$node_port
SlurmUser=root
SlurmdUser=root
AuthType=auth/munge
CredType=cred/munge
AuthInfo=socket=$dir/munge.socket
StateSaveLocation=$dir/state
SlurmdSpoolDir=$dir/spool
SlurmctldPidFile=$dir/slurmctld.pid
SlurmdPidFile=$dir/slurmd.pid
SlurmctldLogFile=$dir/slurmctld.log
SlurmdLogFile=$dir/slurmd.log
# No cgroups in a container: processes are tracked by parent, tasks are not confined.
ProctrackType=proctrack/linuxproc
TaskPlugin=task/none
JobAcctGatherType=jobacct_gather/none
AccountingStorageType=accounting_storage/none
JobCompType=jobcomp/none
MailProg=/bin/true
MpiDefault=none
ReturnToService=2
# CPUs are the only resource handed out, so array tasks share the node a CPU each.
SelectType=select/cons_tres
SelectTypeParameters=CR_CPU
NodeName=$host NodeAddr=127.0.0.1 CPUs=$cpus RealMemory=$memory State=UNKNOWN
PartitionName=local Nodes=$host Default=YES MaxTime=INFINITE State=UP
EOF
}

start() {
    [[ $EUID -eq 0 ]] || fail "the daemons run as root; run this as root"
    local tool
    for tool in munged slurmctld slurmd sinfo; do
        command -v "$tool" >/dev/null ||
            fail "$tool is not installed (bash scripts/setup.sh installs slurm-wlm and munge)"
    done
    [[ -d $dir ]] && fail "$dir exists: a cluster is running or was left behind; stop it first"
    mkdir -p "$dir/state" "$dir/spool"
    chmod 700 "$dir"
    trap 'stop; fail "could not start; see the logs above"' ERR

    dd if=/dev/urandom of="$dir/munge.key" bs=1024 count=1 status=none
    chmod 400 "$dir/munge.key"
    munged --force --key-file="$dir/munge.key" --socket="$dir/munge.socket" \
        --pid-file="$dir/munged.pid" --log-file="$dir/munged.log" --seed-file="$dir/munge.seed"

    write_config
    export SLURM_CONF=$dir/slurm.conf
    slurmctld -f "$SLURM_CONF"
    slurmd -f "$SLURM_CONF"

    # Ready when the node takes work; a daemon that has ended (a port taken, say) will not be.
    local state="" daemon
    for _ in $(seq $((ready_seconds * 2))); do
        state=$(sinfo -h -o %T 2>/dev/null || true)
        [[ $state == idle || $state == mixed ]] && break
        for daemon in slurmctld slurmd; do
            if [[ -s $dir/$daemon.pid ]] && ! kill -0 "$(<"$dir/$daemon.pid")" 2>/dev/null; then
                state=ended
            fi
        done
        [[ $state == ended ]] && break
        sleep 0.5
    done
    if [[ $state != idle && $state != mixed ]]; then
        tail -n 5 "$dir"/*.log >&2 || true
        false
    fi
    trap - ERR
    echo "export SLURM_CONF=$SLURM_CONF"
}

case ${1:-} in
start) start ;;
stop) stop ;;
*)
    echo "usage: $0 start|stop" >&2
    exit 2
    ;;
esac
