"""Reads the demangled symbols of the shared library; all must belong to the engine's own names."""
import re
import sys

OWN = re.compile(r"""^(?:typeinfo\ (?:name\ )?for\ |vtable\ for\ |VTT\ for\ |guard\ variable\ for\ |
                      (?:non-virtual|virtual)\ thunk\ to\ |construction\ vtable\ for\ )?
                     (?:[\w:<>,\ *&]*\ )?
                     (?:Qv|qv|QV|SRScaler|Any|AString|AS_|Pair|MediaTime|TransLink|TransVLink|TransALink|Xml|PtrListImp|TPtrList|
                        TRefList|InOutPoints|FiltersState|ProcessParams|MetaProcessParams|MetaVHelper|AudioMuxer|
                        BaseMuxer|BaseDecodePipe|DPipe|CodecCompat|PresetGroup|Generator|init_wrapper|cleanup_wrapper|
                        core_library_path|path_separator|execute_process|available_codepages|get_folder_|debug_trace|
                        operator|bufstream|buf_|fifo_|VideoJobDescription|AudioJobDescription|AudioConversion|VideoFormat|AudioFormat|YSwingCorrect|frame_tt|
                        FilterGroup|Bufstream|Fifo|codepage_name|SubImporter|CCStream|WavStream|init_|metadata_)""", re.X)
strange = [line.strip() for line in sys.stdin if line.strip() and not OWN.match(line.strip())]
for line in strange[:40]:
    print("exported:", line)
sys.exit(bool(strange))
