# fish completion for marrowdale(1)

function __marrowdale_needs_command
    set -l words (commandline -opc)
    set -e words[1]
    while set -q words[1]
        switch $words[1]
            case --root --state
                set -e words[1]
            case '-*'
            case '*'
                return 1
        end
        set -e words[1]
    end
    return 0
end

complete -c marrowdale -l root -x -a '(__fish_complete_directories)' -d 'The folder to serve'
complete -c marrowdale -l state -x -a '(__fish_complete_directories)' -d 'Where identifiers are kept'
complete -c marrowdale -l json -d 'One JSON value a line'
complete -c marrowdale -l verbose -d 'Log lines on standard error'
complete -c marrowdale -s h -l help -d 'Show help'
complete -c marrowdale -n __marrowdale_needs_command -l version -d 'Show the version'

for entry in ls:'List a folder, every page of it' info:'Show everything about one item' \
        id:'Show the identifier of the item at a path' path:'Show where an item is now' \
        page:'Show one page of a folder' search:'Find items by names and tags' \
        anchor:'Show the anchor of a folder' changes:'Show what changed since an anchor' \
        watch:'Say which containers are to be read again' import:'Bring a copy of a document in' \
        mkdir:'Create a folder' rename:'Rename an item in its place' \
        move:'Move an item to another folder' trash:'Move an item to the trash' \
        untrash:'Put a trashed item back' delete:'Delete an item for good' \
        tag:'Set the tags of an item' favorite:'Set or clear a favourite rank' \
        used:'Set or clear a last-used date' purge:'Remove what was trashed before a date' \
        apps:'List the applications whose documents appear' \
        app:'Show the folder of an application\'s documents' \
        refresh:'Look for applications that came or went' thumbnail:'Write the icons of items' \
        serve:'Serve documents until interrupted' browse:'Show documents in a web browser' doctor:'Say what this machine offers'
    set -l parts (string split -m 1 : $entry)
    complete -c marrowdale -f -n __marrowdale_needs_command -a $parts[1] -d $parts[2]
end

complete -c marrowdale -n '__fish_seen_subcommand_from page' -l page -x -a 'name date'
complete -c marrowdale -n '__fish_seen_subcommand_from changes' -l since -x
complete -c marrowdale -n '__fish_seen_subcommand_from changes' -l all
complete -c marrowdale -n '__fish_seen_subcommand_from import' -l into -r
complete -c marrowdale -n '__fish_seen_subcommand_from mkdir' -l in -r
complete -c marrowdale -n '__fish_seen_subcommand_from move untrash' -l to -r
complete -c marrowdale -n '__fish_seen_subcommand_from move' -l name -x
complete -c marrowdale -n '__fish_seen_subcommand_from favorite used' -l clear
complete -c marrowdale -n '__fish_seen_subcommand_from purge' -l older-than -x
complete -c marrowdale -n '__fish_seen_subcommand_from thumbnail' -l out -x -a '(__fish_complete_directories)'
complete -c marrowdale -n '__fish_seen_subcommand_from serve' -l port -x
complete -c marrowdale -n '__fish_seen_subcommand_from serve' -l no-browser
complete -c marrowdale -n '__fish_seen_subcommand_from serve' -l no-address
complete -c marrowdale -n '__fish_seen_subcommand_from browse' -l no-open
complete -c marrowdale -n '__fish_seen_subcommand_from serve' -l keep-trash -x -a 'forever 7 30 90'
