#!/usr/bin/env bash
# Slurm on this machine alone, for as long as one command runs: munge, a controller and a node daemon with files
# and ports of their own. It needs the Debian packages slurm-wlm and munge, and no service that is set up.
#
# usage: slurm-one-machine.sh                  runs a list of 20 tasks and a job in parts, with tarsel from PATH or $TARSEL
#        slurm-one-machine.sh COMMAND [ARG...] runs a command that may use sbatch, squeue, ...
#
# $SLURM_ONE_MACHINE is the folder with the configuration, the logs and the process numbers (munged.pid,
# slurmctld.pid, slurmd.pid), which is removed at the end. $SLURM_ONE_MACHINE_CORES: how many cores the node says
# that it has (those of this machine). The status is that of the command.
set -uo pipefail

tool=${TARSEL:-tarsel}
cores=${SLURM_ONE_MACHINE_CORES:-$(nproc)}
PATH=$PATH:/usr/sbin:/sbin
for program in munged slurmctld slurmd sbatch; do
    command -v "$program" >/dev/null || { echo "$0: there is no $program; install slurm-wlm and munge" >&2; exit 5; }
done
[ "$(id -u)" = 0 ] || { echo "$0: a node daemon needs root" >&2; exit 1; }

[ $# -gt 0 ] || command -v "$tool" >/dev/null || { echo "$0: there is no $tool; set TARSEL to its name" >&2; exit 5; }

folder=$(mktemp -d "${TMPDIR:-/tmp}/slurm-one-machine.XXXXXX") || exit 1
case $folder in
*[!A-Za-z0-9._/-]*) rmdir "$folder"; echo "$0: Slurm takes no such TMPDIR: letters, digits, '.', '_', '-'" >&2; exit 1 ;;
esac
export SLURM_ONE_MACHINE=$folder SLURM_CONF=$folder/slurm.conf

number_in() { cat "$folder/$1.pid" 2>/dev/null; }

is_ours() {  # NAME: the process of its number is that program, and has not ended
    local number
    number=$(number_in "$1") && [ -n "$number" ] || return 1
    # The file may have another name, as by Debian's alternatives; a process that has ended has none.
    [ -e "/proc/$number/exe" ] && [ "$(cat "/proc/$number/comm" 2>/dev/null)" = "$1" ]
}

until_true() {  # SECONDS COMMAND...
    local end=$((SECONDS + $1))
    shift
    until "$@"; do
        [ $SECONDS -lt $end ] || return 1
        sleep 0.1
    done
}

gone() { ! is_ours "$1"; }

stop() {
    local name
    trap '' INT TERM HUP
    # Jobs first, so that nothing of theirs stays, then the daemons in the other order.
    if is_ours slurmctld; then
        timeout 10 scancel --quiet --user="$(id -un)" 2>/dev/null
        until_true 10 idle
    fi
    for name in slurmd slurmctld munged; do
        is_ours "$name" || continue
        kill "$(number_in "$name")" 2>/dev/null
        until_true 10 gone "$name" || kill -KILL "$(number_in "$name")" 2>/dev/null
    done
    rm -rf "$folder" ${work:+"$work"}
}
idle() { [ -z "$(timeout 5 squeue --noheader 2>/dev/null)" ]; }
trap stop EXIT
trap 'exit 130' INT
trap 'exit 143' TERM
trap 'exit 129' HUP

fail() {
    echo "$0: $1" >&2
    tail -n 5 "$folder"/*.log >&2
    exit 1
}

# Two ports that nothing listens on, an even one and an odd one.
free_port() {  # FIRST
    local port
    for port in $(seq "$1" 2 29999 | shuf -n 50); do
        (: <"/dev/tcp/127.0.0.1/$port") 2>/dev/null || { echo "$port"; return; }
    done
    return 1
}
controller_port=$(free_port 20000) && node_port=$(free_port 20001) || fail "no port is free"

mkdir "$folder/state" "$folder/spool" || exit 1
(umask 077 && head -c 1024 /dev/urandom >"$folder/munge.key") || exit 1
host=$(hostname -s)
cat >"$SLURM_CONF" <<END
ClusterName=onemachine
SlurmctldHost=$host(127.0.0.1)
SlurmUser=$(id -un)
SlurmdUser=root
SlurmctldPort=$controller_port
SlurmdPort=$node_port
AuthType=auth/munge
AuthInfo=socket=$folder/munge.socket
CredType=cred/munge
StateSaveLocation=$folder/state
SlurmdSpoolDir=$folder/spool
SlurmctldPidFile=$folder/slurmctld.pid
SlurmdPidFile=$folder/slurmd.pid
SlurmctldLogFile=$folder/slurmctld.log
SlurmdLogFile=$folder/slurmd.log
ProctrackType=proctrack/linuxproc
TaskPlugin=task/none
JobAcctGatherType=jobacct_gather/none
AccountingStorageType=accounting_storage/none
MpiDefault=none
SwitchType=switch/none
SelectType=select/cons_tres
SelectTypeParameters=CR_CPU
SlurmdParameters=config_overrides
SchedulerParameters=sched_interval=1,sched_min_interval=0,batch_sched_delay=0,bf_interval=1
ReturnToService=2
KillWait=10
SlurmdTimeout=30
NodeName=$host NodeAddr=127.0.0.1 CPUs=$cores State=UNKNOWN
PartitionName=all Nodes=$host Default=YES MaxTime=INFINITE State=UP
END

munged --force --key-file="$folder/munge.key" --socket="$folder/munge.socket" --pid-file="$folder/munged.pid" \
    --log-file="$folder/munged.log" --seed-file="$folder/munge.seed" 2>>"$folder/munged.log" ||
    fail "munged does not start"
until_true 10 test -S "$folder/munge.socket" || fail "munged does not start"
slurmctld -f "$SLURM_CONF" 2>>"$folder/slurmctld.log" || fail "slurmctld does not start"
slurmd -f "$SLURM_CONF" 2>>"$folder/slurmd.log" || fail "slurmd does not start"
ready() { timeout 5 sinfo --noheader --format=%T 2>/dev/null | grep -qx idle; }
until_true 30 ready || fail "the node is not ready"

if [ $# -gt 0 ]; then
    "$@"
    exit
fi

# --- A list of 20 tasks: tones as WAV files, as a user would submit them.
work=$(mktemp -d "${TMPDIR:-/tmp}/slurm-tasks.XXXXXX") || exit 1
list=$work/tones.xml
"$tool" batch "$list" new || exit
for n in $(seq 1 20); do
    "$tool" batch "$list" add "testgen:size=64x64,rate=25,duration=$n" -o "$work/tone$n.wav" --no-video || exit
done
"$tool" batch "$list" submit --slurm || exit
until_true 120 idle || fail "the tasks do not end"
"$tool" batch "$list" status || exit
left=$("$tool" batch "$list" status --json | grep -c '"state": "done"')
[ "$left" = 20 ] || fail "$left of 20 tasks are done"

# --- One job in parts, which has the bytes of the same job without a cluster.
job=("testgen:size=320x240,rate=25,duration=20" --fade 2)
"$tool" transcode "${job[@]}" -o "$work/parts.avi" --split 4 --slurm || exit
"$tool" transcode "${job[@]}" -o "$work/whole.avi" || exit
cmp "$work/parts.avi" "$work/whole.avi" || exit
