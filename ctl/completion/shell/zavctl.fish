# Completion of zavctl for fish. The program itself says what may stand at the cursor.

function __zavctl_complete
    set -l words (commandline -opc)
    set -l typed (commandline -ct)
    set -l lines ($words[1] __complete $words[2..-1] "$typed" 2>/dev/null)
    if test "$lines[1]" = files
        __fish_complete_path "$typed"
    else
        printf '%s\n' $lines[2..-1]
    end
end

complete -c zavctl -f -a '(__zavctl_complete)'
