# fish completion for appindex(1)

set -l commands add del reindex process-queue enqueue status search show lint
set -l langs chs cht csy dan enu fre ger hun ita jpn krn nld nor plk ptb ptg rus spn sve tha trk

# The descriptors of the device, as its programs see them.
function __appindex_descriptors
    set -l root $APPINDEX_ROOT
    set -l words (commandline -opc)
    if set -l at (contains -i -- --root $words); and test $at -lt (count $words)
        set root $words[(math $at + 1)]
    end
    set -l joined (string replace -rf -- '^--root=' '' $words); and set root $joined[-1]
    find -L "$root/var/packages" "$root/usr/tovo/tovoman/webman/modules" -maxdepth 7 \
        -name index.conf 2>/dev/null | string replace -- "$root" ''
end

function __appindex_tags
    set -l words (commandline -opc)
    $words[1] lint --list-tags 2>/dev/null
end

complete -c appindex -f
complete -c appindex -s h -l help -d 'Print a summary of the options'
complete -c appindex -l root -x -a '(__fish_complete_directories)' -d 'Take this directory for /'
complete -c appindex -l json -d 'Write data as JSON'
complete -c appindex -s q -l quiet -d 'No progress and no remarks'

set -l none "not __fish_seen_subcommand_from $commands"
complete -c appindex -n "$none" -l version -d 'Print the version'
complete -c appindex -n "$none" -a add -d 'Write the documents of applications into the index'
complete -c appindex -n "$none" -a del -d 'Delete the documents of applications from the index'
complete -c appindex -n "$none" -a reindex -d 'Rebuild the index from every application'
complete -c appindex -n "$none" -a process-queue -d 'Carry out what is queued'
complete -c appindex -n "$none" -a enqueue -d 'Leave requests in the work queue'
complete -c appindex -n "$none" -a status -d 'Show daemon, queue, locks, version and indexes'
complete -c appindex -n "$none" -a search -d 'Find applications by what a person types'
complete -c appindex -n "$none" -a show -d 'Show what a descriptor gives; nothing is sent'
complete -c appindex -n "$none" -a lint -d 'Check descriptors and their texts'

set -l enqueue '__fish_seen_subcommand_from enqueue'
complete -c appindex -n "$enqueue; and not __fish_seen_subcommand_from add del reindex" \
    -a 'add del reindex'
complete -c appindex -n '__fish_seen_subcommand_from add del show' -a '(__appindex_descriptors)'
complete -c appindex -n '__fish_seen_subcommand_from show' -F

set -l search '__fish_seen_subcommand_from search'
complete -c appindex -n "$search" -l lang -x -a "$langs" -d 'Language code'
complete -c appindex -n "$search" -l limit -x -d 'How many to show'
complete -c appindex -n "$search" -l explain -d 'Say why each ranks where it does'

set -l show '__fish_seen_subcommand_from show'
complete -c appindex -n "$show" -l lang -x -a "$langs" -d 'Only in this language'
complete -c appindex -n "$show" -l model -x -d 'As on a device of this model'
complete -c appindex -n "$show" -l platform -x -d 'As on a device of this platform'
complete -c appindex -n "$show" -l package -x -a '(__fish_complete_directories)' \
    -d 'Where the package begins'

set -l lint '__fish_seen_subcommand_from lint'
complete -c appindex -n "$lint" -F
complete -c appindex -n "$lint" -l package -x -a '(__fish_complete_directories)' \
    -d 'Where the package begins'
complete -c appindex -n "$lint" -l known -r -F -d 'The models and platforms that there are'
complete -c appindex -n "$lint" -l format -x -a 'text github' -d 'How findings are written'
complete -c appindex -n "$lint" -l strict -d 'Let warnings count as errors do'
complete -c appindex -n "$lint" -l explain -x -a '(__appindex_tags)' \
    -d 'Tell more about a kind of finding'
complete -c appindex -n "$lint" -l list-tags -d 'List the kinds of findings'
