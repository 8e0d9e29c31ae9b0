# bash completion for zqlogpipe

_zqlogpipe() {
  local word=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD - 1]} name
  COMPREPLY=()
  case $before in
    --level)
      mapfile -t COMPREPLY < <(compgen -W 'trace debug info warn warning error fatal' -- "$word")
      return ;;
    --layout)
      mapfile -t COMPREPLY < <(compgen -W 'simple xml' -- "$word")
      return ;;
    --max-size | --backups | --pattern | --logger | --retry) return ;;
  esac
  if [[ $word == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--file --syslog --config --max-size --backups --daily --pattern --no-append --logger --level --detect-level
      --no-time --layout --tee --retry --quiet --version --help' -- "$word")
  else
    compopt -o filenames
    while IFS= read -r name; do COMPREPLY+=("$name"); done < <(compgen -f -- "$word")
  fi
}
complete -F _zqlogpipe zqlogpipe
