# Completion of palisade in fish. What the daemon knows is asked for; without one there is simply less to offer.

function __palisade_listed --description 'The words of one key in a listing of the daemon'
    timeout 2 palisade --json $argv[2..] 2>/dev/null </dev/null | string match --all --regex --groups-only "\"$argv[1]\":\"([^\"]*)\""
end

function __palisade_needs_command
    set --local words (commandline --cut-at-cursor --tokenize --current-process)
    set --local commands account request token grants revoke authorize history revocations clients preferences notify doctor
    not string match --quiet --regex '^('(string join '|' $commands)')$' -- $words
end

complete --command palisade --no-files
complete --command palisade --long-option help --short-option h --description 'Show help'
complete --command palisade --long-option json --description 'Print JSON'
complete --command palisade --long-option color --exclusive --arguments 'auto always never' --description 'Colours'
complete --command palisade --long-option type --exclusive --arguments com.veltran.accounttype.facebook --description 'The account type'
complete --command palisade --condition __palisade_needs_command --long-option version --description 'Show the version'

complete --command palisade --condition __palisade_needs_command --arguments account --description 'Add, list and remove accounts'
complete --command palisade --condition __palisade_needs_command --arguments request --description 'Ask for access'
complete --command palisade --condition __palisade_needs_command --arguments token --description 'Print the application\'s own token'
complete --command palisade --condition __palisade_needs_command --arguments grants --description 'List what was granted and refused'
complete --command palisade --condition __palisade_needs_command --arguments revoke --description 'Take back what a client was granted'
complete --command palisade --condition __palisade_needs_command --arguments authorize --description 'Grant a client access without asking'
complete --command palisade --condition __palisade_needs_command --arguments history --description 'Show what was decided'
complete --command palisade --condition __palisade_needs_command --arguments revocations --description 'Show which tokens are being made invalid'
complete --command palisade --condition __palisade_needs_command --arguments clients --description 'List the client records'
complete --command palisade --condition __palisade_needs_command --arguments preferences --description 'Read and change preferences'
complete --command palisade --condition __palisade_needs_command --arguments notify --description 'Post a notification'
complete --command palisade --condition __palisade_needs_command --arguments doctor --description 'Check what Palisade runs on'

set --local in_account '__fish_seen_subcommand_from account'
set --local in_preferences '__fish_seen_subcommand_from preferences'
complete --command palisade --condition "$in_account; and not __fish_seen_subcommand_from list add remove" --arguments 'list add remove'
complete --command palisade --condition "$in_account; and __fish_seen_subcommand_from remove" --arguments '(__palisade_listed id account list)'
complete --command palisade --condition '__fish_seen_subcommand_from request' --long-option app --exclusive --description 'The Facebook app ID'
complete --command palisade --condition '__fish_seen_subcommand_from request' --long-option permission --exclusive --description 'A permission'
complete --command palisade --condition '__fish_seen_subcommand_from request' --long-option audience --exclusive --arguments 'everyone friends only-me' --description 'Who may see what is posted'
complete --command palisade --condition '__fish_seen_subcommand_from revoke' --long-option all --description 'Every client'
complete --command palisade --condition '__fish_seen_subcommand_from revoke' --arguments '(__palisade_listed client grants)'
complete --command palisade --condition '__fish_seen_subcommand_from authorize' --arguments '(__palisade_listed bundle_id clients)'
complete --command palisade --condition '__fish_seen_subcommand_from history' --long-option limit --exclusive --description 'How many decisions'
complete --command palisade --condition '__fish_seen_subcommand_from history' --long-option client --exclusive --arguments '(__palisade_listed bundle_id clients)' --description 'Of this bundle ID only'
complete --command palisade --condition "$in_preferences" --long-option domain --exclusive --description 'The preferences domain'
complete --command palisade --condition "$in_preferences; and not __fish_seen_subcommand_from get set" --arguments 'get set'
complete --command palisade --condition "$in_preferences; and __fish_seen_subcommand_from get set" --arguments FacebookIgnoreAccessRequests
complete --command palisade --condition '__fish_seen_subcommand_from notify' --arguments FacebookEnvironmentDidChangeNotification
