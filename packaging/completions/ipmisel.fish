# Completion of ipmisel for fish; what there is to complete comes from the program's own help.

function __ipmisel_help
    set -l words (commandline -opc)
    set -l program $words[1]
    for word in $words[2..-1]
        if not string match -q -- '-*' $word
            $program $word --help 2>/dev/null
            return
        end
    end
    $program --help 2>/dev/null
end

function __ipmisel_hosts
    $argv[1] config --hosts 2>/dev/null | head -n 1000
end

function __ipmisel_sources
    printf '%s\n' inband lan: sim: replay:
    if string match -q -- 'lan:*' (commandline -ct)
        printf 'lan:%s\n' (__ipmisel_hosts $argv[1] | string match -v -- '%*')
    end
    for kind in sim: replay:
        if string match -q -- "$kind*" (commandline -ct)
            printf "$kind%s\n" (__fish_complete_path (string replace -- $kind '' (commandline -ct)))
        end
    end
end

function __ipmisel_complete
    set -l words (commandline -opc)
    set -l previous $words[-1]
    set -l help (__ipmisel_help)
    if string match -q -- '--*' $previous
        set -l takes (string match -rg -- "^  (?:-.,)?$previous ([A-Z].*)" $help)[1]
        switch (string replace -r ' .*' '' -- "$takes")
            case '*:*'
                string split ', ' (string replace -r '=.*' '' (string replace -r '^[^:]*:' '' -- $takes))
                return
            case 'FILE*'
                __fish_complete_path (commandline -ct)
                return
            case 'CLASS*'
                $words[1] classes 2>/dev/null | string replace -r ' +' \t
                return
            case 'LIST*'
                __ipmisel_hosts $words[1]
                return
            case 'SOURCE*'
                __ipmisel_sources $words[1]
                return
            case '?*'
                return
        end
    end
    string match -rg -- '^  (?:-.,)?(--[a-z-]+)' $help
    if string match -q -- '  SOURCE *' $help
        __ipmisel_sources $words[1]
    end
    if set -l at (contains -i -- Subcommands: $help)
        string match -rg -- '^  ([a-z][a-z-]*) ' $help[(math $at + 1)..-1]
    end
end

complete -c ipmisel -f -a '(__ipmisel_complete)'
