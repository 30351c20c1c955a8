# Completion of palisade in bash. What the daemon knows is asked for; without one there is simply less to offer.

# The words of one key in a listing of the daemon.
_palisade_listed() {
  timeout 2 palisade --json "${@:2}" 2>/dev/null </dev/null | grep -o "\"$1\":\"[^\"]*\"" 2>/dev/null | cut -d '"' -f 4
}

_palisade_words() {
  local command=$1 previous=$2 current=$3
  local general="--help --json --color --type"

  case $previous in
    --color) echo auto always never; return ;;
    --audience) echo everyone friends only-me; return ;;
    --type) echo com.veltran.accounttype.facebook; return ;;
    --client) _palisade_listed bundle_id clients; return ;;
    --app | --permission | --limit | --domain) return ;;
  esac

  if [[ $current == -* ]]; then
    case $command in
      "") echo "$general --version" ;;
      request) echo "$general --app --permission --audience" ;;
      revoke) echo "$general --all" ;;
      history) echo "$general --limit --client" ;;
      "preferences" | "preferences "*) echo "$general --domain" ;;
      *) echo "$general" ;;
    esac
    return
  fi

  case $command in
    "") echo account request token grants revoke authorize history revocations clients preferences notify doctor ;;
    account) echo list add remove ;;
    "account remove") _palisade_listed id account list ;;
    revoke) _palisade_listed client grants ;;
    authorize) _palisade_listed bundle_id clients ;;
    preferences) echo get set ;;
    "preferences get" | "preferences set") echo FacebookIgnoreAccessRequests ;;
    notify) echo FacebookEnvironmentDidChangeNotification ;;
  esac
}

_palisade() {
  local index word command="" current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
  for ((index = 1; index < COMP_CWORD; index++)); do
    word=${COMP_WORDS[index]}
    case $word in
      --color | --type | --app | --permission | --audience | --limit | --client | --domain) index=$((index + 1)) ;;
      -*) ;;
      *)
        case $command in
          "") command=$word ;;
          account | preferences) command+=" $word" ;;
        esac
        ;;
    esac
  done
  mapfile -t COMPREPLY < <(compgen -W "$(_palisade_words "$command" "$previous" "$current")" -- "$current")
}

complete -F _palisade palisade
