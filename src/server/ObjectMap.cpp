#include "server/ObjectMap.h"

#include "manager/InstrSessionMgr.h"
#include "server/ClassFactory.h"
#include "sessions/CustomInstrSession.h"
#include "sessions/DriverSession.h"
#include "sessions/RQInstrSession.h"
#include "sessions/IVIInstrSession.h"
#include "sessions/VPPBase.h"
#include "sessions/VXIPNPInstrSession.h"

namespace sm {

namespace {
template <class Factory>
IClassFactory* Create() {
    return new (std::nothrow) Factory();
}

ObjectMapEntry objectMap[] = {
    {&CLSID_IVIInstrSession, "IVIInstrSession", &Create<ClassFactory<CIVIInstrSession>>, nullptr},
    {&CLSID_VXIPNPInstrSession, "VXIPNPInstrSession", &Create<ClassFactory<CVXIPNPInstrSession>>, nullptr},
    {&CLSID_RQInstrSession, "RQInstrSession", &Create<ClassFactory<CRQInstrSession>>, nullptr},
    {&CLSID_InstrSessionMgr, "InstrSessionMgr", &Create<SingletonClassFactory<CInstrSessionMgr>>, nullptr},
    {&CLSID_VPPBase, "VPPBase", &Create<ClassFactory<CVPPBase>>, nullptr},
    {&CLSID_CustomInstrSession, "CustomInstrSession", &Create<ClassFactory<CCustomInstrSession>>, nullptr},
};
}  // namespace

std::span<ObjectMapEntry> GetObjectMap() { return objectMap; }

}  // namespace sm
