# Completion of parvel(1) for fish.

# The words so far that are no option, nor the value of one: the command and its operands.
function __parvel_words
    set -l with_value --log --flavor --progress --into --temporary --apply --dump --existing --extra \
        --files-from --output -o --record --records --to --updates --updating --display-name --jobs \
        -j --key --set --size --update
    set -l words
    set -l is_value no
    for word in (commandline -opc)[2..-1]
        if test $is_value = yes
            set is_value no
        else if contains -- $word $with_value; or test "$words[1] $word" = 'edit --cover'
            set is_value yes
        else if not string match -q -- '-*' $word
            set -a words $word
        end
    end
    set -q words[1]
    and printf '%s\n' $words
end

function __parvel_needs_command
    test (count (__parvel_words)) = 0
end

function __parvel_command_is
    set -l words (__parvel_words)
    contains -- "$words[1]" $argv
end

# Whether a command has as many operands as it takes.
function __parvel_needs_no_operand
    set -l words (__parvel_words)
    set -l given (math (count $words) - 1)
    switch "$words[1]"
        case cover pack
            test $given -ge 1
        case match
            test $given -ge 2
        case '*'
            false
    end
end

# Whether the word is the first behind that command.
function __parvel_begins
    test "$(__parvel_words)" = $argv[1]
end

set -l levels 'off fault error default debug'
set -l flavors 'full content-library store progress identity'
set -l folders '(__fish_complete_directories)'

complete -c parvel -n __parvel_needs_command -f -a inspect -d 'Print what is known of assets'
complete -c parvel -n __parvel_needs_command -f -a attributes -d 'What is kept on the files themselves'
complete -c parvel -n __parvel_needs_command -f -a cover -d 'Write the cover image'
complete -c parvel -n __parvel_needs_command -f -a match -d 'Tell whether two are the same'
complete -c parvel -n __parvel_needs_command -f -a install -d 'Bring assets into the library'
complete -c parvel -n __parvel_needs_command -f -a edit -d 'Change titles, covers and more'
complete -c parvel -n __parvel_needs_command -f -a inflate -d 'Expand zipped books'
complete -c parvel -n __parvel_needs_command -f -a update -d 'Bring in new versions'
complete -c parvel -n __parvel_needs_command -f -a pack -d 'Make a zipped book of a folder'
complete -c parvel -n __parvel_needs_command -f -a move -d 'Move assets to another place'
complete -c parvel -n __parvel_needs_command -f -a rename -d 'Name PDF documents after their display names'
complete -c parvel -n __parvel_needs_command -f -a trash -d 'Move assets to the trash, or back'
complete -c parvel -n __parvel_needs_command -f -a remove -d 'Delete assets for good'
complete -c parvel -n __parvel_needs_command -f -a redact -d 'Move assets aside'
complete -c parvel -n __parvel_needs_command -f -a cloud -d 'Move assets into and out of synchronised folders'
complete -c parvel -n __parvel_needs_command -f -a check -d 'Compare records with the disk'
complete -c parvel -n __parvel_needs_command -f -a doctor -d 'Say what endangers assets'
complete -c parvel -n __parvel_needs_command -l version -d 'Print the version'
complete -c parvel -n __parvel_needs_command -l json -d 'Print the version as JSON'
complete -c parvel -n __parvel_needs_no_operand -f
complete -c parvel -l log -x -a $levels -d 'Print log lines'
complete -c parvel -s h -l help -d 'Print the options'

for command in attributes check cloud cover doctor edit inflate inspect install match move pack redact remove rename trash update
    complete -c parvel -n "__parvel_command_is $command" -l json -d 'Print one JSON array'
    complete -c parvel -n "__parvel_command_is $command" -l jsonl -d 'Print lines of JSON'
    complete -c parvel -n "__parvel_command_is $command" -l plist -d 'Print a property list'
end

for command in attributes check cloud doctor edit inflate inspect install move pack redact remove rename trash update
    complete -c parvel -n "__parvel_command_is $command" -l files-from -r -d 'Read PATHs from a file'
    complete -c parvel -n "__parvel_command_is $command" -s 0 -l null -d 'PATHs end with a NUL'
end

for command in attributes cloud edit inflate inspect install move pack redact remove rename trash update
    complete -c parvel -n "__parvel_command_is $command" -s r -l recursive -d 'Take all assets below a folder'
end

for command in cloud edit inflate install move pack redact remove rename trash update
    complete -c parvel -n "__parvel_command_is $command" -l record -r -d 'Take the record from a file'
    complete -c parvel -n "__parvel_command_is $command" -l dry-run -d 'Touch nothing'
end

complete -c parvel -n '__parvel_command_is attributes' -l write -d 'Write what the record says'
complete -c parvel -n '__parvel_command_is attributes' -l update -x -d 'Change KEY=VALUE and write that'
complete -c parvel -n '__parvel_command_is attributes' -l dump -r -d 'Keep the attributes in a file'
complete -c parvel -n '__parvel_command_is attributes' -l apply -r -d 'Write what a file keeps'
complete -c parvel -n '__parvel_command_is attributes' -l dry-run -d 'Write nothing'
complete -c parvel -n '__parvel_command_is attributes' -l record -r -d 'Take the record from a file'
complete -c parvel -n '__parvel_command_is attributes' -s j -l jobs -x -d 'How many at once'

