#include "host/Luxwell/LUXStopWords.h"

namespace {

struct List {
  std::string_view tag;
  std::string_view words;
};

constexpr List lists[] = {
    {"ar",
     "في من إلى الى على عن مع هذا هذه ذلك تلك هو هي هم هما نحن أنا أنت أن إن ان أو او و ثم لا لم "
     "لن "
     "ما ماذا كيف متى أين أي كل بعض كان كانت يكون تكون قد لقد إذا اذا إذ حتى عند عندما بعد قبل بين "
     "تحت فوق غير التي الذي الذين اللذان حيث لكن بل كما كذلك هنا هناك أيضا لأن منذ خلال حول دون له "
     "لها لك بها به فيها فيه منها منه عليها عليه يتم تم"},
    {"bg",
     "и или а но в във на за с със от до по при към без под над между през след преди не да ще е "
     "са "
     "съм си сме сте беше бяха бъде бъдат това този тази тези онзи който която което които какво "
     "как "
     "кога къде защо ако като че се си го я ги му им аз ти той тя то ние вие те ме те ни ви всички "
     "всяка всеки някои много може могат трябва само още също така тук там вече чрез освен"},
    {"ca",
     "el la els les un una uns unes de del dels d l a al als en n amb per pel pels sense sobre "
     "entre "
     "fins des com i o ni però si que què qui quin quina quins quines quan on aquest aquesta "
     "aquests "
     "aquestes això aquell aquella allò es s se em m et t us ho hi li lo los ens vos jo tu ell "
     "ella "
     "nosaltres vosaltres ells elles és són era eren ser està estan ha han havia haver va van pot "
     "poden cal molt més menys tot tota tots totes no ja també només seu seva seus seves"},
    {"cs",
     "a i nebo ale v ve na z ze do od k ke s se si o u po pro při za před pod nad mezi bez přes je "
     "jsou jsem jsi jsme jste byl byla bylo byli být bude budou by bych to ten ta ti ty tento tato "
     "toto tyto tím tom toho té těch která který které kterou kterého kteří co kdo kde kdy jak "
     "jaký "
     "proč pokud když než že aby protože tak také jen již už ještě ne není jeho její jejich my vy "
     "on ona ono oni já mě mu jim jej můžete může mohou lze však zde všechny vše každý"},
    {"da",
     "og eller men i på til fra af for med om ved under over efter før mellem uden mod hos som der "
     "det den de en et er var være været bliver blev har havde have kan kunne skal skulle vil "
     "ville "
     "må ikke ingen også kun jeg du han hun vi dig mig sig os jer dem deres din dit dine sin sit "
     "sine hans hendes min mit mine denne dette disse hvis når hvor hvad hvem hvordan hvorfor da "
     "så "
     "at alle alt hver nogle noget mange meget mere end her op ned ud ind"},
    {"de",
     "der die das den dem des ein eine einen einem einer eines und oder aber sondern denn wenn als "
     "ob weil dass daß damit so wie in im an am auf aus bei beim mit nach von vom vor zu zum zur "
     "für "
     "über unter durch um gegen ohne zwischen bis seit während wegen hinter neben ins ans ich du "
     "er "
     "sie es wir ihr mich dich sich uns euch ihn ihm ihnen ihre ihren ihrem ihrer mein dein sein "
     "seine seinen seinem seiner unser euer meine deine ist sind war waren bin bist seid gewesen "
     "wird werden wurde wurden worden hat haben habe hatte hatten kann können konnte muss müssen "
     "soll sollen will wollen darf dürfen mag mögen möchte möchten nicht kein keine keinen keinem "
     "keiner auch nur noch schon sehr hier dort da dann dabei dazu daher dies diese diesen diesem "
     "dieser dieses jede jeden jedem jeder jedes alle allen alles welche welchen welcher welches "
     "wer wen wem was wo wann warum man mehr sowie bzw je etwa wieder also sonst"},
    {"el",
     "ο η το οι τα του της των τον την τους τις ένας μια μία ένα και ή αλλά αν όταν ενώ γιατί "
     "επειδή "
     "ότι πως που πού πώς ποιος ποια ποιο να θα δεν μη μην σε στο στη στην στον στα στις στους από "
     "για με χωρίς μετά πριν κατά προς παρά μέχρι ως σαν είναι ήταν είμαι είσαι έχει έχουν είχε "
     "έχω "
     "μπορεί μπορείτε πρέπει αυτό αυτή αυτός αυτά αυτές αυτοί εκείνο κάθε όλα όλες όλοι μας σας "
     "τους "
     "μου σου εγώ εσύ εμείς εσείς πολύ πιο μόνο επίσης εδώ εκεί κάτι τι"},
    {"en",
     "a an the this that these those "
     "i me my mine myself we us our ours ourselves you your yours yourself yourselves he him his "
     "himself she her hers herself it its itself they them their theirs themselves one "
     "who whom whose which what when where why how "
     "am is are was were be been being do does did doing done have has had having "
     "will would shall should can could may might must ought cannot "
     "and or but nor if then else than because as until while so though although whether unless "
     "since of at by for with about against between into through during before after to from "
     "in on onto upon within without toward towards via per among "
     "not no there here again further once also just only very too such same own other another "
     "any some each every both either neither few more most many much all "
     "get got let however therefore thus hence etc ie eg "
     "i'm i've i'd i'll you're you've you'd you'll he'd he'll she'd she'll it'll it'd we're we've "
     "we'd we'll they're they've they'd they'll that'll there'll who'll what'll "
     "isn't aren't wasn't weren't don't doesn't didn't haven't hasn't hadn't won't wouldn't can't "
     "couldn't shan't shouldn't mustn't mightn't needn't"},
    {"es",
     "el la los las lo un una unos unas de del a al en con por para sin sobre entre hasta desde "
     "ante "
     "bajo contra según tras durante mediante y e o u ni pero sino si que qué quien quién quienes "
     "cual "
     "cuál cuales cuáles cuando cuándo donde dónde como cómo porque pues aunque mientras este esta "
     "estos estas esto ese esa esos esas eso aquel aquella aquellos aquellas aquello yo tú él ella "
     "ello nosotros vosotros ellos ellas usted ustedes me te se nos os le les mi mis tu tus su sus "
     "nuestro nuestra nuestros nuestras es son era eran fue fueron ser sido siendo está están "
     "estaba "
     "estar ha han había haber he hay puede pueden poder debe deben no sí ya también muy más menos "
     "tan tanto todo toda todos todas otro otra otros otras cada algún alguna algunos algunas "
     "ningún "
     "ninguna solo sólo aquí allí así cuyo cuya"},
    {"et",
     "ja või ning aga kuid et kui siis sest kas mis kes kus kuidas millal miks see need selle "
     "selles "
     "sellest seda nende neid on oli olid olla ole ei ka veel juba ainult väga kõik iga mõni ma sa "
     "ta "
     "me te nad mina sina tema meie teie nemad oma enda saab saate võib võite tuleb peab peate "
     "ning "
     "üle alla kohta kaudu pärast enne ilma koos vahel jaoks abil"},
    {"eu",
     "eta edo baina ere bat batzuk hau hori hura hauek horiek haiek da dira zen ziren izan du ditu "
     "dute ditugu dituzte zuen egin egiten ez bai nola non noiz nor zer zein zergatik hemen hor "
     "han "
     "ni zu gu zuek bere bera beste guztiak oso gehiago baino bezala arte gabe ondoren aurretik "
     "bitartez dago daude behar ahal daiteke dezakezu duzu"},
    {"fa",
     "و یا در از به با برای که را این آن اینها آنها است هست بود بودند باشد شود شده شد می نمی ها "
     "های "
     "هر همه هیچ یک تا اگر اما ولی چون زیرا نیز هم بر بین پس پیش بدون روی زیر بالای توسط من تو او "
     "ما "
     "شما ایشان خود چه چگونه کجا کی چرا کدام کند کنید کنند کرد کرده کردن دارد دارند دارید داشت "
     "باید "
     "توان دیگر بسیار فقط"},
    {"fi",
     "ja tai mutta sekä että jos kun koska kuin niin vai joka jotka jonka jota jossa josta johon "
     "mikä mitä missä mistä mihin miten milloin miksi kuka se ne sen niiden sitä niitä siinä siitä "
     "tämä nämä tämän näiden tätä näitä tässä tuo nuo on ovat oli olivat olla ole ei eivät en et "
     "emme "
     "ette eikä minä sinä hän me te he minun sinun hänen meidän teidän heidän myös vain jo vielä "
     "hyvin kaikki kaikkien joku jokin voi voit voidaan voivat täytyy pitää mukaan kanssa ilman "
     "ennen "
     "jälkeen välillä varten kautta alla päällä yli tulee olisi"},
    {"fr",
     "le la les l un une des de du d au aux à en dans par pour sur sous avec sans vers chez entre "
     "jusqu jusque depuis pendant avant après contre selon et ou mais ni car donc or si que qu qui "
     "quoi quel quelle quels quelles dont où quand comment pourquoi lorsque lorsqu puisque puisqu "
     "comme afin ce cet cette ces c ceci cela ça celui celle ceux celles je j tu il elle on nous "
     "vous "
     "ils elles me m te t se s lui leur leurs y mon ma mes ton ta tes son sa ses notre nos votre "
     "vos "
     "moi toi soi eux est sont suis es êtes sommes était étaient être été étant sera seront soit "
     "ai "
     "as a ont avons avez avait avaient avoir eu peut peuvent pouvez pouvoir doit doivent devez "
     "fait "
     "faire ne n pas plus moins non oui aussi très trop tout toute tous toutes autre autres même "
     "mêmes chaque quelque quelques plusieurs aucun aucune ici là ainsi alors encore déjà "
     "seulement "
     "puis cependant"},
    {"ga",
     "an na agus nó ach i in ar as ag le do de ó go trí faoi thar um roimh gan idir chun tar éis "
     "is "
     "ní níl tá bhí beidh bhfuil raibh sé sí mé tú muid sibh siad é í iad seo sin siúd a mo do ár "
     "bhur cad cé cá conas nuair má dá mar freisin gach aon eile níos"},
    {"gl",
     "o a os as un unha uns unhas de do da dos das en no na nos nas con por polo pola para sen "
     "sobre "
     "entre ata desde e ou nin pero se que quen cal cando onde como porque este esta estes estas "
     "isto "
     "ese esa iso aquel aquela eu ti el ela nós vós eles elas me te lle lles seu súa seus súas é "
     "son "
     "era ser está están ha hai pode poden debe non si xa tamén moi máis menos todo toda todos "
     "todas "
     "outro outra cada só aquí ao aos á ás"},
    {"he",
     "של את על אל עם אם או כי לא זה זאת זו אלה אלו הוא היא הם הן אני אתה את אנחנו אתם אשר מה מי "
     "איך "
     "מתי איפה למה כל גם רק עוד כבר אבל לפי בין תחת מעל אחרי לפני בלי ללא עד היה היו יהיה להיות יש "
     "אין כך כאשר כדי בו בה לו לה להם שלו שלה שלך שלהם מאוד יותר ניתן"},
    {"hi",
     "का की के को में से पर और या तथा एवं लेकिन यदि अगर तो कि जो जब जहाँ कैसे क्या कौन कब कहाँ क्यों "
     "यह ये वह वे इस इन उस उन इसे उसे मैं तुम आप हम है हैं था थे थी हो होता होती होते रहा रही रहे "
     "किया करना करने करें करता करते कर सकते सकता सकती लिए द्वारा साथ बाद पहले बिना तक भी ही नहीं न "
     "अपने अपनी अपना एक कोई कुछ सभी सब हर अन्य बहुत"},
    {"hr",
     "i ili a ali u na za s sa od do po pri k ka o iz kod bez pod nad između kroz prije poslije ne "
     "da "
     "li je su sam si smo ste bio bila bilo bili biti će ćete bi to taj ta te ti ovaj ova ovo ovi "
     "ove "
     "koji koja koje kojih kojem kojoj što tko kako kada gdje zašto ako kao se ga ju ih mu im ja "
     "on "
     "ona ono mi vi oni svi sve svaki neki može možete mogu treba samo još također tako ovdje"},
    {"hu",
     "a az egy és vagy de hanem ha hogy mert mint amikor ahol amely amelyek aki akik ami amit ez "
     "ezt "
     "ezek ezeket azt azok azokat ennek annak ebben abban erre arra itt ott van vannak volt voltak "
     "lesz lenne nem ne nincs is csak már még meg el ki be fel le át össze én te ő mi ti ők engem "
     "téged őt minket önt ön önök saját minden mindegyik néhány több sok nagyon így úgy hogyan "
     "mikor "
     "miért melyik milyen mely kell lehet tud között alatt felett után előtt nélkül szerint által "
     "keresztül vagyis illetve pedig majd"},
    {"id",
     "dan atau tetapi tapi namun yang di ke dari pada untuk dengan tanpa oleh dalam antara sebagai "
     "seperti jika kalau ketika saat karena agar bahwa ini itu tersebut adalah ialah akan telah "
     "sudah "
     "sedang belum tidak bukan jangan dapat bisa harus ada saya aku anda kamu dia ia kami kita "
     "mereka "
     "nya apa siapa mana bagaimana kapan mengapa semua setiap beberapa banyak lebih sangat juga "
     "hanya "
     "lagi saja sini sana sebuah suatu para secara"},
    {"it",
     "il lo la i gli le l un uno una di del dello della dei degli delle dell a al allo alla ai "
     "agli "
     "alle all da dal dallo dalla dai dagli dalle dall in nel nello nella nei negli nelle nell con "
     "col su sul sullo sulla sui sugli sulle sull per tra fra e ed o od ma se che chi cui quale "
     "quali "
     "quando dove come perché mentre anche né non più meno questo questa questi queste quest "
     "quello "
     "quella quelli quelle quell ciò io tu lui lei egli ella noi voi loro mi ti si ci vi ne mio "
     "mia "
     "tuo tua suo sua suoi sue nostro vostro è sono era erano essere stato stata stati state sia "
     "siano ha hanno ho hai abbiamo avete aveva avere può possono deve devono fa fare tutto tutta "
     "tutti tutte ogni altro altra altri altre qualche alcuni alcune molto solo già ancora qui lì "
     "così poi dopo prima d c"},
    {"ja",
     "の に は を が で と も へ や か から まで より て で し た だ です ます ました ません "
     "でした "
     "ない なく なかっ ある あり あっ いる い う する し さ せ れ られ れる られる される せる "
     "させる なる なり なっ ため とき 時 場合 こと もの よう ように ような など および 及び また "
     "または あるいは かつ ただし これ それ あれ この その あの ここ そこ どこ どの どれ だれ 何 "
     "なぜ いつ ので のに けど けれど ば たら なら ても でも だけ のみ ほど くらい ずつ について "
     "において によって により による として とは という といった 的 さん 私 あなた ください "
     "下さい "
     "できる でき できます あります います します され それぞれ すべて 全て べき わけ"},
    {"ko",
     "이 그 저 것 수 등 및 또는 그리고 그러나 하지만 또한 때 더 안 못 잘 좀 매우 모든 각 어떤 무슨 "
     "무엇 "
     "누구 어디 언제 어떻게 왜 나 너 우리 저희 당신 그들 여기 거기 있는 있습니다 있다 없는 "
     "없습니다 "
     "없다 하는 합니다 한다 하여 하고 하면 해야 됩니다 되는 된다 되어 됨 이다 입니다 인 아닌 "
     "아닙니다 "
     "위해 위한 대한 대해 따라 통해 경우 다음 같은 같이 함께"},
    {"lt",
     "ir arba bei bet o jei kad kai kol nes kaip kur kada kodėl kas kuris kuri kurie kurios ką šis "
     "ši "
     "šie šios tas ta tie tos tai į iš su be per prie nuo iki ant po prieš tarp pagal dėl apie už "
     "yra "
     "buvo bus būti nėra ne ar jau dar tik taip pat labai visi visos kiekvienas aš tu jis ji mes "
     "jūs "
     "jie jos savo jo jų mano gali galite galima reikia turi šiuo"},
    {"lv",
     "un vai bet ja ka kad jo tā kā kur kurš kura kas ko šis šī šie šīs tas tie tās no uz ar bez "
     "par "
     "pie pēc pirms starp līdz zem virs caur ir bija būs būt nav ne jau vēl tikai arī ļoti visi "
     "visas "
     "katrs es tu viņš viņa mēs jūs viņi savu sava jūsu var varat vajag jābūt tiek tika kādēļ"},
    {"nl",
     "de het een en of maar want dus als dan dat die dit deze in op aan van voor met door bij naar "
     "uit "
     "over onder tussen tegen tot zonder om te ter ten na sinds tijdens via binnen buiten ik jij "
     "je u "
     "hij zij ze wij we jullie mij me hem haar ons hen hun zich mijn jouw uw zijn onze is was "
     "waren "
     "ben bent wordt worden werd werden geworden geweest heb hebt heeft hebben had hadden kan kunt "
     "kunnen kon moet moeten mag mogen wil willen zal zullen zou zouden niet geen ook nog al "
     "alleen "
     "zeer meer veel alle alles elk elke ieder iedere ander andere wie wat welke welk wanneer waar "
     "hoe waarom er hier daar zo zoals toen omdat terwijl hoewel wel weer"},
    {"no",
     "og eller men i på til fra av for med om ved under over etter før mellom uten mot hos som der "
     "det den de en ei et er var være vært blir ble har hadde ha kan kunne skal skulle vil ville "
     "må "
     "ikke ikkje ingen også kun bare jeg eg du han hun vi deg meg seg oss dere dem deres din ditt "
     "dine sin sitt sine hans hennes min mitt mine denne dette disse hvis når hvor hva hvem "
     "hvordan "
     "hvorfor da så at å alle alt hver noen noe mange mye mer enn her opp ned ut inn"},
    {"pl",
     "i lub albo oraz ale a w we na z ze do od po dla przy za przed pod nad między bez przez o u "
     "ku "
     "jest są był była było były być będzie będą jestem nie tak to ten ta te ci tego tej tych tym "
     "tymi który która które którego której których którym co kto gdzie kiedy jak jaki jaka jakie "
     "dlaczego jeśli jeżeli gdy że aby żeby ponieważ bo niż czy się siebie sobie swój swoje swoją "
     "ja "
     "ty on ona ono my wy oni one mnie mi ciebie ci go mu jej ich im nim nią nas nam was wam można "
     "może mogą należy także również tylko już jeszcze bardzo wszystkie wszystko każdy każda "
     "tutaj"},
    {"pt",
     "o a os as um uma uns umas de do da dos das d em no na nos nas num numa com por pelo pela "
     "pelos "
     "pelas para sem sobre entre até desde ante sob contra durante e ou nem mas se que quem qual "
     "quais "
     "quando onde como porque porquê pois embora enquanto este esta estes estas isto esse essa "
     "esses "
     "essas isso aquele aquela aqueles aquelas aquilo neste nesta nesse nessa deste desta desse "
     "dessa "
     "eu tu ele ela nós vós eles elas você vocês me te lhe lhes vos meu minha teu tua seu sua seus "
     "suas nosso nossa é são era eram foi foram ser sido sendo está estão estava estar há tem têm "
     "tinha ter pode podem poder deve devem não sim já também muito mais menos tão todo toda todos "
     "todas outro outra outros outras cada algum alguma alguns algumas nenhum só somente aqui ali "
     "assim ao aos à às"},
    {"ro",
     "și sau dar iar ci dacă când unde cum de că să la în din pe cu fără pentru prin după înainte "
     "între sub peste până către despre a al ai ale un o unui unei unor este sunt era erau fi fost "
     "fie va vor ar are au avea am ați poate pot puteți trebuie nu da mai foarte tot toate toți "
     "fiecare "
     "acest această acești aceste acesta aceasta acela aceea acel care cine ce cât eu tu el ea noi "
     "voi "
     "ei ele îl o îi le se își vă ne mă te lui lor său sa sale dumneavoastră doar numai deja încă "
     "aici "
     "acolo astfel precum"},
    {"ru",
     "и или а но в во на за с со от до по при к ко у о об обо из без под над между через после "
     "перед "
     "для про не ни да же ли бы то что чтобы как когда где куда почему кто какой какая какое какие "
     "который которая которое которые которого которой которых если хотя потому так также тоже это "
     "этот эта эти этого этой этих этом тот та те того той тех том такой такая такие я ты он она "
     "оно "
     "мы вы они меня мне тебя тебе его ему её ей нас нам вас вам их им ими себя свой своя свои "
     "своего "
     "наш ваш мой твой был была было были быть будет будут есть нет может могут можно нужно надо "
     "необходимо только ещё уже очень все всё всех весь каждый другой другие здесь там тут чем"},
    {"sk",
     "a i alebo ale v vo na z zo do od k ku s so sa si o u po pre pri za pred pod nad medzi bez "
     "cez je "
     "sú som ste sme bol bola bolo boli byť bude budú by to ten tá tí tie tento táto toto tieto "
     "ktorý "
     "ktorá ktoré ktorí čo kto kde kedy ako prečo ak keď než že aby pretože tak tiež len už ešte "
     "nie "
     "jeho jej ich my vy on ona ono oni ja môžete môže možno však tu všetky všetko každý"},
    {"sl",
     "in ali pa a v na za z s od do po pri k h o iz brez pod nad med skozi pred ne da je so sem si "
     "smo "
     "ste bil bila bilo bili biti bo bodo bi to ta te ti tega tem ki kateri katera katero kaj kdo "
     "kje "
     "kdaj kako zakaj če ko kot ker se ga jo jih mu jim jaz on ona ono mi vi oni vse vsi vsak "
     "lahko "
     "mora treba samo še tudi tako tukaj že"},
    {"sr",
     "и или а али у на за с са од до по при к ка о из код без под над између кроз пре после не да "
     "ли "
     "је су сам си смо сте био била било били бити ће бисте би то тај та те ти овај ова ово ови "
     "ове "
     "који која које којих шта ко како када где зашто ако као се га ју их му им ја он она оно ми "
     "ви "
     "они сви све сваки неки може можете могу треба само још такође тако овде "
     "i ili a ali u na za s sa od do po pri k ka o iz kod bez pod nad između kroz pre posle ne da "
     "li "
     "je su sam si smo ste bio bila bilo bili biti će bi to taj ta te ti ovaj ova ovo ovi ove koji "
     "koja koje kojih šta ko kako kada gde zašto ako kao se ga ju ih mu im"},
    {"sv",
     "och eller men i på till från av för med om vid under över efter före mellan utan mot hos som "
     "där det den de en ett är var vara varit blir blev har hade ha kan kunde ska skall skulle "
     "vill "
     "ville måste inte ingen inga också bara jag du han hon vi dig mig sig oss er dem deras din "
     "ditt "
     "dina sin sitt sina hans hennes min mitt mina denna detta dessa när vad vem hur varför då så "
     "att "
     "alla allt varje några något många mycket mer än här upp ned ut in man får"},
    {"th",
     "และ หรือ แต่ ที่ ซึ่ง อัน ของ ใน บน ใต้ จาก ถึง ไป มา ให้ กับ แก่ ต่อ โดย ด้วย เพื่อ สำหรับ ตาม เป็น คือ "
     "มี ไม่ ได้ จะ ต้อง ควร อาจ แล้ว อยู่ กำลัง เคย นี้ นั้น โน้น เหล่านี้ เหล่านั้น ทุก แต่ละ บาง หลาย ใด ใคร "
     "อะไร ไหน เมื่อ ถ้า หาก เพราะ ว่า ก็ จึง เรา คุณ ฉัน ผม เขา เธอ มัน การ ความ"},
    {"tr",
     "ve veya ya da de ile ama fakat ancak için gibi kadar göre doğru karşı sonra önce beri bir bu "
     "şu "
     "o bunlar şunlar onlar ben sen biz siz bana sana ona bize size onu bunu şunu benim senin onun "
     "bizim sizin ne neden niçin nasıl nerede hangi kim kaç ki eğer ise olarak olan olur oldu "
     "olduğu "
     "olmak değil var yok her tüm bütün bazı hiç çok daha en az mı mi mu mü dır dir her şey kendi "
     "üzere arasında içinde üzerinde böyle şöyle öyle hem yani diğer"},
    {"uk",
     "і й та або але а в у на за з із зі від до по при к о об без під над між через після перед "
     "для "
     "про не ні так же чи би б то що щоб як коли де куди чому хто який яка яке які якого якої яких "
     "якщо хоча тому також теж це цей ця ці цього цієї цих той та те ті того я ти він вона воно ми "
     "ви "
     "вони мене мені тебе його йому її їй нас нам вас вам їх їм себе свій своя свої був була було "
     "були бути буде будуть є немає може можуть можна потрібно слід тільки лише ще вже дуже всі "
     "все "
     "кожен інший інші тут там ніж"},
    {"vi",
     "và hoặc hay nhưng mà của ở trong trên dưới từ đến tới cho với bằng về theo để do bởi vì nếu "
     "thì "
     "khi là có không được bị đã đang sẽ phải cần nên có thể này đó kia ấy những các mọi mỗi một "
     "vài "
     "nhiều cũng chỉ rất hơn nhất lại ra vào lên xuống tôi bạn anh chị nó họ chúng ta gì ai nào "
     "đâu "
     "sao như thế vậy cả"},
    {"zh",
     "的 了 和 与 與 或 及 以及 在 是 为 為 以 于 於 对 對 从 從 到 由 被 把 将 將 向 给 給 让 讓 "
     "也 都 "
     "就 还 還 又 再 而 但 但是 如果 若 则 則 因为 因為 所以 当 當 时 時 这 這 那 这个 這個 那个 "
     "那個 "
     "这些 這些 那些 其 其中 它 它们 它們 他 她 我 你 您 我们 我們 你们 你們 他们 他們 什么 什麼 "
     "如何 "
     "怎么 怎麼 哪 哪个 哪個 哪里 哪裡 谁 誰 为什么 為什麼 不 没有 沒有 可以 可 能 能够 能夠 会 會 "
     "要 需要 应 應 应该 應該 有 无 無 个 個 一个 一個 一些 每 每个 每個 各 该 該 此 之 所 上 下 "
     "中 里 "
     "裡 内 內 后 後 前 来 來 去 着 著 过 過 等 很 更 最 只 并 並 且 并且 並且 请 請"},
};

}  // namespace

std::string_view LUXStopWordsForLanguage(std::string_view tag) noexcept {
  for (const List& list : lists) {
    if (list.tag == tag) {
      return list.words;
    }
  }
  return {};
}
