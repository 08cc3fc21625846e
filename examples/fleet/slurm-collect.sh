#!/bin/sh
# Collects from the controllers of a list in a job array of Slurm, each task a part of the list:
#
#   sbatch --array=1-8 slurm-collect.sh @/etc/ipmisel/bmcs
#
# The array counts from 1. A host belongs to the same part in every run, so that a task that failed
# may simply run again: sbatch --array=3 does not do, since the number of tasks counts;
# scontrol requeue JOB_3 does.
#
#SBATCH --job-name=ipmisel
#SBATCH --ntasks=1
#SBATCH --cpus-per-task=2
#SBATCH --time=00:30:00
#SBATCH --requeue

hosts=${1:?usage: sbatch --array=1-N slurm-collect.sh HOSTS [OPTION]...}
shift
# Where the events go: a file for each task, or a database with --store and --new.
: "${IPMISEL_OUTPUT:=$PWD}"

exec "${IPMISEL:-ipmisel}" collect --hosts "$hosts" \
    --shard "$SLURM_ARRAY_TASK_ID/$SLURM_ARRAY_TASK_COUNT" \
    --format events --output "$IPMISEL_OUTPUT/events-$SLURM_ARRAY_TASK_ID.ndjson" "$@"
