# Bash completion for stbplat: commands, their options and file names.
# The commands and options are asked of the tool itself (its --help), so
# they follow whatever the installed tool offers.
_stbplat() {
  local cur words=() i help section line word
  cur=${COMP_WORDS[COMP_CWORD]}
  # The command words typed so far, without options and their values.
  for ((i = 1; i < COMP_CWORD; i++)); do
    case ${COMP_WORDS[i]} in
      --root | -o | --output | --at | --type | -n | -s | --length | --offset | --indent | \
        --nand | --nor | --emmc | --slot | --proc-mtd | --dump | --window | --memory-map | --bb) ((i++)) ;;
      --)
        # What follows `run --` is the user's program and its arguments, not
        # the tool's: a command name first, then files.
        if ((${#words[@]} > 0)) && [[ ${words[-1]} == run ]]; then
          ((i == COMP_CWORD - 1)) && COMPREPLY=($(compgen -c -- "$cur"))
          COMPREPLY+=($(compgen -f -- "$cur"))
          return
        fi ;;
      -*) ;;
      *) words+=("${COMP_WORDS[i]}") ;;
    esac
  done
  case ${COMP_WORDS[COMP_CWORD - 1]} in
    --root) COMPREPLY=($(compgen -d -- "$cur")); return ;;
    -o | --output | --proc-mtd | --memory-map) COMPREPLY=($(compgen -f -- "$cur")); return ;;
    --bb) COMPREPLY=($(compgen -W "skipbad padbad dumpbad" -- "$cur")); return ;;
  esac
  # --bb=METHOD in one word.
  if [[ $cur == --bb=* ]]; then
    COMPREPLY=($(compgen -P --bb= -W "skipbad padbad dumpbad" -- "${cur#--bb=}"))
    return
  fi
  help=$("${COMP_WORDS[0]}" "${words[@]}" --help 2>/dev/null) || return
  local candidates=()
  while IFS= read -r line; do
    case $line in
      Subcommands:*) section=commands; continue ;;
      Options:* | Positionals:*) section=options; continue ;;
      "") section= ; continue ;;
    esac
    line=${line#"${line%%[![:space:]]*}"}
    if [[ $section == commands ]]; then
      candidates+=("${line%% *}")
    elif [[ $section == options ]]; then
      line=${line%%  *}
      for word in ${line//,/ }; do
        [[ $word == -* ]] && candidates+=("$word")
      done
    fi
  done <<<"$help"
  COMPREPLY=($(compgen -W "${candidates[*]}" -- "$cur"))
  # Arguments that are files: offer file names beside the words.
  [[ $cur != -* ]] && COMPREPLY+=($(compgen -f -- "$cur"))
}
complete -o filenames -F _stbplat stbplat
