# Installs the library with its public headers, the CMake package and the pkg-config file.
include(CMakePackageConfigHelpers)

# Headers that only the library's own sources include: what they pull in is not a consumer's affair.
file(GLOB_RECURSE headers RELATIVE ${PROJECT_SOURCE_DIR} CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/corvane/*.h)
set(internal_headers
    corvane/Bridge/Data/EventMirrors.h
    corvane/Bridge/Data/StackEntry.h
    corvane/Bridge/Models/Refusal.h
    corvane/Models/JSONShape.h
    corvane/Models/JSONTree.h
    corvane/Models/OwnJSON.h
    corvane/Agent/AgentDirectory.h
    corvane/Agent/Host/Acknowledgements.h
    corvane/Agent/Host/AgentConversation.h
    corvane/Agent/Host/AgentLink.h
    corvane/Agent/AgentMessage.h
    corvane/Agent/Host/AgentProgram.h
    corvane/Agent/Host/AgentQuestions.h
    corvane/Agent/Host/AgentThread.h
    corvane/Agent/Host/BackgroundTransferCore.h
    corvane/Agent/Host/BackgroundTransferTask.h
    corvane/Agent/FormatError.h
    corvane/Agent/Host/InsideTransfers.h
    corvane/Agent/OutcomeCodec.h
    corvane/Agent/Host/TaskTable.h
    corvane/Transfer/CurlTransfer.h
    corvane/Platform/Descriptor.h
    corvane/Agent/FrameSocket.h
    corvane/Platform/HostCall.h
    corvane/Transfer/HTTPTransfer.h
    corvane/Transfer/HTTPURL.h
    corvane/Signing/OpenSSLUse.h
    corvane/Platform/PrivateFile.h
    corvane/Platform/TaskList.h
    corvane/Platform/Thread.h
    corvane/Transfer/Description.h
    corvane/Transfer/SessionReporter.h
    corvane/Transfer/SessionTask.h
    corvane/Transfer/TransferOutcome.h
    corvane/Transfer/TransferQueue.h
    corvane/Transfer/TransferScheduler.h
    corvane/Agent/TransferSubmission.h
    corvane/Transfer/TransferThread.h
    corvane/Agent/WireReader.h
    corvane/Agent/WireWriter.h
    corvane/Session/SessionCore.h)
list(REMOVE_ITEM headers ${internal_headers})
list(FILTER headers EXCLUDE REGEX "^corvane/Agent/Daemon/")  # the agent's own
foreach(header IN LISTS headers)
    get_filename_component(folder ${header} DIRECTORY)
    install(FILES ${PROJECT_SOURCE_DIR}/${header} DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/${folder})
endforeach()
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/include/corvane/Export.h
    DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/corvane)

install(TARGETS corvane EXPORT corvaneTargets
    RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR})

if(CORVANE_BUILD_AGENT)
    install(TARGETS corvane-transferd RUNTIME DESTINATION ${CMAKE_INSTALL_LIBEXECDIR})
endif()

set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/corvane)
install(EXPORT corvaneTargets NAMESPACE corvane:: DESTINATION ${package_dir})
configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/corvaneConfig.cmake.in
    ${CMAKE_CURRENT_BINARY_DIR}/corvaneConfig.cmake INSTALL_DESTINATION ${package_dir})
write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/corvaneConfigVersion.cmake
    COMPATIBILITY SameMinorVersion)
install(FILES
    ${CMAKE_CURRENT_BINARY_DIR}/corvaneConfig.cmake
    ${CMAKE_CURRENT_BINARY_DIR}/corvaneConfigVersion.cmake
    ${PROJECT_SOURCE_DIR}/cmake/CorvaneApplicationBundle.cmake
    DESTINATION ${package_dir})

# A static library leaves it to its user to link what it is made of; a shared one brings that itself. The libraries are
# named, and not required as packages: their compiler flags are none of a host's affair, and with --static pkg-config
# would ask for everything that they are made of in turn.
set(pc_libs_extra "")
if(NOT BUILD_SHARED_LIBS)
    set(pc_libs_extra "-lsqlite3 -lz -lcurl -lcrypto -lspdlog -lfmt -lboost_json -lboost_container -pthread")
endif()
configure_file(${PROJECT_SOURCE_DIR}/cmake/corvane.pc.in ${CMAKE_CURRENT_BINARY_DIR}/corvane.pc @ONLY)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/corvane.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
