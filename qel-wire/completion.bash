# Bash completion of qel-wire: commands, options, names of messages and enumerations, files.
# shellcheck shell=bash
_qel_wire() {
  local word=${COMP_WORDS[COMP_CWORD]} before=() option='' i choices=''
  # An option's value comes as "=" and a word.
  for ((i = 1; i < COMP_CWORD; ++i)); do
    case ${COMP_WORDS[i]} in
      -*) option=${COMP_WORDS[i]} ;;
      =) ((i + 1 == COMP_CWORD)) || { ((++i)) && option=''; } ;;
      *) before+=("${COMP_WORDS[i]}") option='' ;;
    esac
  done
  [[ $word != = ]] || word=''
  COMPREPLY=()
  if [[ -n $option && (${COMP_WORDS[COMP_CWORD]} == = || ${COMP_WORDS[COMP_CWORD - 1]} == =) ]]; then
    [[ $option != --color ]] || choices='always never auto'
  elif [[ $word == -* ]]; then
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
