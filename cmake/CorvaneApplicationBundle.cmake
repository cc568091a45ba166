# corvane_application_bundle(<target> IDENTIFIER <text> NAME <text> SHORT_VERSION <text> VERSION <text>)
#
# Writes what an executable says of itself to the file "<executable>.bundle" beside it, where `Bundle::main()` and with
# it `Client::fromBundle()` find it:
#
#     corvane_application_bundle(player
#         IDENTIFIER com.example.player NAME Player SHORT_VERSION 2.3 VERSION 117)
#
# The values may hold generator expressions. Whoever installs the executable installs the file with it:
#
#     install(FILES $<TARGET_FILE:player>.bundle DESTINATION ${CMAKE_INSTALL_BINDIR})

include_guard(GLOBAL)

function(corvane_application_bundle target)
    set(names IDENTIFIER NAME SHORT_VERSION VERSION)
    cmake_parse_arguments(PARSE_ARGV 1 bundle "" "${names}" "")
    if(NOT TARGET ${target})
        message(FATAL_ERROR "corvane_application_bundle: there is no target \"${target}\"")
    endif()
    get_target_property(type ${target} TYPE)
    if(NOT type STREQUAL "EXECUTABLE")
        message(FATAL_ERROR "corvane_application_bundle: \"${target}\" is not an executable")
    endif()
    if(DEFINED bundle_UNPARSED_ARGUMENTS)
        message(FATAL_ERROR "corvane_application_bundle: unknown arguments: ${bundle_UNPARSED_ARGUMENTS}")
    endif()
    foreach(name IN LISTS names)
        if("${bundle_${name}}" STREQUAL "")
            message(FATAL_ERROR "corvane_application_bundle: ${name} is missing for \"${target}\"")
        endif()
        if("${bundle_${name}}" MATCHES "[\r\n]")
            message(FATAL_ERROR "corvane_application_bundle: ${name} of \"${target}\" is more than one line")
        endif()
    endforeach()
    file(GENERATE OUTPUT "$<TARGET_FILE:${target}>.bundle" CONTENT
"BundleIdentifier=${bundle_IDENTIFIER}
BundleName=${bundle_NAME}
BundleShortVersionString=${bundle_SHORT_VERSION}
BundleVersion=${bundle_VERSION}
")
endfunction()
