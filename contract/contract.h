// The version of the contract between host and plug-ins.
//
// Everything that crosses the boundary lives in an inline namespace that carries this version, so that its number
// is part of every symbol's name. A plug-in built against another version needs symbols that libquazor does not
// have, so the dynamic linker rejects it before any of its code runs, and the host reports why.
//
// Raise the number whenever a class of contract/ or platform/ changes its layout, its virtual operations or its
// meaning.
#pragma once

#ifndef QUAZOR_CONTRACT_VERSION
#define QUAZOR_CONTRACT_VERSION 3
#endif

#define QUAZOR_CONTRACT_NAME_(version) contract_##version
#define QUAZOR_CONTRACT_NAME(version) QUAZOR_CONTRACT_NAME_(version)

// `namespace QUAZOR_CONTRACT {` opens namespace quazor for a header of the contract.
#define QUAZOR_CONTRACT quazor::inline QUAZOR_CONTRACT_NAME(QUAZOR_CONTRACT_VERSION)

// Marks symbols exported by libquazor; all others are hidden.
#define QUAZOR_EXPORT __attribute__((visibility("default")))
