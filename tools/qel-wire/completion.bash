# Bash completion of qel-wire: commands, options, names of messages and enumerations, files.
# shellcheck shell=bash
_qel_wire() {
  local word=${COMP_WORDS[COMP_CWORD]} before=() i choices
  for ((i = 1; i < COMP_CWORD; ++i)); do
    [[ ${COMP_WORDS[i]} == -* ]] || before+=("${COMP_WORDS[i]}")
  done
  COMPREPLY=()
  if [[ $word == -* ]]; then
    choices='--hex --base64 --json --all --show-token --color= --help --version'
  elif ((${#before[@]} == 0)); then
    choices='decode encode explain guess schema'
  elif ((${#before[@]} == 1)) && [[ ${before[0]} == @(decode|encode|explain|schema) ]]; then
    choices=$(qel-wire schema 2>/dev/null)
    # Enumerations can be looked up and nothing else.
    [[ ${before[0]} == schema ]] || choices=${choices%%ProxyOption*}
  else
    compopt -o default 2>/dev/null # files
    return
  fi
  mapfile -t COMPREPLY < <(compgen -W "$choices" -- "$word")
  [[ ${COMPREPLY[*]} != --color= ]] || compopt -o nospace
}
complete -F _qel_wire qel-wire
