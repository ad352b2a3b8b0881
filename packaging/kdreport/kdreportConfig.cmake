include(CMakeFindDependencyMacro)
find_dependency(EXPAT)
find_dependency(Threads)
include(${CMAKE_CURRENT_LIST_DIR}/kdreportTargets.cmake)
