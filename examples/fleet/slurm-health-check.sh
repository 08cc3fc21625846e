#!/bin/sh
# Slurm's health check of a node (slurm.conf: HealthCheckProgram, HealthCheckInterval=3600,
# HealthCheckNodeState=ANY): drains the node when its management controller knows of a critical problem, and
# lets it be used again when the problem that this script drained it for is gone. What could not be
# read drains nothing.
PATH=/usr/sbin:/usr/bin:/sbin:/bin
reason="ipmisel:"
node=${SLURMD_NODENAME:-$(hostname -s)}

# Further arguments are those of ipmisel check; none: this machine's own controller.
line=$("${IPMISEL:-ipmisel}" check "$@")
status=$?
state=$(scontrol --oneliner show node "$node") || exit 1

case $status in
2)
    case $state in
    *DRAIN*) ;;  # already, for whatever reason
    *) scontrol update NodeName="$node" State=DRAIN Reason="$reason ${line%% | *}" ;;
    esac
    ;;
0 | 1)
    case $state in
    *DRAIN*Reason="$reason"*) scontrol update NodeName="$node" State=RESUME ;;
    esac
    ;;
esac
exit 0
