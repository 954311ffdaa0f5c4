# shellcheck shell=bash
# bash completion for appindex(1)

# Completes to those of the lines on standard input that begin with the current word, in which the
# shell has put a backslash before a blank.
_appindex_from() {
  local line
  while IFS= read -r line; do
    [[ $line != "${cur//\\/}"* ]] || COMPREPLY+=("$line")
  done
}

_appindex_words() { _appindex_from < <(printf '%s\n' "$@"); }

_appindex_files() {
  compopt -o filenames 2>/dev/null
  _appindex_from < <(compgen "$1" -- "$cur")
}

# The descriptors of the device, as its programs see them. The shell quotes what it takes for files.
_appindex_descriptors() {
  compopt -o filenames 2>/dev/null
  _appindex_from < <(_appindex_find)
}

_appindex_find() {
  local path
  find -L "$root"/var/packages "$root"/usr/tovo/tovoman/webman/modules -maxdepth 7 \
    -name index.conf 2>/dev/null | while IFS= read -r path; do printf '%s\n' "${path#"$root"}"; done
}

# Finds the command, its subcommand and --root in what was typed before.
_appindex_parse() {
  local i
  for ((i = 1; i < COMP_CWORD; ++i)); do
    case ${COMP_WORDS[i]} in
      --root=*)
        root=${COMP_WORDS[i]#*=}
        ;;
      --root)
        [[ ${COMP_WORDS[i + 1]} != = ]] || ((++i)) # a word of its own, as a rule
        root=${COMP_WORDS[++i]}
        ;;
      --lang | --limit | --model | --platform | --package | --known | --format | --explain)
        [[ ${COMP_WORDS[i + 1]} != = ]] || ((++i))
        ((++i))
        ;;
      -*) ;;
      *)
        if [[ -z $command ]]; then
          command=${COMP_WORDS[i]}
        elif [[ $command == enqueue ]]; then
          command+=" ${COMP_WORDS[i]}"
        fi
        ;;
    esac
  done
}

_appindex() {
  local cur=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
  local command='' root=${APPINDEX_ROOT-} options
  COMPREPLY=()
  if [[ $cur == = ]]; then
    cur=''
  elif [[ $previous == = ]]; then
    previous=${COMP_WORDS[COMP_CWORD - 2]}
  fi
  _appindex_parse
  case "$command $previous" in
    *' --root' | *' --package')
      _appindex_files -d
      return
      ;;
    *' --known')
      _appindex_files -f
      return
      ;;
    *' --lang')
      _appindex_words chs cht csy dan enu fre ger hun ita jpn krn nld nor plk ptb ptg rus spn sve \
        tha trk
      return
      ;;
    *' --format')
      _appindex_words text github
      return
      ;;
    'lint --explain')
      _appindex_from < <("${COMP_WORDS[0]}" lint --list-tags 2>/dev/null)
      return
      ;;
    *' --limit' | *' --model' | *' --platform')
      return
      ;;
  esac
  options=(--root --json --quiet -q --help -h)
  case $command in
    '') options+=(--version) ;;
    search) options+=(--lang --limit --explain) ;;
    show) options+=(--lang --model --platform --package) ;;
    lint) options+=(--package --known --format --strict --explain --list-tags) ;;
  esac
  if [[ $cur == -* ]]; then
    _appindex_words "${options[@]}"
    return
  fi
  case $command in
    '') _appindex_words add del reindex process-queue enqueue status search show lint ;;
    enqueue) _appindex_words add del reindex ;;
    add | del | 'enqueue add' | 'enqueue del') _appindex_descriptors ;;
    show)
      _appindex_descriptors
      _appindex_files -f
      ;;
    lint) _appindex_files -f ;;
  esac
}

complete -F _appindex appindex
