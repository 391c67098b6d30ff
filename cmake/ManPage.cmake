# Makes the manual page OUTPUT of what `PROGRAM --help` prints.
execute_process(COMMAND ${PROGRAM} --help OUTPUT_VARIABLE help COMMAND_ERROR_IS_FATAL ANY)

# Signs that mean something to roff, or to a CMake list.
string(REPLACE "\\" "\\e" help "${help}")
string(REPLACE "-" "\\-" help "${help}")
string(REPLACE ";" "\\(SEMICOLON)" help "${help}")
string(REPLACE "\n" ";" lines "${help}")

set(options "")
set(inOptions FALSE)
foreach(line IN LISTS lines)
    string(REPLACE "\\(SEMICOLON)" ";" line "${line}")
    if(line MATCHES "^Options of ")
        set(inOptions TRUE)
        string(APPEND options ".SS ${line}\n")
    elseif(line MATCHES "^Exit codes: ")
        break()
    elseif(inOptions AND line MATCHES "^  (\\\\-[^ ]*)(.*)$")
        string(APPEND options ".TP\n\\fB${CMAKE_MATCH_1}\\fR${CMAKE_MATCH_2}\n")
    elseif(inOptions AND line MATCHES "^ +(.+)$")
        string(APPEND options "${CMAKE_MATCH_1}\n")
    endif()
endforeach()

file(WRITE ${OUTPUT} ".TH SCENE_EXPORT 1 \"\" \"scene_export ${VERSION}\"
.SH NAME
scene_export \\- write models as glTF 2.0
.SH SYNOPSIS
.B scene_export
[options]
.I INPUT OUTPUT
.SH DESCRIPTION
Reads the model
.I INPUT
and writes it as
.IR OUTPUT .
The extensions of the names tell the formats: scene_export \\-\\-formats prints them.
One line on the standard output tells what was written; messages go to the standard error stream.
.SH OPTIONS
${options}.SH EXIT STATUS
.TP
0
Done.
.TP
1
The command line is wrong.
.TP
2
.I INPUT
could not be read.
.TP
3
Nothing could export it.
.TP
4
A file could not be written.
.TP
5
There were warnings or errors, with \\-\\-strict.
.SH EXAMPLES
.nf
scene_export model.obj model.glb
scene_export \\-exportEmbedded false \\-exportCompress false model.fbx model.gltf
scene_export \\-\\-dry\\-run \\-\\-strict model.dae model.glb
.fi
")