complete -c parvel -n '__parvel_command_is cover' -s o -l output -r -d 'Write to a file'
complete -c parvel -n '__parvel_command_is cover' -l size -x -d 'Scale to fit WxH'
complete -c parvel -n '__parvel_command_is cover' -l best -d 'Go on looking for an image'

complete -c parvel -n '__parvel_command_is inspect' -l cover -d 'Read the cover image too'
complete -c parvel -n '__parvel_command_is inspect' -l extra -r -d 'Lay entries over what is read'
complete -c parvel -n '__parvel_command_is inspect' -l flavor -x -a $flavors -d 'The part of the record'
complete -c parvel -n '__parvel_command_is inspect' -l immediate -d 'Read what is known without a download'
complete -c parvel -n '__parvel_command_is inspect' -l store -d 'Read a store metadata file'
complete -c parvel -n '__parvel_command_is inspect' -s j -l jobs -x -d 'How many at once'

complete -c parvel -n '__parvel_command_is match' -l key -x -d 'Compare one value'

complete -c parvel -n '__parvel_command_is move' -l to -r -d 'The new path'
complete -c parvel -n '__parvel_command_is move' -l into -x -a $folders -d 'The folder'
complete -c parvel -n '__parvel_command_is move' -l replace -d 'Replace what stands there'
complete -c parvel -n '__parvel_command_is move' -l rename -d 'Count up to a free name'
complete -c parvel -n '__parvel_command_is move' -l asset-id-name -d 'Name a book after its identity'
complete -c parvel -n '__parvel_command_is move' -l force -d 'Replace a folder, too'

complete -c parvel -n '__parvel_command_is rename' -l display-name -x -d 'Give it that name first'

complete -c parvel -n '__parvel_command_is trash' -l list -d 'List what was put there'
complete -c parvel -n '__parvel_command_is trash' -l restore -d 'Put back what had that PATH'

complete -c parvel -n '__parvel_command_is remove' -l force -d 'Remove a folder, too'

complete -c parvel -n '__parvel_command_is redact' -l into -x -a $folders -d 'The folder'

complete -c parvel -n '__parvel_begins cloud' -f -a 'add take replace status'
complete -c parvel -n '__parvel_command_is cloud' -l into -x -a $folders -d 'The folder'
complete -c parvel -n '__parvel_command_is cloud' -l replace -d 'Replace what stands there'
complete -c parvel -n '__parvel_command_is cloud' -l force -d 'Replace a folder, too'

complete -c parvel -n '__parvel_command_is check' -l records -r -d 'The records'
complete -c parvel -n '__parvel_command_is check' -l exit-code -d 'End with status 4 where anything is found'
complete -c parvel -n '__parvel_command_is doctor' -l exit-code -d 'End with status 4 where anything is found'
complete -c parvel -n '__parvel_command_is check' -l dry-run -d 'Touch nothing'

complete -c parvel -n '__parvel_command_is edit' -l set -x -d 'Change KEY=VALUE'
complete -c parvel -n '__parvel_command_is edit' -l updates -r -d 'Change what a file says'
complete -c parvel -n '__parvel_command_is edit' -l cover -r -d 'Make that file the cover'
complete -c parvel -n '__parvel_command_is edit' -l restore-cover -d 'Take the first cover back'
complete -c parvel -n '__parvel_command_is edit' -l inflate -d 'Write into the book, too'

complete -c parvel -n '__parvel_command_is install' -l into -x -a $folders -d 'The folder'
complete -c parvel -n '__parvel_command_is install' -l move -d 'Move the asset itself'
complete -c parvel -n '__parvel_command_is install' -l replace -d 'Replace what stands there'
complete -c parvel -n '__parvel_command_is install' -l rename -d 'Count up to a free name'
complete -c parvel -n '__parvel_command_is install' -l asset-id-name -d 'Name a book after its identity'
complete -c parvel -n '__parvel_command_is install' -l cloud -d 'Into synchronised storage'
complete -c parvel -n '__parvel_command_is install' -l updating -r -d 'The asset that it is a new version of'

complete -c parvel -n '__parvel_command_is update' -l into -x -a $folders -d 'The folder'
complete -c parvel -n '__parvel_command_is update' -l existing -r -d 'The asset that it is a new version of'
complete -c parvel -n '__parvel_command_is update' -l force -d 'Replace another asset, too'

for command in edit inflate install pack update
    complete -c parvel -n "__parvel_command_is $command" -l progress -x -a 'auto always never json' -d 'Show how far the work has come'
end

for command in edit inflate install
    complete -c parvel -n "__parvel_command_is $command" -l temporary -x -a $folders -d 'Have a book made there first'
    complete -c parvel -n "__parvel_command_is $command" -l direct -d 'Have a book made in its place'
    complete -c parvel -n "__parvel_command_is $command" -l force -d 'Lose what that costs'
end

complete -c parvel -n '__parvel_command_is pack' -s o -l output -r -d 'The zipped book to make'
complete -c parvel -n '__parvel_begins pack' -f -a $folders
