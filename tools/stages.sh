# shellcheck shell=bash disable=SC2154 # stage_folder
# Runs the stages of a long job, two at a time: one alone leaves a processor idle now and then.
# Needs tools/step.sh. What a stage says is kept in $stage_folder.

stages=()
declare -A stage_after stage_command stage_state stage_began stage_took

# stage NAME 'STAGE...' COMMAND...: one that begins when the stages named before the command have
# passed. The words of the command have no blanks.
stage() {
  stages+=("$1")
  stage_after[$1]=$2
  stage_command[$1]=${*:3}
  stage_state[$1]=waiting
}

stage_can_begin() {
  local other
  [ "${stage_state[$1]}" = waiting ] || return 1
  for other in ${stage_after[$1]}; do
    [ "${stage_state[$other]}" = passed ] || return 1
  done
}

begin_stage() {
  say "begin: $1"
  stage_state[$1]=running
  stage_began[$1]=$SECONDS
  (
    trap - EXIT INT TERM
    log=$stage_folder/$1.log
    : >"$log"
    ${stage_command[$1]}
  ) >"$stage_folder/$1.out" 2>&1 </dev/null &
  stage_of[$!]=$1
}

show_stage() {
  printf '\n'
  say "$1: ${stage_state[$1]}${stage_took[$1]:+ in ${stage_took[$1]} s}"
  cat "$stage_folder/$1.out"
}

stop_stages() {
  local pid
  trap '' INT TERM
  for pid in "${!stage_of[@]}"; do
    kill -- "-$pid" 2>/dev/null || true
  done
  wait 2>/dev/null # bash tells of each process that was stopped
}

# What the stages say is shown when they have passed, each whole and in the order in which they were
# named. If one fails, the others are stopped, it is shown, and the program ends.
run_stages() {
  local name pid shown=0 passed
  declare -gA stage_of=()
  mkdir -p "$stage_folder"
  set -m # each stage is a process group, which can be stopped
  trap stop_stages EXIT
  trap 'exit 130' INT TERM
  while [ "$shown" -lt ${#stages[@]} ]; do
    for name in "${stages[@]}"; do
      if [ ${#stage_of[@]} -lt 2 ] && stage_can_begin "$name"; then
        begin_stage "$name"
      fi
    done
    passed=yes
    wait -n -p pid "${!stage_of[@]}" || passed=''
    name=${stage_of[$pid]}
    unset "stage_of[$pid]"
    stage_state[$name]=${passed:+passed}
    if [ -z "$passed" ]; then
      stop_stages
      stage_state[$name]=failed
      show_stage "$name" >&2
      fail "$name has failed; what it says is in $stage_folder/$name.out"
    fi
    stage_took[$name]=$((SECONDS - stage_began[$name]))
    while [ "${stage_state[${stages[shown]:-none}]:-}" = passed ]; do
      show_stage "${stages[shown]}"
      shown=$((shown + 1))
    done
  done
  trap - EXIT INT TERM
  set +m
}
